// Narrow text on Windows: the calling thread's ANSI code page (CP_THREAD_ACP), flags 0.
#include "core.h"

#include <windows.h>

int NarrowSize(const char16_t* text) {
    if (text == nullptr) return 0;
    return WideCharToMultiByte(CP_THREAD_ACP, 0, reinterpret_cast<LPCWSTR>(text), -1, nullptr, 0, nullptr, nullptr);
}

int WideSize(const char* text) {
    if (text == nullptr) return 0;
    return MultiByteToWideChar(CP_THREAD_ACP, 0, text, -1, nullptr, 0);
}

int ToNarrow(const char16_t* text, char* out, int outBytes) {
    if (text == nullptr) return 0;
    return WideCharToMultiByte(CP_THREAD_ACP, 0, reinterpret_cast<LPCWSTR>(text), -1, out, outBytes, nullptr,
                               nullptr);
}

int ToWide(const char* text, int sourceBytes, char16_t* out, int outUnits) {
    if (text == nullptr) return 0;
    return MultiByteToWideChar(CP_THREAD_ACP, 0, text, sourceBytes, reinterpret_cast<LPWSTR>(out), outUnits);
}
