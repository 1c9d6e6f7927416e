// Every status code of the launcher and what it means, in one place. Results are signed 32-bit:
// 0 success, small negative numbers for the launcher's own failures, other values passed through
// unchanged from the VM or the self-protection stage. The result of the path taken becomes the
// process exit code (a POSIX parent sees only its low 8 bits, so the POSIX launcher also prints it).
#ifndef LAUNCHER_CORE_STATUS_H
#define LAUNCHER_CORE_STATUS_H

#include <stdint.h>

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

#endif
