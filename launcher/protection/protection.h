// Self-protection stage: two checks that run between the splash and the VM launch. Each returns a
// signed 32-bit result, 0 meaning passed; the start-up sequence turns a failure into its error box
// and uses the result as the exit code. Main thread only.
#ifndef LAUNCHER_PROTECTION_PROTECTION_H
#define LAUNCHER_PROTECTION_PROTECTION_H

#include "../core/core.h"

// Integrity of the launcher's own executable image (first check).
Status ProtectionCheckImage();
// No debugger attached to the process (second check).
Status ProtectionCheckDebugger();

#endif
