package probe;

// Has a main(String[]), but not a static one.
public final class InstanceMain {
    public void main(String[] args) {
    }

    public static void main(int[] args) {
    }
}
