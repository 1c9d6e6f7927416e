// The launcher's pure pieces that the scenario table cannot reach cheaply, as one table of named
// behaviours: the splash picture reader with broken and unusual pictures, and the log with texts
// whose characters take more than one byte. Three properties that must hold for any input run here
// over the table's pictures and a few texts, and are built with FUZZ_TARGET as libFuzzer targets.
//   units                 run the table and the properties (always under ASan and UBSan)
//   units --seeds DIR     write the table's pictures to DIR, as seeds for the picture fuzz target
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "log/log.h"
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

// Argument encoding, in a buffer reused across arguments: four lower-case hex digits per UTF-16
// unit, which read back as hex give the unit again; an empty argument leaves the buffer holding the
// argument before it.
int Encode(const uint8_t* data, size_t size) {
    std::u16string text;
    for (size_t i = 0; i + 1 < size && (data[i] || data[i + 1]); i += 2) text += char16_t(data[i] | data[i + 1] << 8);
    EncodeBuffer buffer = {nullptr, 0};
    Check(EncodeArgument(u"x", &buffer) && EncodeArgument(text.c_str(), &buffer), "encoded");
    if (text.empty()) Check(strcmp(buffer.text, "0078") == 0, "an empty argument repeats the one before");
    Check(text.empty() || strlen(buffer.text) == 4 * text.size(), "four digits per unit", long(text.size()));
    for (size_t i = 0; i < text.size(); ++i) {
        const char* digits = buffer.text + 4 * i;
        Check(strspn(digits, "0123456789abcdef") >= 4, "lower-case hex digits", long(i));
        Check(strtoul(std::string(digits, 4).c_str(), nullptr, 16) == text[i], "the digits read back as the unit", long(i));
    }
    free(buffer.text);
    return 0;
}

typedef std::vector<uint8_t> Image;
void Put(Image& image, size_t at, uint32_t value, int bytes = 4) {
    for (int i = 0; i < bytes; ++i) image[at + i] = uint8_t(value >> (8 * i));
}
enum { kInfoSizeAt = 14, kWidthAt = 18, kHeightAt = 22, kBitCountAt = 28, kCompressionAt = 30, kSizeImageAt = 34 };
// An uncompressed bitmap file image, full colour table, zeroed pixels; bfOffBits and biClrUsed hold
// values the reader must not use.
Image Make(int bits, int32_t width, int32_t height, uint32_t infoSize = 40) {
    size_t table = bits == 8 ? 1024 : bits == 4 ? 64 : bits == 1 ? 8 : 0;
    Image image(14 + infoSize + table + (size_t(abs(width)) * bits + 31) / 32 * 4 * abs(height), 0);
    image[0] = 'B', image[1] = 'M';
    Put(image, 10, 9999), Put(image, kInfoSizeAt, infoSize), Put(image, kWidthAt, width), Put(image, kHeightAt, height);
    Put(image, 26, 1, 2), Put(image, kBitCountAt, bits, 2), Put(image, 46, 2);
    return image;
}

