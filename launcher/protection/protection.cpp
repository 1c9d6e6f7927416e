// The checksum of the first self-protection check, over a file held in memory. The build stamps
// the same value into the file after linking (stamp_checksum.py).
#include "protection_platform.h"

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

// The image checksum field of a PE file held in memory: its byte offset. False when the bytes are not
// a PE image or the header does not fit in `length`.
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

// Adding with end-around carry word by word gives the same as adding plainly and folding the
// carries in at the end (both are the ones' complement sum, 0 only for an all-zero file), so the
// words are summed in 64 bits without a test per word, and the field's bytes are taken out again.
uint32_t ComputeImageChecksum(const uint8_t* image, uint32_t length, uint32_t fieldOffset) {
    uint64_t sum = 0;
    uint32_t i = 0;
    for (; length - i >= 2; i += 2) sum += ReadU16(image + i);
    if (i < length) sum += image[i];  // an odd last byte is a word of its own
    for (uint32_t k = 0; k < 4; ++k) {
        uint32_t at = fieldOffset + k;  // unsigned wrap: a field at the very end of the range
        if (at < length) sum -= static_cast<uint64_t>(image[at]) << (8 * (at & 1));
    }
    while (sum > 0xFFFF) sum = (sum & 0xFFFF) + (sum >> 16);
    return static_cast<uint32_t>(sum) + length;
}

}  // namespace

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
