// run.exe: starts a program with a given command line and working directory, dismisses its
// message boxes, and prints what happened. For trying the launcher by hand under Wine:
//   wine run.exe C:\app "C:\app\QZ-Lumiscope_QZ-57.exe" "\"C:\app\QZ-Lumiscope_QZ-57.exe\" -noSplash"
// Output: one "box" line per message box, then "exit 0x%08x (%d)". Exit code: the program's.
#include <stdio.h>

#include "support/testbed.h"

int wmain(int argc, wchar_t** argv) {
    if (argc != 4) {
        fprintf(stderr, "usage: run WORKDIR APPLICATION COMMANDLINE\n");
        return 2;
    }
    bed::RunOptions options;
    options.timeoutMs = 600000;
    bed::RunResult result = bed::Run(argv[2], argv[3], argv[1], options);
    for (const auto& box : result.boxes)
        printf("box caption=\"%s\" text=\"%s\" errorIcon=%d\n", box.caption.c_str(), box.text.c_str(),
               box.errorIcon ? 1 : 0);
    printf("exit 0x%08lx (%ld)%s\n", static_cast<unsigned long>(result.exitCode), static_cast<long>(result.exitCode),
           result.timedOut ? " after the time limit" : "");
    return static_cast<int>(result.exitCode);
}
