// Self-protection stage: two checks that run between the splash and the VM launch. Each returns a
// signed 32-bit result (kProtection* in core.h), 0 meaning passed; the start-up sequence turns a
// failure into its error box and uses the result as the exit code. Caller: the start-up sequence,
// main thread only. Platform files: protection_win32.cpp (the PE image checksum field;
// IsDebuggerPresent), protection_posix.cpp (a stamp field in the executable's data; TracerPid), over
// the portable checksum of protection_platform.h.
//
// Built with LAUNCHER_PROTECTION=1 (the CMake option LAUNCHER_PROTECTION, on by default). Without it
// both checks are compiled as "passed" and nothing of them reaches the executable, so the launcher
// can be stepped through in a debugger.
#ifndef LAUNCHER_PROTECTION_PROTECTION_H
#define LAUNCHER_PROTECTION_PROTECTION_H

#include "../core/core.h"

// Integrity of the launcher's own executable file (first check): the checksum stamped into it at
// build time (stamp_checksum.py, a step of the launcher's build) against one computed afresh. A
// stamp of 0 (an unstamped development build) passes.
Status ProtectionCheckImage();
// No debugger attached to the process (second check).
Status ProtectionCheckDebugger();

#endif
