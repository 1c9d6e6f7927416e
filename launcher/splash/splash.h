// Splash screen: a borderless, fading picture on a thread of its own.
//
// Callers: SplashStart by the start-up sequence, SplashClose by the start-up sequence and the VM
// host, both on the main thread; the splash thread owns the window and its event loop. The two share
// only what SplashClose needs to reach the window. Every failure is silent: the launch goes on
// without a splash. Platform files: splash_win32.cpp, splash_x11.cpp (splash_platform.h).
#ifndef LAUNCHER_SPLASH_SPLASH_H
#define LAUNCHER_SPLASH_SPLASH_H

#include <stdint.h>

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

#endif
