// Runs one Swing program's main as the launcher would, waits until its windows have come up and nothing
// has opened or closed for a moment, then ends the VM normally, so that the class list the VM records
// (-XX:DumpLoadedClassList) is complete. Bounded: a program that shows no window within 90 s ends the
// run with status 3. Written with plain loops and no lambdas, so that it adds as few classes of its own
// to the list as it can.
//   java -cp training.jar:PROGRAM.jar TrainingRun MAIN_CLASS
import java.awt.EventQueue;
import java.awt.Window;
import java.util.ArrayList;
import java.util.List;

public final class TrainingRun extends Thread {
    static final long QUIET_MS = 1000, LIMIT_MS = 90_000;

    public static void main(String[] args) throws Exception {
        Thread watch = new TrainingRun();
        watch.setDaemon(true);
        watch.start();
        Class.forName(args[0]).getMethod("main", String[].class).invoke(null, (Object) new String[0]);
    }

    @Override public void run() {
        long start = System.currentTimeMillis(), changed = start;
        List<Window> shown = new ArrayList<>();
        try {
            while (System.currentTimeMillis() - start < LIMIT_MS) {
                Thread.sleep(50);
                List<Window> now = new ArrayList<>();
                for (Window window : Window.getWindows()) {
                    if (window.isShowing()) now.add(window);
                }
                if (!now.equals(shown)) {
                    shown = now;
                    changed = System.currentTimeMillis();
                } else if (!shown.isEmpty() && System.currentTimeMillis() - changed >= QUIET_MS) {
                    EventQueue.invokeAndWait(new Runnable() {  // what the last window's painting queued has run
                        @Override public void run() {}
                    });
                    System.exit(0);
                }
            }
        } catch (Exception e) {
            e.printStackTrace();
        }
        System.err.println("training: no window came up within " + LIMIT_MS / 1000 + " s");
        System.exit(3);
    }
}
