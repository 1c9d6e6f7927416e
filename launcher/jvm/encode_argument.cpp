#include "jvm.h"
void EncodeArgument(const char16_t*, char*) {}
bool EncodeArgumentInto(const char16_t*, EncodeBuffer*) { return false; }
