// Narrow text on Windows: the calling thread's ANSI code page (CP_THREAD_ACP), flags 0.
#include "text.h"
#include "text_win32.h"

#include <windows.h>
#include <stdarg.h>
#include <stdio.h>

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

void FormatText(char* out, size_t size, const char* format, ...) {
    if (size == 0) return;
    va_list args;
    va_start(args, format);
    _vsnprintf(out, size - 1, format, args);  // does not terminate a text that fills the buffer
    va_end(args);
    out[size - 1] = 0;
}

void PrintText(const char* format, ...) {
    // Formatted by the C runtime itself and written with fputs: MinGW's C++ headers would turn a
    // plain vprintf into its own, much larger, printf.
    char text[1024];
    va_list args;
    va_start(args, format);
    _vsnprintf(text, sizeof text - 1, format, args);
    va_end(args);
    text[sizeof text - 1] = 0;
    fputs(text, stdout);
}
