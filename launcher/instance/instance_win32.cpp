#include "instance.h"
#include <windows.h>
void* AcquireInstanceLock(const char16_t* name) {
    HANDLE h = CreateMutexW(nullptr, TRUE, reinterpret_cast<LPCWSTR>(name));
    if (GetLastError() == ERROR_ALREADY_EXISTS) return nullptr;
    return h;
}
void ActivateRunningInstances() {}
Status ForwardArguments(char16_t**, int32_t) { return -1; }
