// Inside the start-up sequence: what each platform's file (startup_win32.cpp, startup_posix.cpp)
// provides to RunLauncher, in the order it is called. Main thread only.
#ifndef LAUNCHER_STARTUP_STARTUP_PLATFORM_H
#define LAUNCHER_STARTUP_STARTUP_PLATFORM_H

#include <stdint.h>

// The log file's full path in `path` (kMaxPathUnits units): the user's documents folder (created
// when missing) joined with the log's relative path. False when there is no documents folder; the
// path is then empty.
bool FindLogPath(char16_t* path);
// The command line as UTF-16 texts, argv[0] the program as started; kept for the life of the process.
char16_t** SplitCommandLine(int32_t* argc);
// Makes the application directory the current directory (a failure leaves it as it was).
void EnterApplicationDirectory(const char16_t* argv0);

#endif
