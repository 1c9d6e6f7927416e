// Narrow text on POSIX systems: UTF-8. Unpaired surrogates and invalid sequences fail the
// conversion, as a strict code-page conversion does on Windows.
#include "core.h"

#include <stdarg.h>
#include <stdio.h>

namespace {

// Encodes `text` as UTF-8 into `out` (when non-null, capacity `outBytes`); returns the bytes needed
// including the terminator, or 0 on failure.
int EncodeUtf8(const char16_t* text, char* out, int outBytes) {
    int n = 0;
    auto put = [&](unsigned char c) -> bool {
        if (out != nullptr) {
            if (n >= outBytes) return false;
            out[n] = static_cast<char>(c);
        }
        ++n;
        return true;
    };
    for (size_t i = 0;; ++i) {
        uint32_t cp = text[i];
        if (cp >= 0xD800 && cp <= 0xDBFF) {
            uint32_t lo = text[i + 1];
            if (lo < 0xDC00 || lo > 0xDFFF) return 0;
            cp = 0x10000 + ((cp - 0xD800) << 10) + (lo - 0xDC00);
            ++i;
        } else if (cp >= 0xDC00 && cp <= 0xDFFF) {
            return 0;
        }
        bool ok;
        if (cp < 0x80) {
            ok = put(static_cast<unsigned char>(cp));
        } else if (cp < 0x800) {
            ok = put(0xC0 | (cp >> 6)) && put(0x80 | (cp & 0x3F));
        } else if (cp < 0x10000) {
            ok = put(0xE0 | (cp >> 12)) && put(0x80 | ((cp >> 6) & 0x3F)) && put(0x80 | (cp & 0x3F));
        } else {
            ok = put(0xF0 | (cp >> 18)) && put(0x80 | ((cp >> 12) & 0x3F)) && put(0x80 | ((cp >> 6) & 0x3F)) &&
                 put(0x80 | (cp & 0x3F));
        }
        if (!ok) return 0;
        if (cp == 0) return n;
    }
}

// Decodes at most `sourceBytes` bytes (-1: through the terminator) of UTF-8 into `out` (when
// non-null); returns the units written/needed, or 0 on failure.
int DecodeUtf8(const char* text, int sourceBytes, char16_t* out, int outUnits) {
    const unsigned char* s = reinterpret_cast<const unsigned char*>(text);
    int n = 0;
    auto put = [&](char16_t u) -> bool {
        if (out != nullptr) {
            if (n >= outUnits) return false;
            out[n] = u;
        }
        ++n;
        return true;
    };
    for (int i = 0; sourceBytes < 0 || i < sourceBytes;) {
        uint32_t c = s[i];
        int extra = c < 0x80 ? 0 : (c >> 5) == 6 ? 1 : (c >> 4) == 14 ? 2 : (c >> 3) == 30 ? 3 : -1;
        if (extra < 0) return 0;
        if (sourceBytes >= 0 && i + extra >= sourceBytes) return 0;
        uint32_t cp = extra == 0 ? c : c & (0x3F >> extra);
        for (int k = 1; k <= extra; ++k) {
            if ((s[i + k] & 0xC0) != 0x80) return 0;
            cp = (cp << 6) | (s[i + k] & 0x3F);
        }
        i += extra + 1;
        if (cp >= 0x10000) {
            cp -= 0x10000;
            if (!put(static_cast<char16_t>(0xD800 + (cp >> 10))) || !put(static_cast<char16_t>(0xDC00 + (cp & 0x3FF))))
                return 0;
        } else if (!put(static_cast<char16_t>(cp))) {
            return 0;
        }
        if (cp == 0 && sourceBytes < 0) break;
    }
    return n;
}

}  // namespace

int NarrowSize(const char16_t* text) { return text == nullptr ? 0 : EncodeUtf8(text, nullptr, 0); }
int WideSize(const char* text) { return text == nullptr ? 0 : DecodeUtf8(text, -1, nullptr, 0); }
int ToNarrow(const char16_t* text, char* out, int outBytes) {
    return text == nullptr ? 0 : EncodeUtf8(text, out, outBytes);
}
int ToWide(const char* text, int sourceBytes, char16_t* out, int outUnits) {
    return text == nullptr ? 0 : DecodeUtf8(text, sourceBytes, out, outUnits);
}

void FormatText(char* out, size_t size, const char* format, ...) {
    if (size == 0) return;
    va_list args;
    va_start(args, format);
    vsnprintf(out, size, format, args);
    va_end(args);
}

void PrintText(const char* format, ...) {
    va_list args;
    va_start(args, format);
    vprintf(format, args);
    va_end(args);
}
