// What every room of the launcher agrees on: the status codes, the few fixed names that more than
// one room uses, and the two pieces of process-wide state that cross room borders. Each room keeps
// its own names (the main class, the instance name, the log's path) to itself.
//
// Portable: no platform header is included here. UTF-16 text is char16_t everywhere in portable
// code; on Windows it is the same representation as wchar_t, and the *_win32.cpp files convert the
// pointer type at their border.
//
// Threads: the state below is the launcher's main thread's; the constants may be read anywhere.
#ifndef LAUNCHER_CORE_CORE_H
#define LAUNCHER_CORE_CORE_H

#include <stddef.h>
#include <stdint.h>

// ---- Status codes: every code the launcher ends with or logs, in one place. Results are signed
// 32-bit: 0 success, small negative numbers for the launcher's own failures, other values passed
// through unchanged from the VM or the self-protection stage. The result of the path taken becomes
// the process exit code (a POSIX parent sees only its low 8 bits, so the POSIX launcher also prints it).
typedef int32_t Status;

enum : int32_t {
    kStatusOk = 0,
    kStatusNotFound = -1,     // VM library not loaded, its entry point missing, or a class not found
    kStatusNoMainMethod = -2, // the main class has no static main(String[])
    kStatusNoVmSilent = -3,   // the VM was not created and there was no message text

    // Self-protection results. They are chosen apart from every other exit code: the VM host's
    // -1..-3, the JNI errors -1..-6, the log codes 1012 and -767, exception codes of a crash. Their
    // low bytes (213, 214, 57, 58) differ from those codes' low bytes too.
    kProtectionPassed = 0,
    kProtectionImageAltered = 6101,     // the file's checksum differs from the one stamped at build time
    kProtectionImageUnreadable = 6102,  // our own file could not be read or has no stamp field
    kProtectionDebuggerLocal = 6201,    // the process is being debugged or traced
    kProtectionDebuggerRemote = 6202,   // a debugger is attached from outside (Windows only)

    // Codes of the start-up sequence's error lines in the log.
    kLogCodeLoadError = 1012,
    kLogCodeDebugger = -767,
};

// Non-continuable exceptions of the Windows error box when the window manager's entry is missing.
enum : uint32_t {
    kErrorBoxNoUser32 = 0x05400010u,
    kErrorBoxNoMessageBox = 0x05400011u,
};

// ---- Fixed names shared by rooms. Constants of the build, never read from the environment.

// The switch that keeps the splash away (start-up) and is handed to Java as an option (VM host).
#define LAUNCHER_NO_SPLASH_SWITCH u"-noSplash"

// Paths of the platform's own calls, in UTF-16 units (MAX_PATH).
enum { kMaxPathUnits = 260 };

// ---- Process-wide state that crosses room borders.

// "QZ-Lumiscope_QZ-57.exe" once the documents folder was found, empty otherwise: the tag of the
// start-up sequence's log lines. Written by the start-up sequence before any other thread exists.
extern char ModuleName[260];

// Set when "-noSplash" is the first argument (start-up) or any argument (VM host); read by the
// start-up sequence before it starts the splash. Main thread only.
extern bool NoSplash;

#endif
