// Launcher start-up: the fixed order of the start-up stages, written once (startup.cpp), over a
// small platform layer (startup_platform.h: startup_win32.cpp with WinMain, startup_posix.cpp with
// main).
//
// The start-up sequence sits on top of every other room and calls each of them; nothing calls back
// up into it. Caller: the platform's entry point, on the main thread (on POSIX the "main thread" is
// the launcher thread that main starts, see startup_posix.cpp).
#ifndef LAUNCHER_STARTUP_STARTUP_H
#define LAUNCHER_STARTUP_STARTUP_H

#include "../core/core.h"

// The whole run: log, command line, application directory, instance lock, then either the
// second-instance hand-off (result 0) or splash, self-protection and the Java application (their
// result). The result is the process exit code.
Status RunLauncher();

#endif
