// Narrow text on POSIX systems: UTF-8. From UTF-16, an unpaired surrogate fails the conversion, as a
// strict code-page conversion does on Windows; into UTF-16, ill-formed bytes are replaced.
#include "text.h"

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
// non-null); returns the units written/needed, or 0 when `out` is too small. Arguments arrive as
// bytes, so nothing is refused: every maximal subpart of an ill-formed sequence becomes one U+FFFD
// (overlong forms, encoded surrogates and values above U+10FFFF are ill-formed), as the Unicode
// Standard recommends: C0 AF gives two, ED A0 80 three, F4 90 80 80 four.
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
    auto byteAt = [&](int i) -> int { return sourceBytes >= 0 && i >= sourceBytes ? -1 : s[i]; };
    for (int i = 0; sourceBytes < 0 || i < sourceBytes;) {
        uint32_t c = s[i];
        // Length of the sequence and the range of its second byte (Unicode's table of well-formed
        // byte sequences); a lead byte outside the table is a maximal subpart of one byte.
        int length = c < 0x80 ? 1 : c < 0xC2 ? 0 : c < 0xE0 ? 2 : c < 0xF0 ? 3 : c < 0xF5 ? 4 : 0;
        int low = c == 0xE0 ? 0xA0 : c == 0xF0 ? 0x90 : 0x80;
        int high = c == 0xED ? 0x9F : c == 0xF4 ? 0x8F : 0xBF;
        uint32_t cp = length <= 1 ? c : c & (0x7F >> length);  // the lead byte's payload bits
        int taken = 1;
        for (; taken < length; ++taken) {
            int next = byteAt(i + taken);
            if (next < (taken == 1 ? low : 0x80) || next > (taken == 1 ? high : 0xBF)) break;
            cp = (cp << 6) | (static_cast<uint32_t>(next) & 0x3F);
        }
        i += taken;
        if (length == 0 || taken < length) {
            if (!put(0xFFFD)) return 0;
        } else if (cp >= 0x10000) {
            cp -= 0x10000;
            if (!put(static_cast<char16_t>(0xD800 + (cp >> 10))) || !put(static_cast<char16_t>(0xDC00 + (cp & 0x3FF))))
                return 0;
        } else if (!put(static_cast<char16_t>(cp))) {
            return 0;
        } else if (cp == 0 && sourceBytes < 0) {
            break;
        }
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
