// Inside the splash: the portable pieces each platform's window (splash_win32.cpp, splash_x11.cpp)
// draws and fades with. The picture is the executable's own ("SPLASH" resource on Windows, linked in
// elsewhere), a whole bitmap file image read by the portable reader below (splash_bitmap.cpp). Any
// thread: nothing here keeps state but the caller's.
#ifndef LAUNCHER_SPLASH_SPLASH_PLATFORM_H
#define LAUNCHER_SPLASH_SPLASH_PLATFORM_H

#include <stddef.h>
#include <stdint.h>

// The fade: opacities 64, 68, ... 252 (never full 255), one per step; the step after 252 ends the
// fade. `alpha` is the splash's fade state, starting at kSplashFirstAlpha and never reset. Returns
// the opacity (0-255) to apply now, or -1 when the fade is over and its timer should stop.
enum { kSplashFirstAlpha = 64, kSplashAlphaStep = 4, kSplashFadeIntervalMs = 5 };
int SplashFadeNext(int* alpha);

// Bitmap file image reader (portable, bounds-checked).
struct SplashBitmapInfo {
    int32_t width;         // |biWidth|
    int32_t height;        // |biHeight|
    size_t infoOffset;     // offset of the BITMAPINFOHEADER (14)
    size_t pixelOffset;    // offset of the pixels, or 0 when the bit count is not drawable
};
// False when the data is not a "BM" image or too short for the headers the splash reads.
bool ReadSplashBitmap(const uint8_t* data, size_t size, SplashBitmapInfo* info);

// The picture as width * height pixels 0x00RRGGBB, top row first, into `out`. Uncompressed 24, 8,
// 4 and 1 bit pictures, bottom-up or top-down; false for anything the reader cannot draw (the
// window then shows nothing drawn, as on Windows).
bool DecodeSplashPixels(const uint8_t* data, size_t size, const SplashBitmapInfo& info, uint32_t* out);

// Where the executable has no resources (the X11 build), the picture is linked in under `name`: the
// build generates the definition (resources/embed_picture.py). False when there is none of that name.
bool FindLinkedSplashPicture(const char* name, const uint8_t** data, size_t* size);

#endif
