// Splash screen: a borderless, fading picture on a thread of its own.
//
// SplashStart and SplashClose are called on the main thread (start-up sequence, VM host); the
// splash thread owns the window and its message loop. The two share only the window handle.
// Every failure is silent: the launch goes on without a splash.
#ifndef LAUNCHER_SPLASH_SPLASH_H
#define LAUNCHER_SPLASH_SPLASH_H

#include "../core/core.h"

struct SplashParams {
    void* hwndParent;       // owner window, may be null
    void* hInstance;        // instance of the window class and window
    void* hResourceModule;  // module holding the "SPLASH" resource
    const char* resourceName;
    uint16_t displayMs;     // longest time shown, counted from just before the window shows
    int32_t centerOnScreen; // non-zero: centred on the primary screen
    int32_t topMost;
    int32_t waitForClose;   // non-zero: SplashStart returns when the splash thread has ended
    int32_t centerX;        // picture centre when centerOnScreen is 0
    int32_t centerY;
};

// Copies `params` and starts the splash thread; returns at once unless waitForClose is set.
void SplashStart(const SplashParams* params);
// Closes the splash window and returns once it is gone; does nothing when there is none.
void SplashClose();

// Bitmap file image reader (portable, bounds-checked): the resource is a whole .bmp file image.
struct SplashBitmapInfo {
    int32_t width;         // |biWidth|
    int32_t height;        // |biHeight|
    size_t infoOffset;     // offset of the BITMAPINFOHEADER (14)
    size_t pixelOffset;    // offset of the pixels, or 0 when the bit count is not drawable
};
// False when the data is not a "BM" image or too short for the headers the splash reads.
bool ReadSplashBitmap(const uint8_t* data, size_t size, SplashBitmapInfo* info);

#endif
