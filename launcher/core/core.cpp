// The process-wide state that crosses room borders (core.h).
#include "core.h"

char ModuleName[260];
bool NoSplash = false;
