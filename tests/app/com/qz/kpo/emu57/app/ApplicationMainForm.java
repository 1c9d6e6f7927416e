package com.qz.kpo.emu57.app;

import java.io.*;
import java.lang.management.ManagementFactory;
import java.nio.file.*;
import java.util.Properties;

// The scenario table's Java application: records what the launcher gave it in vm-record.txt of the
// current directory and behaves as vm-script.txt asks (the line formats are the VM double's, see
// tests/table/conftest.py). The class path comes first, from its property: the VM keeps that option
// out of the input arguments it reports. "vm" is the VM's own summary, which ends in "sharing" when it
// maps its class-data archive.
//   script keys: main_ms=N  until=NAME  exit=N  throw=1  say=1 (a line on standard output and error)
public final class ApplicationMainForm {
    public static void main(String[] args) throws Exception {
        Properties script = new Properties();
        try (Reader in = Files.newBufferedReader(Paths.get("vm-script.txt"))) {
            script.load(in);
        }
        PrintStream record = new PrintStream(new FileOutputStream("vm-record.txt", true), true, "UTF-8");
        record.println("option -Djava.class.path=" + System.getProperty("java.class.path"));
        for (String option : ManagementFactory.getRuntimeMXBean().getInputArguments()) record.println("option " + option);
        record.println("vm " + System.getProperty("java.vm.info"));
        record.println("main " + args.length);
        for (String arg : args) record.println("arg " + arg);
        if (script.getProperty("say") != null) {
            System.out.println("said on standard output");
            System.err.println("said on standard error");
        }
        long end = System.currentTimeMillis() + Long.parseLong(script.getProperty("main_ms", "0"));
        String until = script.getProperty("until");
        while (System.currentTimeMillis() < end || (until != null && !Files.exists(Paths.get(until)))) Thread.sleep(20);
        if (script.getProperty("throw") != null) throw new IllegalStateException("asked to throw");
        if (script.getProperty("exit") != null) System.exit(Integer.parseInt(script.getProperty("exit")));
        record.println("end");
    }
}
