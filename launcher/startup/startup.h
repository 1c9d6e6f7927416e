// Launcher start-up: the fixed order of the start-up stages, written once (startup.cpp), over a
// small platform layer (startup_win32.cpp with WinMain, startup_posix.cpp with main).
//
// The start-up sequence sits on top of every other subsystem and calls each of them; nothing calls
// back up into it. Main thread only (on POSIX the "main thread" is the launcher thread that main
// starts, see startup_posix.cpp).
#ifndef LAUNCHER_STARTUP_STARTUP_H
#define LAUNCHER_STARTUP_STARTUP_H

#include "../core/core.h"

// The whole run: log, command line, application directory, instance lock, then either the
// second-instance hand-off (result 0) or splash, self-protection and the Java application (their
// result). The result is the process exit code.
Status RunLauncher();

// ---- Platform layer, called by RunLauncher in this order.

// The log file's full path in `path` (kMaxPathUnits units): the user's documents folder (created
// when missing) joined with the log's relative path. False when there is no documents folder; the
// path is then left empty.
bool FindLogPath(char16_t* path);
// The command line as UTF-16 texts, argv[0] the program as started; kept for the life of the process.
char16_t** SplitCommandLine(int32_t* argc);
// Makes the application directory the current directory (a failure leaves it as it was).
void EnterApplicationDirectory(const char16_t* argv0);

#endif
