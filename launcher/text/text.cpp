// The portable half of the text room: UTF-16 helpers and the heap copies built on the platform's
// conversions.
#include "text.h"

#include <stdlib.h>

size_t Utf16Length(const char16_t* text) {
    size_t n = 0;
    while (text[n] != 0) ++n;
    return n;
}

int Utf16CompareNoCase(const char16_t* a, const char16_t* b) {
    for (;; ++a, ++b) {
        unsigned ca = *a, cb = *b;
        if (ca >= 'A' && ca <= 'Z') ca += 'a' - 'A';
        if (cb >= 'A' && cb <= 'Z') cb += 'a' - 'A';
        if (ca != cb) return ca < cb ? -1 : 1;
        if (ca == 0) return 0;
    }
}

char* NarrowCopy(const char16_t* text) {
    int size = NarrowSize(text);
    if (size <= 0) return nullptr;
    char* copy = static_cast<char*>(malloc(static_cast<size_t>(size) + 1));
    if (copy == nullptr) return nullptr;
    if (ToNarrow(text, copy, size + 1) == 0) {
        free(copy);
        return nullptr;
    }
    return copy;
}

char16_t* WideCopy(const char* text) {
    int size = WideSize(text);
    if (size <= 0) return nullptr;
    char16_t* copy = static_cast<char16_t*>(malloc((static_cast<size_t>(size) + 1) * sizeof(char16_t)));
    if (copy == nullptr) return nullptr;
    if (ToWide(text, -1, copy, size + 1) == 0) {
        free(copy);
        return nullptr;
    }
    return copy;
}
