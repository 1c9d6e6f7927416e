package probe;

// main ends by throwing.
public final class ThrowingMain {
    public static void main(String[] args) {
        throw new IllegalStateException("thrown out of main");
    }
}
