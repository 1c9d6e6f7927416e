package com.qz.kpo.emu57.app;

// Stands in for the application's main class: keeps the decoding of what main received, for the
// host test to read back through JNI.
public final class ApplicationMainForm {
    public static String[] decoded;

    public static void main(String[] args) {
        decoded = new String[args.length];
        for (int i = 0; i < args.length; i++) {
            decoded[i] = decode(args[i]);
        }
    }

    // Groups of four lower-case hex digits, one UTF-16 unit each; null for anything else.
    static String decode(String encoded) {
        if (encoded.length() % 4 != 0) {
            return null;
        }
        StringBuilder text = new StringBuilder(encoded.length() / 4);
        for (int i = 0; i < encoded.length(); i += 4) {
            int unit = 0;
            for (int k = i; k < i + 4; k++) {
                int digit = "0123456789abcdef".indexOf(encoded.charAt(k));
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
