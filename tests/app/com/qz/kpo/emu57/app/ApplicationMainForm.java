package com.qz.kpo.emu57.app;

import java.io.*;
import java.lang.management.ManagementFactory;
import java.net.*;
import java.nio.charset.StandardCharsets;
import java.nio.file.*;
import java.util.*;

// The scenario table's Java application: records what the launcher gave it in vm-record.txt of the
// current directory and behaves as vm-script.txt asks (the line formats are the VM double's, see
// tests/table/conftest.py). Linux only adds: "property java.class.path V" (the VM keeps that option
// out of its input arguments), "cwd PATH", and "received TEXT" for each hand-off on port 6152.
//   script keys: main_ms=N  until=NAME  exit=N  throw=1  listen=1 (take hand-offs while running)
//                child=1 (start a process that outlives the application)
//                frame=1 (open a frame titled with the instance name's nine-unit form; closed at the end)
public final class ApplicationMainForm {
    static PrintStream record;

    public static void main(String[] args) throws Exception {
        Properties script = new Properties();
        try (Reader in = Files.newBufferedReader(Paths.get("vm-script.txt"))) {
            script.load(in);
        } catch (NoSuchFileException absent) {
        }
        record = new PrintStream(new FileOutputStream("vm-record.txt", true), true, "UTF-8");
        for (String option : ManagementFactory.getRuntimeMXBean().getInputArguments()) record.println("option " + option);
        record.println("property java.class.path " + System.getProperty("java.class.path"));
        record.println("cwd " + System.getProperty("user.dir"));
        record.println("main " + args.length);
        for (String arg : args) record.println("arg " + arg);
        if (script.getProperty("listen") != null) listen();
        if (script.getProperty("child") != null) new ProcessBuilder("sleep", "60").start();
        javax.swing.JFrame[] frame = new javax.swing.JFrame[1];
        if (script.getProperty("frame") != null) javax.swing.SwingUtilities.invokeAndWait(() -> {
            frame[0] = new javax.swing.JFrame("\u5a51\u4c2d\u6d75\u7369\u6f63\u6570\u515f\u2d5a\u3735 test");
            frame[0].setSize(400, 300);
            frame[0].setVisible(true);
        });
        long end = System.currentTimeMillis() + Long.parseLong(script.getProperty("main_ms", "0"));
        String until = script.getProperty("until");
        while (System.currentTimeMillis() < end || (until != null && !Files.exists(Paths.get(until)))) Thread.sleep(20);
        if (script.getProperty("throw") != null) throw new IllegalStateException("asked to throw");
        if (script.getProperty("exit") != null) System.exit(Integer.parseInt(script.getProperty("exit")));
        if (frame[0] != null) javax.swing.SwingUtilities.invokeAndWait(frame[0]::dispose);
        record.println("end");
    }

    static void listen() throws IOException {
        ServerSocket server = new ServerSocket(6152, 50, InetAddress.getByName("127.0.0.1"));
        Thread taker = new Thread(() -> {
            while (true) {
                try (Socket client = server.accept()) {
                    record.println("received " + new String(client.getInputStream().readAllBytes(), StandardCharsets.ISO_8859_1));
                } catch (IOException e) {
                    return;
                }
            }
        });
        taker.setDaemon(true);
        taker.start();
    }
}
