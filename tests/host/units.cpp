// The launcher's pure pieces that the scenario table cannot reach cheaply: the splash picture reader
// with broken and unusual pictures, as one table; and three properties that must hold for any input,
// run here over the table's pictures and a few texts, and built with FUZZ_TARGET as libFuzzer targets.
//   units                 run the table and the properties (always under ASan and UBSan)
//   units --seeds DIR     write the table's pictures to DIR, as seeds for the picture fuzz target
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include <string>
#include <vector>

#include "splash/splash_platform.h"
#include "text/text.h"

namespace {

int g_checks;
void Check(bool ok, const char* what, long detail = 0) {
    ++g_checks;
    if (!ok) fprintf(stderr, "FAILED: %s (%ld)\n", what, detail), abort();
}

// Whatever the bytes, the reader reads none past them, and an uncompressed picture it accepts has
// every pixel row it promised: the decoder, which checks again, draws it.
int Picture(const uint8_t* data, size_t size) {
    SplashBitmapInfo info;
    if (!ReadSplashBitmap(data, size, &info)) return 0;
    Check(info.width >= 0 && info.height >= 0 && info.infoOffset == 14 && info.pixelOffset <= size, "accepted inside its bytes");
    if (info.pixelOffset == 0 || data[30] || data[31] || data[32] || data[33] || uint64_t(info.width) * info.height > 1 << 22) return 0;
    std::vector<uint32_t> pixels(size_t(info.width) * info.height + 1);
    Check(DecodeSplashPixels(data, size, info, pixels.data()), "an accepted picture draws");
    return 0;
}

// UTF-8 arguments: the decoder stays inside its input and output, its size answer matches what it
// writes, and where it replaced nothing the text encodes back to exactly its bytes.
int Utf8(const uint8_t* data, size_t size) {
    std::string text(reinterpret_cast<const char*>(data), size);
    text = text.c_str();
    int units = WideSize(text.c_str());
    std::vector<char16_t> wide(units > 0 ? units : 1);
    Check(units > 0 && ToWide(text.c_str(), -1, wide.data(), units) == units && wide[units - 1] == 0, "decoded size");
    for (int i = 0; i + 1 < units; ++i)
        if (wide[i] == 0xFFFD) return 0;
    int bytes = NarrowSize(wide.data());
    std::vector<char> back(bytes > 0 ? bytes : 1);
    Check(bytes > 0 && ToNarrow(wide.data(), back.data(), bytes) == bytes && text == back.data(), "round trip");
    return 0;
}

// Argument encoding: four lower-case hex digits per UTF-16 unit that decode back to it; an empty
// argument leaves the reused buffer holding the previous one.
int Encode(const uint8_t* data, size_t size) {
    std::u16string text;
    for (size_t i = 0; i + 1 < size && (data[i] || data[i + 1]); i += 2) text += char16_t(data[i] | data[i + 1] << 8);
    EncodeBuffer buffer = {nullptr, 0};
    Check(EncodeArgument(u"x", &buffer) && EncodeArgument(text.c_str(), &buffer), "encoded");
    std::string want = text.empty() ? "0078" : "";
    for (char16_t unit : text) want += "0123456789abcdef"[unit >> 12], want += "0123456789abcdef"[unit >> 8 & 15],
                                       want += "0123456789abcdef"[unit >> 4 & 15], want += "0123456789abcdef"[unit & 15];
    Check(want == buffer.text, "encoding", long(text.size()));
    free(buffer.text);
    return 0;
}

typedef std::vector<uint8_t> Image;
void Put(Image& image, size_t at, uint32_t value, int bytes = 4) {
    for (int i = 0; i < bytes; ++i) image[at + i] = uint8_t(value >> (8 * i));
}
// An uncompressed bitmap file image, full colour table, zeroed pixels; bfOffBits and biClrUsed hold
// values the reader must not use.
Image Make(int bits, int32_t width, int32_t height, uint32_t infoSize = 40) {
    size_t table = bits == 8 ? 1024 : bits == 4 ? 64 : bits == 1 ? 8 : 0;
    Image image(14 + infoSize + table + (size_t(abs(width)) * bits + 31) / 32 * 4 * abs(height), 0);
    image[0] = 'B', image[1] = 'M';
    Put(image, 10, 9999), Put(image, 14, infoSize), Put(image, 18, width), Put(image, 22, height), Put(image, 26, 1, 2);
    Put(image, 28, bits, 2), Put(image, 46, 2);
    return image;
}

std::vector<Image> PictureTable() {
    std::vector<Image> seen;
    SplashBitmapInfo info;
    auto read = [&](const Image& image) { seen.push_back(image); return ReadSplashBitmap(image.data(), image.size(), &info); };
    struct { int bits, width, height; uint32_t infoSize; int wantWidth, wantHeight; size_t pixels; } sized[] = {
        {24, 33, 7, 40, 33, 7, 54}, {8, 33, 7, 40, 33, 7, 54 + 1024}, {4, 33, 7, 40, 33, 7, 54 + 64}, {1, 33, 7, 40, 33, 7, 54 + 8},
        {8, 16, 4, 124, 16, 4, 14 + 124 + 1024},  // a longer info header moves the pixels
        {24, 300, -200, 40, 300, 200, 54}, {24, -5, 3, 40, 5, 3, 54}, {24, 0, 0, 40, 0, 0, 54}};
    for (auto& c : sized)
        Check(read(Make(c.bits, c.width, c.height, c.infoSize)) && info.width == c.wantWidth && info.height == c.wantHeight &&
              info.infoOffset == 14 && info.pixelOffset == c.pixels, "sized", c.bits * 1000 + c.width);
    for (int bits : {16, 32, 0, 2, 48}) {  // sized but not drawn, so their pixels need not be there
        Image image = Make(24, 300, 200);
        Put(image, 28, bits, 2), image.resize(54);
        Check(read(image) && info.width == 300 && info.height == 200 && info.pixelOffset == 0, "not drawn", bits);
    }
    Check(!read(Image()), "no bytes at all");
    struct { int bits; size_t at; uint32_t value, bytes, height; } rejected[] = {  // one field changed (and the height)
        {24, 0, 'B' | 'A' << 8, 2}, {24, 0, 'M' | 'B' << 8, 2}, {24, 0, 'b' | 'm' << 8, 2},  // signatures
        {8, 14, 0}, {8, 14, 12}, {8, 14, 39}, {8, 14, 0xFFFFFFFF}, {8, 14, 0xFFFFFFF0}, {8, 14, 0x80000000},  // info header sizes
        {24, 18, 0x7FFFFFFF, 4, 0x7FFFFFFF}, {24, 18, 0x40000000, 4, 0x40000000}, {24, 18, 0x10000, 4, 0x10000},  // rows that wrap
        {24, 18, 1, 4, 0x80000000}};  // a height with no positive twin
    for (auto& r : rejected) {
        Image image = Make(r.bits, 1, 1);
        Put(image, r.at, r.value, r.bytes ? r.bytes : 4), Put(image, 22, r.height ? r.height : 1);
        Check(!read(image), "rejected", long(r.at << 32 | r.value));
    }
    for (int bits : {24, 8, 4, 1}) {  // every cut through headers, table or padded rows is absent
        Image whole = Make(bits, 13, 5);
        for (size_t size = 1; size < whole.size(); ++size) Check(!read(Image(whole.begin(), whole.begin() + size)), "cut", long(size));
        whole.push_back(0);
        Check(read(whole), "trailing bytes do no harm", bits);
    }
    Image rle = Make(8, 64, 64);
    rle.resize(14 + 40 + 1024 + 100), Put(rle, 30, 1);  // BI_RLE8: its stored length must be there
    for (uint32_t stored : {100u, 101u, 0u}) Put(rle, 34, stored), Check(read(rle) == (stored == 100), "run-length size", long(stored));
    // Pixels: 2 x 2 at 24 bits bottom-up, and at 1 bit top-down through its colour table.
    Image rgb = Make(24, 2, 2), mono = Make(1, 2, -2);
    Put(rgb, 54, 0x010203, 3), Put(rgb, 57, 0x040506, 3), Put(rgb, 62, 0x0A0B0C, 3);
    Put(mono, 54, 0x112233), Put(mono, 58, 0x445566), mono[62] = 0x40, mono[66] = 0x80;
    uint32_t pixels[4];
    Check(read(rgb) && DecodeSplashPixels(rgb.data(), rgb.size(), info, pixels) && pixels[0] == 0x0A0B0C && pixels[1] == 0 &&
          pixels[2] == 0x010203 && pixels[3] == 0x040506, "24-bit pixels, bottom row first in the file");
    Check(read(mono) && DecodeSplashPixels(mono.data(), mono.size(), info, pixels) && pixels[0] == 0x112233 && pixels[1] == 0x445566 &&
          pixels[2] == 0x445566 && pixels[3] == 0x112233, "1-bit pixels, top row first in the file");
    return seen;
}

}  // namespace

#ifdef FUZZ_TARGET
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) { return FUZZ_TARGET(data, size); }
#else
int main(int argc, char** argv) {
    std::vector<Image> pictures = PictureTable();
    for (size_t i = 0; argc == 3 && i < pictures.size(); ++i) {
        if (pictures[i].empty()) continue;
        FILE* file = fopen((std::string(argv[2]) + "/" + std::to_string(i) + ".bmp").c_str(), "wb");
        fwrite(pictures[i].data(), 1, pictures[i].size(), file), fclose(file);
    }
    for (const Image& image : pictures) Picture(image.data(), image.size());
    const char* texts[] = {"", "a", "M\xc3\xbcller", "\xf0\x9f\x98\x80", "\xc0\xaf", "\xed\xa0\x80", "a\xe2\x82", "\xf4\x90\x80\x80"};
    for (const char* text : texts) Utf8(reinterpret_cast<const uint8_t*>(text), strlen(text));
    for (const char* text : texts) Encode(reinterpret_cast<const uint8_t*>(text), strlen(text));
    printf("units: %d checks passed\n", g_checks);
}
#endif
