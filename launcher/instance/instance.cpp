// Portable part of the single-instance hand-off: the title and class tests of the window search,
// shared by every platform's window layer.
#include "instance.h"

#include <string.h>

namespace {

// Titles are looked at up to this many UTF-16 units, as the Windows side asks WM_GETTEXT for.
enum { kTitleUnits = 1024 };

const char16_t kFrameClassName[] = u"" LAUNCHER_FRAME_CLASS_NAME;
// Java's X11 toolkit names a frame's WM_CLASS after the main class, dots turned into dashes.
const char16_t kJavaToolkitClassName[] = u"com-qz-kpo-emu57-app-ApplicationMainForm";

}  // namespace

bool TitleHoldsInstanceName(const char16_t* title) {
    // Little-endian bytes, written out one by one so the test is the same on every host. The search
    // below stops at the first zero byte, whatever follows it.
    char bytes[2 * kTitleUnits + 1];
    size_t n = 0;
    for (size_t i = 0; i < kTitleUnits && title[i] != 0; ++i) {
        bytes[n++] = static_cast<char>(title[i] & 0xFF);
        bytes[n++] = static_cast<char>(title[i] >> 8);
    }
    bytes[n] = 0;
    return strstr(bytes, InstanceName) != nullptr;
}

bool IsFrameClassName(const char16_t* className, bool javaToolkitClass) {
    if (Utf16CompareNoCase(className, kFrameClassName) == 0) return true;
    return javaToolkitClass && Utf16CompareNoCase(className, kJavaToolkitClassName) == 0;
}
