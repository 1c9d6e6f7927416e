// The checksum of the first self-protection check, over a file held in memory. The build stamps
// the same value into the file after linking (tools/stamp_checksum.py).
#include "protection.h"

namespace {

uint32_t ReadU16(const uint8_t* p) { return static_cast<uint32_t>(p[0]) | (static_cast<uint32_t>(p[1]) << 8); }

uint32_t ReadU32(const uint8_t* p) { return ReadU16(p) | (ReadU16(p + 2) << 16); }

// Layout of the headers, as far as the checksum needs it.
const uint32_t kDosHeaderSize = 0x40;
const uint32_t kPeHeaderOffsetField = 0x3C;     // e_lfanew
const uint32_t kFileHeaderSize = 20;            // after the 4-byte "PE\0\0"
const uint32_t kChecksumInOptionalHeader = 64;  // the same in PE32 and PE32+
const uint32_t kPe32Magic = 0x10B;
const uint32_t kPe32PlusMagic = 0x20B;

}  // namespace

bool FindImageChecksumField(const uint8_t* image, uint32_t length, uint32_t* fieldOffset) {
    if (length < kDosHeaderSize || image[0] != 'M' || image[1] != 'Z') return false;
    const uint32_t pe = ReadU32(image + kPeHeaderOffsetField);
    const uint32_t optional = pe + 4 + kFileHeaderSize;
    // Everything up to the end of the checksum field must lie inside the file; the first test keeps
    // the sums below from wrapping.
    if (pe > length || length - pe < 4 + kFileHeaderSize + kChecksumInOptionalHeader + 4) return false;
    if (image[pe] != 'P' || image[pe + 1] != 'E' || image[pe + 2] != 0 || image[pe + 3] != 0) return false;
    const uint32_t magic = ReadU16(image + optional);
    if (magic != kPe32Magic && magic != kPe32PlusMagic) return false;
    *fieldOffset = optional + kChecksumInOptionalHeader;
    return true;
}

uint32_t ComputeImageChecksum(const uint8_t* image, uint32_t length, uint32_t fieldOffset) {
    uint32_t sum = 0;
    for (uint32_t i = 0; i < length; i += 2) {
        // Bytes of the checksum field count as zero (unsigned wrap: i < fieldOffset is far away).
        uint32_t low = (i - fieldOffset < 4) ? 0 : image[i];
        uint32_t high = 0;
        if (i + 1 < length && i + 1 - fieldOffset >= 4) high = image[i + 1];
        sum += low | (high << 8);
        sum = (sum & 0xFFFF) + (sum >> 16);
    }
    return sum + length;
}

Status VerifyImageChecksum(const uint8_t* image, uint32_t length) {
    uint32_t field = 0;
    if (!FindImageChecksumField(image, length, &field)) return kProtectionImageUnreadable;
    return VerifyStampedChecksum(image, length, field);
}

Status VerifyStampedChecksum(const uint8_t* image, uint32_t length, uint32_t field) {
    if (field > length || length - field < 4) return kProtectionImageUnreadable;
    const uint32_t stamped = ReadU32(image + field);
    if (stamped == 0) return kProtectionPassed;  // an unstamped development build
    return ComputeImageChecksum(image, length, field) == stamped ? kProtectionPassed : kProtectionImageAltered;
}
