// Inside the self-protection stage: the checksum of the first check over a file held in memory
// (protection.cpp), for each platform's file to apply to its own executable. The build stamps the
// same value after linking (stamp_checksum.py). Any thread: nothing here keeps state.
//
// The sum: the little-endian 16-bit words of the file (an odd last byte as a word of its own), the
// four bytes of the stamp field counted as zero, summed with end-around carry, then the file length
// added.
#ifndef LAUNCHER_PROTECTION_PROTECTION_PLATFORM_H
#define LAUNCHER_PROTECTION_PROTECTION_PLATFORM_H

#include "../core/core.h"

// A PE file's bytes against the image checksum field of its optional header (offset 64, the same
// for 32- and 64-bit images): kProtectionPassed, kProtectionImageAltered or kProtectionImageUnreadable
// (not a PE image, or a header that does not fit in `length`).
Status VerifyImageChecksum(const uint8_t* image, uint32_t length);
// The same comparison for a stamp field at `fieldOffset` (four little-endian bytes inside the file).
Status VerifyStampedChecksum(const uint8_t* image, uint32_t length, uint32_t fieldOffset);

#endif
