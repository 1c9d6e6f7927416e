// The splash picture's file image: a BITMAPFILEHEADER ("BM", 14 bytes), a BITMAPINFOHEADER at
// offset 14, the colour table and the pixels. Only the fields the splash needs are read, little-endian
// and byte by byte, so the reader runs the same on every host and never reads unaligned.
//
// The pixels are looked for right behind the colour table, whose size follows from the bit count
// alone; bfOffBits and biClrUsed are ignored on purpose, so a palette picture has to carry its full
// table. The resource is our own, but it is still checked against its size: a file image too short
// for the headers, or for the table and rows that the drawing would read, is treated as absent.
#include "splash_platform.h"

namespace {

enum : size_t {
    kFileHeaderBytes = 14,
    kInfoHeaderBytes = 40,  // BITMAPINFOHEADER, read whole by the drawing code
    kWidthAt = 18,
    kHeightAt = 22,
    kBitCountAt = 28,
    kCompressionAt = 30,
    kSizeImageAt = 34,
};

uint32_t ReadU32(const uint8_t* p) {
    return static_cast<uint32_t>(p[0]) | static_cast<uint32_t>(p[1]) << 8 | static_cast<uint32_t>(p[2]) << 16 |
           static_cast<uint32_t>(p[3]) << 24;
}

uint16_t ReadU16(const uint8_t* p) { return static_cast<uint16_t>(p[0] | p[1] << 8); }

// |value| of a stored signed 32-bit field; false for the one value that has no positive twin.
bool AbsoluteSize(uint32_t stored, int32_t* out) {
    if (stored == 0x80000000u) return false;
    int32_t value = static_cast<int32_t>(stored);
    *out = value < 0 ? -value : value;
    return true;
}

// Colour table bytes for the bit counts that are drawn; -1 for the others.
long ColourTableBytes(uint16_t bitCount) {
    switch (bitCount) {
        case 24: return 0;
        case 8: return 1024;
        case 4: return 64;
        case 1: return 8;
        default: return -1;
    }
}

}  // namespace

bool ReadSplashBitmap(const uint8_t* data, size_t size, SplashBitmapInfo* info) {
    if (data == nullptr || size < kFileHeaderBytes + kInfoHeaderBytes) return false;
    if (data[0] != 0x42 || data[1] != 0x4D) return false;

    int32_t width = 0;
    int32_t height = 0;
    if (!AbsoluteSize(ReadU32(data + kWidthAt), &width) || !AbsoluteSize(ReadU32(data + kHeightAt), &height)) {
        return false;
    }
    info->width = width;
    info->height = height;
    info->infoOffset = kFileHeaderBytes;
    info->pixelOffset = 0;

    uint16_t bitCount = ReadU16(data + kBitCountAt);
    long table = ColourTableBytes(bitCount);
    if (table < 0) return true;  // a picture of the right size in which nothing is drawn

    // Everything from here on is what the drawing reads: the info header as long as it says it is
    // (at least a BITMAPINFOHEADER), the table and the rows. Sizes are compared by subtraction so
    // that no sum can wrap.
    uint32_t infoSize = ReadU32(data + kFileHeaderBytes);
    if (infoSize < kInfoHeaderBytes) return false;
    size_t rest = size - kFileHeaderBytes;
    if (infoSize > rest || static_cast<size_t>(table) > rest - infoSize) return false;
    size_t pixelOffset = kFileHeaderBytes + infoSize + static_cast<size_t>(table);
    size_t pixelBytes = size - pixelOffset;

    if (ReadU32(data + kCompressionAt) == 0) {
        // Uncompressed rows, each padded to a multiple of four bytes. The row length fits easily in
        // 64 bits (at most 2^31 pixels of 24 bits); the row count is checked by division.
        uint64_t stride = ((static_cast<uint64_t>(width) * bitCount + 31) / 32) * 4;
        if (stride != 0 && static_cast<uint64_t>(height) > pixelBytes / stride) return false;
    } else {
        // Run-length pictures: the stored length of the compressed data must be there.
        uint32_t sizeImage = ReadU32(data + kSizeImageAt);
        if (sizeImage == 0 || sizeImage > pixelBytes) return false;
    }
    info->pixelOffset = pixelOffset;
    return true;
}

int SplashFadeNext(int* alpha) {
    if (*alpha >= 255) return -1;
    int now = *alpha;
    *alpha += kSplashAlphaStep;
    return now;
}

// The drawing side of the reader: every offset is checked again here, against the file image's own
// size, so the decoder stays safe whatever the caller did with the info it was given.
bool DecodeSplashPixels(const uint8_t* data, size_t size, const SplashBitmapInfo& info, uint32_t* out) {
    if (data == nullptr || out == nullptr || info.pixelOffset == 0) return false;
    if (size < kFileHeaderBytes + kInfoHeaderBytes || info.pixelOffset > size) return false;
    if (ReadU32(data + kCompressionAt) != 0) return false;
    uint16_t bitCount = ReadU16(data + kBitCountAt);
    long table = ColourTableBytes(bitCount);
    if (table < 0 || info.pixelOffset < kFileHeaderBytes + kInfoHeaderBytes + static_cast<size_t>(table)) return false;
    if (info.width <= 0 || info.height <= 0) return true;  // nothing to draw

    const uint8_t* palette = data + info.pixelOffset - table;
    const uint8_t* pixels = data + info.pixelOffset;
    uint64_t stride = ((static_cast<uint64_t>(info.width) * bitCount + 31) / 32) * 4;
    if (static_cast<uint64_t>(info.height) > (size - info.pixelOffset) / stride) return false;
    // A negative stored height is a top-down picture: its first row is the top one.
    bool topDown = static_cast<int32_t>(ReadU32(data + kHeightAt)) < 0;

    for (int32_t y = 0; y < info.height; ++y) {
        const uint8_t* row = pixels + stride * static_cast<uint64_t>(topDown ? y : info.height - 1 - y);
        uint32_t* target = out + static_cast<size_t>(y) * static_cast<size_t>(info.width);
        for (int32_t x = 0; x < info.width; ++x) {
            const uint8_t* bgr;  // blue, green, red: a 24-bit pixel or a colour table entry
            if (bitCount == 24) {
                bgr = row + 3 * static_cast<size_t>(x);
            } else {
                size_t bit = static_cast<size_t>(x) * bitCount;
                unsigned index = (row[bit / 8] >> (8 - bitCount - bit % 8)) & ((1u << bitCount) - 1);
                bgr = palette + 4 * index;
            }
            target[x] = static_cast<uint32_t>(bgr[2]) << 16 | static_cast<uint32_t>(bgr[1]) << 8 | bgr[0];
        }
    }
    return true;
}
