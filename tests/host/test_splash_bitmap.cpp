// The splash picture's header reader: sizes, where the pixels start, and what counts as absent.
#include <gtest/gtest.h>

#include <stdint.h>
#include <string.h>

#include <vector>

#include "splash/splash.h"

namespace {

void Put16(std::vector<uint8_t>& image, size_t at, uint16_t value) {
    image[at] = static_cast<uint8_t>(value);
    image[at + 1] = static_cast<uint8_t>(value >> 8);
}

void Put32(std::vector<uint8_t>& image, size_t at, uint32_t value) {
    for (int i = 0; i < 4; ++i) image[at + i] = static_cast<uint8_t>(value >> (8 * i));
}

size_t TableBytes(int bits) { return bits == 24 ? 0 : bits == 8 ? 1024 : bits == 4 ? 64 : bits == 1 ? 8 : 0; }

// A complete, uncompressed bitmap file image with a full colour table and zeroed pixels.
// bfOffBits and biClrUsed hold values the reader must not use.
std::vector<uint8_t> MakeImage(int bits, int32_t width, int32_t height, uint32_t infoSize = 40) {
    size_t stride = ((static_cast<size_t>(width < 0 ? -width : width) * bits + 31) / 32) * 4;
    size_t rows = static_cast<size_t>(height < 0 ? -height : height);
    size_t size = 14 + infoSize + TableBytes(bits) + stride * rows;
    std::vector<uint8_t> image(size, 0);
    image[0] = 'B';
    image[1] = 'M';
    Put32(image, 2, static_cast<uint32_t>(size));
    Put32(image, 10, 9999);  // bfOffBits: ignored
    Put32(image, 14, infoSize);
    Put32(image, 18, static_cast<uint32_t>(width));
    Put32(image, 22, static_cast<uint32_t>(height));
    Put16(image, 26, 1);
    Put16(image, 28, static_cast<uint16_t>(bits));
    Put32(image, 46, 2);  // biClrUsed: ignored, the table is always full
    return image;
}

bool Read(const std::vector<uint8_t>& image, SplashBitmapInfo* info) {
    return ReadSplashBitmap(image.data(), image.size(), info);
}

TEST(SplashBitmap, PixelsFollowTheFullColourTableOfEachDrawnBitCount) {
    struct Case { int bits; size_t pixels; } cases[] = {{24, 54}, {8, 54 + 1024}, {4, 54 + 64}, {1, 54 + 8}};
    for (const Case& c : cases) {
        SCOPED_TRACE(c.bits);
        SplashBitmapInfo info;
        ASSERT_TRUE(Read(MakeImage(c.bits, 33, 7), &info));
        EXPECT_EQ(33, info.width);
        EXPECT_EQ(7, info.height);
        EXPECT_EQ(14u, info.infoOffset);
        EXPECT_EQ(c.pixels, info.pixelOffset);
    }
}

TEST(SplashBitmap, LongerInfoHeaderMovesThePixels) {
    SplashBitmapInfo info;
    ASSERT_TRUE(Read(MakeImage(8, 16, 4, 124), &info));
    EXPECT_EQ(14u + 124u + 1024u, info.pixelOffset);
}

TEST(SplashBitmap, NegativeSizesGivePositiveOnes) {
    SplashBitmapInfo info;
    ASSERT_TRUE(Read(MakeImage(24, 300, -200), &info));  // stored top-down
    EXPECT_EQ(300, info.width);
    EXPECT_EQ(200, info.height);
    ASSERT_TRUE(Read(MakeImage(24, -5, 3), &info));
    EXPECT_EQ(5, info.width);
    EXPECT_EQ(3, info.height);

    std::vector<uint8_t> image = MakeImage(24, 1, 1);
    Put32(image, 22, 0x80000000u);  // no positive twin
    EXPECT_FALSE(Read(image, &info));
}

TEST(SplashBitmap, OtherBitCountsAreSizedButNotDrawn) {
    for (int bits : {16, 32, 0, 2, 48}) {
        SCOPED_TRACE(bits);
        std::vector<uint8_t> image = MakeImage(24, 300, 200);
        Put16(image, 28, static_cast<uint16_t>(bits));
        image.resize(54);  // their pixels are never read, so they need not be there
        SplashBitmapInfo info;
        ASSERT_TRUE(Read(image, &info));
        EXPECT_EQ(300, info.width);
        EXPECT_EQ(200, info.height);
        EXPECT_EQ(0u, info.pixelOffset);
    }
}

TEST(SplashBitmap, WithoutTheSignatureThePictureIsAbsent) {
    SplashBitmapInfo info;
    for (const char* signature : {"BA", "MB", "bm", "\0\0"}) {
        std::vector<uint8_t> image = MakeImage(24, 4, 4);
        memcpy(image.data(), signature, 2);
        EXPECT_FALSE(Read(image, &info)) << signature;
    }
    EXPECT_FALSE(ReadSplashBitmap(nullptr, 100, &info));
}

TEST(SplashBitmap, EveryCutThroughHeadersTableOrRowsIsAbsent) {
    for (int bits : {24, 8, 4, 1}) {
        SCOPED_TRACE(bits);
        std::vector<uint8_t> whole = MakeImage(bits, 13, 5);  // rows with padding
        SplashBitmapInfo info;
        ASSERT_TRUE(Read(whole, &info));
        for (size_t size = 0; size < whole.size(); ++size) {
            // A private copy of exactly `size` bytes, so that a sanitizer sees any read past it.
            std::vector<uint8_t> cut(whole.begin(), whole.begin() + static_cast<long>(size));
            EXPECT_FALSE(ReadSplashBitmap(cut.data(), cut.size(), &info)) << "size " << size;
        }
        whole.push_back(0);  // trailing bytes do no harm
        EXPECT_TRUE(Read(whole, &info));
    }
}

TEST(SplashBitmap, HeaderSizesThatCannotFitAreAbsent) {
    SplashBitmapInfo info;
    for (uint32_t infoSize : {0u, 12u, 39u, 0xFFFFFFFFu, 0xFFFFFFF0u, 0x80000000u}) {
        std::vector<uint8_t> image = MakeImage(8, 4, 4);
        Put32(image, 14, infoSize);
        EXPECT_FALSE(Read(image, &info)) << infoSize;
    }
    // Dimensions whose rows would wrap a 32-bit or 64-bit size.
    for (uint32_t side : {0x7FFFFFFFu, 0x40000000u, 0x10000u}) {
        std::vector<uint8_t> image = MakeImage(24, 1, 1);
        Put32(image, 18, side);
        Put32(image, 22, side);
        EXPECT_FALSE(Read(image, &info)) << side;
    }
}

TEST(SplashBitmap, EmptyPictureHasNoRowsToRead) {
    SplashBitmapInfo info;
    ASSERT_TRUE(Read(MakeImage(24, 0, 0), &info));
    EXPECT_EQ(0, info.width);
    EXPECT_EQ(0, info.height);
    std::vector<uint8_t> image = MakeImage(8, 0, 0);
    Put32(image, 22, 100000);  // many rows of width 0 still take no bytes
    EXPECT_TRUE(Read(image, &info));
}

TEST(SplashBitmap, RunLengthPicturesNeedTheirStoredLength) {
    std::vector<uint8_t> image = MakeImage(8, 64, 64);
    image.resize(14 + 40 + 1024 + 100);
    Put32(image, 30, 1);  // BI_RLE8
    SplashBitmapInfo info;
    Put32(image, 34, 100);
    EXPECT_TRUE(Read(image, &info));
    EXPECT_EQ(14u + 40u + 1024u, info.pixelOffset);
    Put32(image, 34, 101);
    EXPECT_FALSE(Read(image, &info));
    Put32(image, 34, 0);
    EXPECT_FALSE(Read(image, &info));
}

}  // namespace
