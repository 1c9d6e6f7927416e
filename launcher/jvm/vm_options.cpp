#include "jvm.h"
void AddVmOption(const char*) {}
Status CreateVm() { return -1; }
Status DestroyVm() { return -1; }
