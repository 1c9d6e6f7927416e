// The splash picture's header reader: sizes, where the pixels start, and what counts as absent.
// (Reads past the end for arbitrary bytes are the fuzz target's job, tests/fuzz.)
#include <gtest/gtest.h>

#include <stdint.h>
#include <string.h>

#include <vector>

#include "splash/splash.h"

namespace {

typedef std::vector<uint8_t> Image;

void Put(Image& image, size_t at, uint32_t value, int bytes = 4) {
    for (int i = 0; i < bytes; ++i) image[at + i] = static_cast<uint8_t>(value >> (8 * i));
}

// A complete, uncompressed bitmap file image with a full colour table and zeroed pixels.
// bfOffBits and biClrUsed hold values the reader must not use.
Image MakeImage(int bits, int32_t width, int32_t height, uint32_t infoSize = 40) {
    size_t table = bits == 8 ? 1024 : bits == 4 ? 64 : bits == 1 ? 8 : 0;
    size_t stride = ((static_cast<size_t>(width < 0 ? -width : width) * bits + 31) / 32) * 4;
    Image image(14 + infoSize + table + stride * static_cast<size_t>(height < 0 ? -height : height), 0);
    image[0] = 'B';
    image[1] = 'M';
    Put(image, 10, 9999);  // bfOffBits
    Put(image, 14, infoSize);
    Put(image, 18, static_cast<uint32_t>(width));
    Put(image, 22, static_cast<uint32_t>(height));
    Put(image, 26, 1, 2);
    Put(image, 28, static_cast<uint32_t>(bits), 2);
    Put(image, 46, 2);  // biClrUsed: the table is always full
    return image;
}

bool Read(const Image& image, SplashBitmapInfo* info) { return ReadSplashBitmap(image.data(), image.size(), info); }

TEST(SplashBitmap, SizesAndPixelsBehindTheFullColourTable) {
    struct Case {
        int bits, width, height;
        uint32_t infoSize;
        int wantWidth, wantHeight;
        size_t pixels;
    } cases[] = {
        {24, 33, 7, 40, 33, 7, 54},          {8, 33, 7, 40, 33, 7, 54 + 1024},
        {4, 33, 7, 40, 33, 7, 54 + 64},      {1, 33, 7, 40, 33, 7, 54 + 8},
        {8, 16, 4, 124, 16, 4, 14 + 124 + 1024},  // a longer info header moves the pixels
        {24, 300, -200, 40, 300, 200, 54},   // stored top-down
        {24, -5, 3, 40, 5, 3, 54},           {24, 0, 0, 40, 0, 0, 54},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << c.bits << " bits " << c.width << "x" << c.height);
        SplashBitmapInfo info;
        ASSERT_TRUE(Read(MakeImage(c.bits, c.width, c.height, c.infoSize), &info));
        EXPECT_EQ(c.wantWidth, info.width);
        EXPECT_EQ(c.wantHeight, info.height);
        EXPECT_EQ(14u, info.infoOffset);
        EXPECT_EQ(c.pixels, info.pixelOffset);
    }
    Image rowsOfNothing = MakeImage(8, 0, 0);
    Put(rowsOfNothing, 22, 100000);  // many rows of width 0 still take no bytes
    SplashBitmapInfo info;
    EXPECT_TRUE(Read(rowsOfNothing, &info));
}

TEST(SplashBitmap, OtherBitCountsAreSizedButNotDrawn) {
    for (int bits : {16, 32, 0, 2, 48}) {
        SCOPED_TRACE(bits);
        Image image = MakeImage(24, 300, 200);
        Put(image, 28, static_cast<uint32_t>(bits), 2);
        image.resize(54);  // their pixels are never read, so they need not be there
        SplashBitmapInfo info;
        ASSERT_TRUE(Read(image, &info));
        EXPECT_EQ(300, info.width);
        EXPECT_EQ(200, info.height);
        EXPECT_EQ(0u, info.pixelOffset);
    }
}

TEST(SplashBitmap, WithoutSignatureOrWithImpossibleHeadersThePictureIsAbsent) {
    SplashBitmapInfo info;
    for (const char* signature : {"BA", "MB", "bm", "\0\0"}) {
        Image image = MakeImage(24, 4, 4);
        memcpy(image.data(), signature, 2);
        EXPECT_FALSE(Read(image, &info)) << signature;
    }
    EXPECT_FALSE(ReadSplashBitmap(nullptr, 100, &info));
    for (uint32_t infoSize : {0u, 12u, 39u, 0xFFFFFFFFu, 0xFFFFFFF0u, 0x80000000u}) {
        Image image = MakeImage(8, 4, 4);
        Put(image, 14, infoSize);
        EXPECT_FALSE(Read(image, &info)) << infoSize;
    }
    // Dimensions whose rows would wrap a 32-bit or 64-bit size, and the height with no positive twin.
    for (uint32_t side : {0x7FFFFFFFu, 0x40000000u, 0x10000u, 0x80000000u}) {
        Image image = MakeImage(24, 1, 1);
        Put(image, 18, side == 0x80000000u ? 1 : side);
        Put(image, 22, side);
        EXPECT_FALSE(Read(image, &info)) << side;
    }
}

TEST(SplashBitmap, EveryCutThroughHeadersTableOrRowsIsAbsent) {
    for (int bits : {24, 8, 4, 1}) {
        SCOPED_TRACE(bits);
        Image whole = MakeImage(bits, 13, 5);  // rows with padding
        SplashBitmapInfo info;
        for (size_t size = 0; size < whole.size(); ++size) {
            Image cut(whole.begin(), whole.begin() + static_cast<long>(size));
            EXPECT_FALSE(Read(cut, &info)) << "size " << size;
        }
        whole.push_back(0);  // trailing bytes do no harm
        EXPECT_TRUE(Read(whole, &info));
    }
}

TEST(SplashBitmap, RunLengthPicturesNeedTheirStoredLength) {
    Image image = MakeImage(8, 64, 64);
    image.resize(14 + 40 + 1024 + 100);
    Put(image, 30, 1);  // BI_RLE8
    SplashBitmapInfo info;
    Put(image, 34, 100);
    EXPECT_TRUE(Read(image, &info));
    EXPECT_EQ(14u + 40u + 1024u, info.pixelOffset);
    Put(image, 34, 101);
    EXPECT_FALSE(Read(image, &info));
    Put(image, 34, 0);
    EXPECT_FALSE(Read(image, &info));
}

}  // namespace
