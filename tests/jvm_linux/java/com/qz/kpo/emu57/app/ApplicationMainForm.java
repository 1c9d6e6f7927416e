package com.qz.kpo.emu57.app;

// Stands in for the application's main class: keeps what main received and its decoding, for the
// host test to read back through JNI.
public final class ApplicationMainForm {
    public static int calls;
    public static String[] received;
    public static String[] decoded;

    public static void main(String[] args) {
        calls++;
        received = args.clone();
        decoded = new String[args.length];
        for (int i = 0; i < args.length; i++) {
            decoded[i] = decode(args[i]);
        }
    }

    // Groups of four lower-case hex digits, one UTF-16 unit each; null for anything else.
    static String decode(String encoded) {
        if (encoded == null || encoded.length() % 4 != 0) {
            return null;
        }
        StringBuilder text = new StringBuilder(encoded.length() / 4);
        for (int i = 0; i < encoded.length(); i += 4) {
            int unit = 0;
            for (int k = i; k < i + 4; k++) {
                char c = encoded.charAt(k);
                int digit = c >= '0' && c <= '9' ? c - '0' : c >= 'a' && c <= 'f' ? c - 'a' + 10 : -1;
                if (digit < 0) {
                    return null;
                }
                unit = unit * 16 + digit;
            }
            text.append((char) unit);
        }
        return text.toString();
    }
}
