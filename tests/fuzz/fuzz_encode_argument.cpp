// Fuzz target for the argument encoding shared by main's arguments and the hand-off: any UTF-16
// text gives four lower-case hex digits per unit that decode back to it, and an empty argument
// leaves the reused buffer holding the previous argument.
#include <stdlib.h>
#include <string.h>

#include "jvm/jvm.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    size_t units = size / 2;
    char16_t* text = static_cast<char16_t*>(malloc((units + 1) * sizeof(char16_t)));
    for (size_t i = 0; i < units; ++i) text[i] = static_cast<char16_t>(data[2 * i] | data[2 * i + 1] << 8);
    text[units] = 0;
    size_t length = Utf16Length(text);
    EncodeBuffer buffer = {nullptr, 0};
    if (!EncodeArgumentInto(u"x", &buffer) || !EncodeArgumentInto(text, &buffer)) abort();
    const char* expected = length == 0 ? "0078" : nullptr;  // an empty one repeats the one before
    if (expected != nullptr ? strcmp(buffer.text, expected) != 0 : strlen(buffer.text) != 4 * length) abort();
    for (size_t i = 0; expected == nullptr && i < length; ++i) {
        unsigned unit = 0;
        for (int k = 0; k < 4; ++k) {
            char c = buffer.text[4 * i + k];
            if (!((c >= '0' && c <= '9') || (c >= 'a' && c <= 'f'))) abort();
            unit = unit * 16 + static_cast<unsigned>(c <= '9' ? c - '0' : c - 'a' + 10);
        }
        if (unit != text[i]) abort();
    }
    free(buffer.text);
    free(text);
    return 0;
}
