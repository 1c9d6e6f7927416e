// Fuzz target for the UTF-8 decoding of arguments. Whatever the bytes: the decoder stays inside its
// input and output, its size answer matches what it writes, and where it replaced nothing the text
// encodes back to exactly the bytes it came from.
#include <stdlib.h>
#include <string.h>

#include "core/core.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    char* text = static_cast<char*>(malloc(size + 1));
    memcpy(text, data, size);
    text[size] = 0;
    int units = WideSize(text);
    if (units <= 0) abort();
    char16_t* wide = static_cast<char16_t*>(malloc(static_cast<size_t>(units) * sizeof(char16_t)));
    if (ToWide(text, -1, wide, units) != units || wide[units - 1] != 0) abort();
    bool replaced = false;
    for (int i = 0; i + 1 < units; ++i) replaced = replaced || wide[i] == 0xFFFD;
    if (!replaced) {
        int bytes = NarrowSize(wide);
        char* back = static_cast<char*>(malloc(static_cast<size_t>(bytes > 0 ? bytes : 1)));
        if (bytes <= 0 || ToNarrow(wide, back, bytes) != bytes || strcmp(back, text) != 0) abort();
        free(back);
    }
    free(wide);
    free(text);
    return 0;
}
