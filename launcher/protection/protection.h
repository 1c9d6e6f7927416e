// Self-protection stage: two checks that run between the splash and the VM launch. Each returns a
// signed 32-bit result, 0 meaning passed; the start-up sequence turns a failure into its error box
// and uses the result as the exit code. Main thread only.
//
// Built with LAUNCHER_PROTECTION=1 (the CMake option LAUNCHER_PROTECTION, on by default). Without it
// both checks are compiled as "passed" and nothing of them reaches the executable, so the launcher
// can be stepped through in a debugger.
#ifndef LAUNCHER_PROTECTION_PROTECTION_H
#define LAUNCHER_PROTECTION_PROTECTION_H

#include "../core/core.h"

// Results of the checks. They become the process exit code, so they are chosen apart from every
// other exit code of the launcher: the VM host's own -1..-3, the JNI errors -1..-6 passed through
// from the VM, the start-up log codes 1012 and -767, and the exception codes of a crash. Their low
// bytes (213, 214, 57, 58) also differ from those codes' low bytes, for tools that see only the
// low byte of an exit code. The 6xxx range is the self-protection stage's.
enum {
    kProtectionPassed = 0,
    kProtectionImageAltered = 6101,     // the file's checksum differs from the one stamped at build time
    kProtectionImageUnreadable = 6102,  // our own file could not be opened, mapped or parsed as an image
    kProtectionDebuggerLocal = 6201,    // the process is being debugged (IsDebuggerPresent)
    kProtectionDebuggerRemote = 6202,   // a debugger is attached to the process (CheckRemoteDebuggerPresent)
};

// Integrity of the launcher's own executable file (first check): its stamped image checksum
// against one computed afresh. A stamp of 0 (an unstamped development build) passes.
Status ProtectionCheckImage();
// No debugger attached to the process, local or remote (second check).
Status ProtectionCheckDebugger();

// ---- Portable pieces of the first check (protection.cpp).

// Finds the image checksum field of a PE file held in memory: its byte offset (optional header +
// 64, the same for 32- and 64-bit images). False when the bytes are not a PE image or the header
// does not fit in `length`.
bool FindImageChecksumField(const uint8_t* image, uint32_t length, uint32_t* fieldOffset);
// The image checksum of `length` bytes, the four bytes at `fieldOffset` counted as zero: the
// little-endian 16-bit words (an odd last byte as a word of its own) summed with end-around carry,
// then the file length added.
uint32_t ComputeImageChecksum(const uint8_t* image, uint32_t length, uint32_t fieldOffset);
// The first check over a file's bytes: kProtectionPassed, kProtectionImageAltered or
// kProtectionImageUnreadable (not a PE image).
Status VerifyImageChecksum(const uint8_t* image, uint32_t length);

#endif
