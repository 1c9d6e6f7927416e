#include "splash.h"
bool ReadSplashBitmap(const uint8_t*, size_t, SplashBitmapInfo*) { return false; }
