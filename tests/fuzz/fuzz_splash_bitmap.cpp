// Fuzz target for the splash picture's header reader. Whatever the bytes, the reader must not read
// past them, and what it accepts must be safe to draw: the pixel rows the drawing reads lie inside
// the data. Every byte it promises is touched here, so a sanitizer sees a broken promise.
#include <stddef.h>
#include <stdint.h>
#include <stdlib.h>
#include <string.h>

#include "splash/splash.h"

namespace {

uint32_t U32(const uint8_t* p) {
    return static_cast<uint32_t>(p[0]) | static_cast<uint32_t>(p[1]) << 8 | static_cast<uint32_t>(p[2]) << 16 |
           static_cast<uint32_t>(p[3]) << 24;
}

void Check(bool condition) {
    if (!condition) abort();
}

volatile uint8_t gSink;

void Touch(const uint8_t* data, size_t from, size_t to) {
    uint8_t sum = 0;
    for (size_t i = from; i < to; ++i) sum = static_cast<uint8_t>(sum + data[i]);
    gSink = sum;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    SplashBitmapInfo info;
    if (!ReadSplashBitmap(data, size, &info)) return 0;

    Check(size >= 54 && data[0] == 'B' && data[1] == 'M');
    Check(info.width >= 0 && info.height >= 0 && info.infoOffset == 14);
    Touch(data, 0, 54);  // both headers, as the drawing reads them
    if (info.pixelOffset == 0) return 0;

    uint16_t bits = static_cast<uint16_t>(data[28] | data[29] << 8);
    Check(bits == 24 || bits == 8 || bits == 4 || bits == 1);
    size_t table = bits == 24 ? 0 : bits == 8 ? 1024 : bits == 4 ? 64 : 8;
    Check(info.pixelOffset == 14 + static_cast<size_t>(U32(data + 14)) + table);
    Check(info.pixelOffset <= size);
    Touch(data, 14, info.pixelOffset);  // info header and colour table

    if (U32(data + 30) == 0) {
        uint64_t stride = ((static_cast<uint64_t>(info.width) * bits + 31) / 32) * 4;
        // Row by row, so no product can wrap.
        size_t at = info.pixelOffset;
        for (int32_t row = 0; row < info.height && stride != 0; ++row) {
            Check(stride <= size - at);
            Touch(data, at, at + static_cast<size_t>(stride));
            at += static_cast<size_t>(stride);
        }
    } else {
        uint32_t stored = U32(data + 34);
        Check(stored != 0 && stored <= size - info.pixelOffset);
        Touch(data, info.pixelOffset, info.pixelOffset + stored);
    }
    return 0;
}
