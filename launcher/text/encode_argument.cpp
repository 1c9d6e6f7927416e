// The argument encoding (text.h): every UTF-16 unit as four lower-case hex digits, so any text
// survives as plain ASCII on its way to main or over the hand-off.
#include "text.h"

#include <stdint.h>
#include <stdlib.h>

namespace {
const char kHexDigits[] = "0123456789abcdef";
}  // namespace

bool EncodeArgument(const char16_t* text, EncodeBuffer* buffer) {
    if (buffer->text == nullptr) {
        char* empty = static_cast<char*>(malloc(1));
        if (empty == nullptr) return false;
        empty[0] = 0;
        buffer->text = empty;
        buffer->capacity = 1;
    }
    size_t units = Utf16Length(text);
    if (units == 0) return true;
    if (units > (SIZE_MAX - 1) / 4) return false;
    size_t needed = 4 * units + 1;
    if (buffer->capacity < needed) {
        // A fresh block, so the previous text stays intact when memory runs out.
        char* grown = static_cast<char*>(malloc(needed));
        if (grown == nullptr) return false;
        free(buffer->text);
        buffer->text = grown;
        buffer->capacity = needed;
    }
    char* out = buffer->text;
    for (size_t i = 0; i < units; ++i) {
        unsigned unit = text[i];
        out[4 * i + 0] = kHexDigits[(unit >> 12) & 0xF];
        out[4 * i + 1] = kHexDigits[(unit >> 8) & 0xF];
        out[4 * i + 2] = kHexDigits[(unit >> 4) & 0xF];
        out[4 * i + 3] = kHexDigits[unit & 0xF];
    }
    out[4 * units] = 0;
    return true;
}
