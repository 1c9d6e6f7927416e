package com.qz.kpo.emu57.app;

import java.awt.BorderLayout;
import java.awt.GraphicsEnvironment;
import java.awt.event.WindowAdapter;
import java.awt.event.WindowEvent;
import java.io.FileDescriptor;
import java.io.FileOutputStream;
import java.io.IOException;
import java.io.InputStream;
import java.io.PrintStream;
import java.net.InetAddress;
import java.net.ServerSocket;
import java.net.Socket;
import java.nio.charset.StandardCharsets;
import java.util.function.Consumer;
import javax.swing.BorderFactory;
import javax.swing.DefaultListModel;
import javax.swing.JFrame;
import javax.swing.JLabel;
import javax.swing.JList;
import javax.swing.JScrollPane;
import javax.swing.SwingUtilities;

/**
 * Demo application started by the native launcher. Every argument arrives hex-encoded (four lower-case hex
 * digits per UTF-16 unit); later starts forward theirs in the same form over TCP 127.0.0.1:6152, all of one
 * start back to back without separator, ended by the close of the connection. One connection is therefore
 * shown as one entry. Every event is also printed to standard output (UTF-8, flushed) so a script can follow:
 * "argument: X", "ready", "forwarded: X", "closed".
 */
public final class ApplicationMainForm {
    static final int HAND_OFF_PORT = 6152;
    /** "QZ-Lumiscope_QZ-57" read as little-endian UTF-16: what the launcher's activation looks for in titles. */
    static final String INSTANCE_TITLE = "\u5A51\u4C2D\u6D75\u7369\u6F63\u6570\u515F\u2D5A\u3735";
    static final String TITLE = INSTANCE_TITLE + " QZ-Lumiscope QZ-57";
    static final long HEADLESS_LISTEN_MS = 10_000;
    static final int READ_TIMEOUT_MS = 10_000;

    // Explicit UTF-8: the launcher sets no file.encoding and the locale may be C.
    private static final PrintStream OUT =
            new PrintStream(new FileOutputStream(FileDescriptor.out), true, StandardCharsets.UTF_8);

    private ApplicationMainForm() {}

    static synchronized void event(String line) {
        OUT.println(line);
        OUT.flush();
    }

    /** Groups of four hex digits, one UTF-16 unit each; anything else is returned as it came. */
    static String decode(String hex) {
        if (hex.length() % 4 != 0) return hex;
        StringBuilder text = new StringBuilder(hex.length() / 4);
        for (int i = 0; i < hex.length(); i += 4) {
            int unit = 0;
            for (int j = i; j < i + 4; j++) {
                int digit = Character.digit(hex.charAt(j), 16);
                if (digit < 0) return hex;
                unit = unit * 16 + digit;
            }
            text.append((char) unit);
        }
        return text.toString();
    }

    /** Accepts hand-offs on a daemon thread, so it never keeps the VM alive. */
    static void listen(Consumer<String> onForwarded) {
        ServerSocket server;
        try {
            server = new ServerSocket(HAND_OFF_PORT, 50, InetAddress.getLoopbackAddress());
        } catch (IOException e) {
            event("listen failed: " + e.getMessage());
            return;
        }
        Thread thread = new Thread(() -> {
            while (true) {
                try (Socket client = server.accept()) {
                    client.setSoTimeout(READ_TIMEOUT_MS);
                    InputStream in = client.getInputStream();
                    String hex = new String(in.readAllBytes(), StandardCharsets.ISO_8859_1);
                    String text = decode(hex);
                    event("forwarded: " + text);
                    onForwarded.accept(text);
                } catch (IOException e) {
                    event("hand-off failed: " + e.getMessage());
                }
            }
        }, "hand-off listener");
        thread.setDaemon(true);
        thread.start();
    }

    public static void main(String[] args) throws Exception {
        String[] decoded = new String[args.length];
        for (int i = 0; i < args.length; i++) {
            decoded[i] = decode(args[i]);
            event("argument: " + decoded[i]);
        }
        if (GraphicsEnvironment.isHeadless()) {
            event("headless: listening for " + HEADLESS_LISTEN_MS / 1000 + " s");
            listen(text -> {});
            Thread.sleep(HEADLESS_LISTEN_MS);
            event("closed");
            return;
        }
        DefaultListModel<String> entries = new DefaultListModel<>();
        SwingUtilities.invokeAndWait(() -> showFrame(decoded, entries));
        listen(text -> SwingUtilities.invokeLater(() -> entries.addElement("forwarded: " + text)));
        // main returns here; the VM lives on while the frame is displayable (the AWT threads are non-daemon).
    }

    private static void showFrame(String[] decoded, DefaultListModel<String> entries) {
        for (int i = 0; i < decoded.length; i++) entries.addElement("argument " + (i + 1) + ": " + decoded[i]);
        JFrame frame = new JFrame(TITLE);
        frame.setDefaultCloseOperation(JFrame.DISPOSE_ON_CLOSE);
        JLabel header = new JLabel("Started with " + decoded.length + " argument(s); later starts forward"
                + " theirs to 127.0.0.1:" + HAND_OFF_PORT + ".");
        header.setBorder(BorderFactory.createEmptyBorder(8, 8, 8, 8));
        frame.add(header, BorderLayout.NORTH);
        frame.add(new JScrollPane(new JList<>(entries)), BorderLayout.CENTER);
        frame.addWindowListener(new WindowAdapter() {
            @Override public void windowOpened(WindowEvent e) { event("ready"); }
            @Override public void windowClosed(WindowEvent e) { event("closed"); }
        });
        frame.setSize(640, 360);
        frame.setLocationRelativeTo(null);
        frame.setVisible(true);
    }
}
