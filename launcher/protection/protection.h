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

// Results: kProtection* in core/status.h. Platform files: protection_win32.cpp (the PE image
// checksum field; IsDebuggerPresent), protection_posix.cpp (a stamp field in the executable's data;
// TracerPid).

// Integrity of the launcher's own executable file (first check): the checksum stamped into it at
// build time against one computed afresh. A stamp of 0 (an unstamped development build) passes.
Status ProtectionCheckImage();
// No debugger attached to the process (second check).
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
// The first check over a PE file's bytes: kProtectionPassed, kProtectionImageAltered or
// kProtectionImageUnreadable (not a PE image).
Status VerifyImageChecksum(const uint8_t* image, uint32_t length);
// The same comparison for a stamp field at `fieldOffset` (four little-endian bytes inside the file).
Status VerifyStampedChecksum(const uint8_t* image, uint32_t length, uint32_t fieldOffset);

#endif