std::vector<Image> PictureTable() {
    std::vector<Image> seen;
    SplashBitmapInfo info;
    auto read = [&](const Image& image) { seen.push_back(image); return ReadSplashBitmap(image.data(), image.size(), &info); };
    struct Sized {
        const char* behaviour;
        Image image;
        int32_t width, height;
        size_t pixelsAt;
    } sized[] = {
        {"24 bits: the pixels right behind the two headers", Make(24, 33, 7), 33, 7, 54},
        {"8 bits: the pixels behind a table of 256 colours", Make(8, 33, 7), 33, 7, 54 + 1024},
        {"4 bits: the pixels behind a table of 16 colours", Make(4, 33, 7), 33, 7, 54 + 64},
        {"1 bit: the pixels behind a table of 2 colours", Make(1, 33, 7), 33, 7, 54 + 8},
        {"a longer info header moves the pixels", Make(8, 16, 4, 124), 16, 4, 14 + 124 + 1024},
        {"a top-down picture (negative height) is as high as its height's size", Make(24, 300, -200), 300, 200, 54},
        {"a negative width counts by its size", Make(24, -5, 3), 5, 3, 54},
        {"an empty picture is 0 by 0", Make(24, 0, 0), 0, 0, 54},
    };
    for (const Sized& c : sized)
        Check(read(c.image) && info.width == c.width && info.height == c.height && info.infoOffset == 14 &&
              info.pixelOffset == c.pixelsAt, c.behaviour);
    for (int bits : {16, 32, 0, 2, 48}) {  // sized but not drawn, so their pixels need not be there
        Image image = Make(24, 300, 200);
        Put(image, kBitCountAt, bits, 2), image.resize(54);
        Check(read(image) && info.width == 300 && info.height == 200 && info.pixelOffset == 0,
              "a bit count that is not drawn still gives the size", bits);
    }
    Check(!read(Image()), "no bytes at all are no picture");
    struct Broken {
        const char* behaviour;
        int bits;
        void (*change)(Image&);
    } rejected[] = {
        {"the signature BA is not a bitmap", 24, [](Image& i) { i[1] = 'A'; }},
        {"the signature reversed (MB) is not a bitmap", 24, [](Image& i) { i[0] = 'M', i[1] = 'B'; }},
        {"a lower-case signature is not a bitmap", 24, [](Image& i) { i[0] = 'b', i[1] = 'm'; }},
        {"an info header of no bytes", 8, [](Image& i) { Put(i, kInfoSizeAt, 0); }},
        {"an info header of 12 bytes (the old core header)", 8, [](Image& i) { Put(i, kInfoSizeAt, 12); }},
        {"an info header one byte short", 8, [](Image& i) { Put(i, kInfoSizeAt, 39); }},
        {"an info header longer than the file (its size wraps any sum)", 8, [](Image& i) { Put(i, kInfoSizeAt, 0xFFFFFFFF); }},
        {"an info header longer than the file", 8, [](Image& i) { Put(i, kInfoSizeAt, 0xFFFFFFF0); }},
        {"an info header of 2 GB", 8, [](Image& i) { Put(i, kInfoSizeAt, 0x80000000); }},
        {"rows of the largest picture, whose size wraps 32 bits", 24,
         [](Image& i) { Put(i, kWidthAt, 0x7FFFFFFF), Put(i, kHeightAt, 0x7FFFFFFF); }},
        {"rows of 2^30 by 2^30 pixels", 24, [](Image& i) { Put(i, kWidthAt, 0x40000000), Put(i, kHeightAt, 0x40000000); }},
        {"rows of 65536 by 65536 pixels", 24, [](Image& i) { Put(i, kWidthAt, 0x10000), Put(i, kHeightAt, 0x10000); }},
        {"a height of -2^31, which has no positive twin", 24, [](Image& i) { Put(i, kHeightAt, 0x80000000); }},
    };
    for (const Broken& c : rejected) {
        Image image = Make(c.bits, 1, 1);
        c.change(image);
        Check(!read(image), c.behaviour);
    }
    for (int bits : {24, 8, 4, 1}) {
        Image whole = Make(bits, 13, 5);
        for (size_t size = 1; size < whole.size(); ++size)
            Check(!read(Image(whole.begin(), whole.begin() + size)), "a picture cut anywhere in headers, table or rows is absent", long(size));
        whole.push_back(0);
        Check(read(whole), "bytes after the last row do no harm", bits);
    }
    Image rle = Make(8, 64, 64);
    rle.resize(14 + 40 + 1024 + 100), Put(rle, kCompressionAt, 1);  // run-length, 100 bytes of it
    for (uint32_t stored : {100u, 101u, 0u})
        Put(rle, kSizeImageAt, stored), Check(read(rle) == (stored == 100), "a run-length picture has the length it states", long(stored));
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

// The log's lines keep every character of their message however many bytes it takes as narrow
// text (UTF-8 here), and nothing is read past a text's end (AddressSanitizer would say so).
void LogTable() {
    char folder[] = "/tmp/units-log.XXXXXX";
    Check(mkdtemp(folder) != nullptr, "a folder for the log");
    std::string path = std::string(folder) + "/units.log";
    char16_t* widePath = WideCopy(path.c_str());
    LogOpen(widePath);
    free(widePath);
    LogWrite(0, u"tag", u"\u00e9\u00e9\u00e9\u00e9", 7);
    LogWrite(3, u"tag", u"a\u20ac\U0001F600", -1);
    LogClose();
    FILE* file = fopen(path.c_str(), "rb");
    std::u16string text;
    for (int low, high; file != nullptr && (low = fgetc(file)) != EOF && (high = fgetc(file)) != EOF;) text += char16_t(low | high << 8);
    if (file != nullptr) fclose(file);
    remove(path.c_str()), rmdir(folder);
    size_t lines = text.find(u"\r\n");
    Check(text.compare(0, 18, u"QZ_CW_startLOG : S") == 0 && lines != std::u16string::npos, "the start line");
    Check(text.substr(lines + 2) == u"tag : \u00e9\u00e9\u00e9\u00e9 : 7\r\ntag : a\u20ac\U0001F600 : -1\r\nEnded logging... : \r\n",
          "multi-byte messages logged whole");
}

}  // namespace

// The log keeps the texts it converts until the process ends, as the launcher does on purpose.
extern "C" const char* __lsan_default_suppressions() { return "leak:WidenForLog\nleak:NarrowCopy\n"; }

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
    LogTable();
    printf("units: %d checks passed\n", g_checks);
}
#endif
