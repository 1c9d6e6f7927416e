// Splash screen: a borderless, fading picture on a thread of its own.
//
// SplashStart and SplashClose are called on the main thread (start-up sequence, VM host); the
// splash thread owns the window and its event loop. The two share only what SplashClose needs to
// reach the window. Every failure is silent: the launch goes on without a splash.
//
// The picture is the executable's own ("SPLASH" resource on Windows, linked in elsewhere), a whole
// bitmap file image read by the portable reader below. Platform files: splash_win32.cpp,
// splash_x11.cpp.
#ifndef LAUNCHER_SPLASH_SPLASH_H
#define LAUNCHER_SPLASH_SPLASH_H

#include "../core/core.h"

struct SplashParams {
    const char* resourceName; // the picture's name in the executable
    uint16_t displayMs;       // longest time shown, counted from just before the window shows
    int32_t centerOnScreen;   // non-zero: centred on the primary screen
    int32_t topMost;
    int32_t waitForClose;     // non-zero: SplashStart returns when the splash thread has ended
    int32_t centerX;          // picture centre when centerOnScreen is 0
    int32_t centerY;
};

// Copies `params` and starts the splash thread; returns at once unless waitForClose is set.
void SplashStart(const SplashParams* params);
// Closes the splash window and returns once it is gone; does nothing when there is none.
void SplashClose();

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

// The picture linked into the executable under `name` (splash_picture.cpp, generated at build
// time on platforms without resources); false when there is none of that name.
bool FindLinkedSplashPicture(const char* name, const uint8_t** data, size_t* size);

#endif
