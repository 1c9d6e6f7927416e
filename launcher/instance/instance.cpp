// Portable part of the single-instance hand-off: the instance name, the lock's name made of it, and
// the title and class tests of the window search, shared by every platform's window layer.
#include "instance.h"
#include "instance_platform.h"

#include "../text/text.h"

#include <string.h>

namespace {

// The instance name, 8-bit text: the byte string searched for in window titles, and, read as
// UTF-16, the lock's name. Stored with two zero bytes behind its 18, as it always has been.
const char InstanceName[20] = "QZ-Lumiscope_QZ-57";
enum { kInstanceNameBytes = 18 };

// The running application's frame class, as the class test compares with it.
const char16_t FrameClassName[] = u"com.qz.kpo.emu57.app.EmulatorFrame";
// Java's X11 toolkit names a frame's WM_CLASS after the main class, dots turned into dashes.
const char16_t kJavaToolkitClassName[] = u"com-qz-kpo-emu57-app-ApplicationMainForm";

}  // namespace

// Byte pairs, low byte first, so the name is the same on every host whatever its byte order.
void FormInstanceLockName(char16_t name[kInstanceLockNameUnits]) {
    const unsigned char* bytes = reinterpret_cast<const unsigned char*>(InstanceName);
    for (int i = 0; i < kInstanceNameBytes / 2; ++i) {
        name[i] = static_cast<char16_t>(bytes[2 * i] | bytes[2 * i + 1] << 8);
    }
    name[kInstanceNameBytes / 2] = 0;
}

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
    if (Utf16CompareNoCase(className, FrameClassName) == 0) return true;
    return javaToolkitClass && Utf16CompareNoCase(className, kJavaToolkitClassName) == 0;
}
