// A DLL that the dependent variant of the VM double imports from, standing in for the runtime's
// own DLLs next to the VM library's folder (jre\bin).
#include <windows.h>

extern "C" __declspec(dllexport) int __stdcall vmdouble_rt_ping(void) {
    return 57;
}

extern "C" BOOL WINAPI DllMain(HINSTANCE, DWORD, LPVOID) {
    return TRUE;
}
