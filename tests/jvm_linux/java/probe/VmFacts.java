package probe;

// What the host test asks the running VM about itself.
public final class VmFacts {
    public static String property(String name) {
        return System.getProperty(name);
    }

    public static long maxHeapBytes() {
        return Runtime.getRuntime().maxMemory();
    }

    public static String classSource(String name) throws Exception {
        return new java.io.File(Class.forName(name).getProtectionDomain().getCodeSource().getLocation().toURI())
                .getPath();
    }
}
