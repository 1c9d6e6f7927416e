#include "protection.h"
Status ProtectionCheckImage() { return 0; }
Status ProtectionCheckDebugger() { return 0; }
