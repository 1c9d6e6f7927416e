// The benchmark's stand-in application: prints System.nanoTime() (CLOCK_MONOTONIC on Linux) the
// moment main is entered, then returns. With BENCH_PRINT_OPTIONS set it also prints the options
// the VM was created with, so the benchmark can hand Debian's java exactly the launcher's options.
package com.qz.kpo.emu57.app;

public final class ApplicationMainForm {
    public static void main(String[] args) {
        long entered = System.nanoTime();
        System.out.println(entered);
        if (System.getenv("BENCH_PRINT_OPTIONS") != null) {
            for (String option : java.lang.management.ManagementFactory.getRuntimeMXBean().getInputArguments()) {
                System.out.println("option " + option);
            }
        }
    }
}
