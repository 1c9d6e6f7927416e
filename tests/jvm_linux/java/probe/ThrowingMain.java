package probe;

// main ends by throwing.
public final class ThrowingMain {
    public static int calls;

    public static void main(String[] args) {
        calls++;
        throw new IllegalStateException("thrown out of main");
    }
}
