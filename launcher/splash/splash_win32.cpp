#include "splash.h"
void SplashStart(const SplashParams*) {}
void SplashClose() {}
