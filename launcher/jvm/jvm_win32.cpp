#include "jvm.h"
Status LoadJvmLibrary(const char*) { return -1; }
Status LaunchJavaApplication(void*, int32_t, char16_t**) { return -1; }
