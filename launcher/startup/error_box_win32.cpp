// The error box. MessageBoxA is looked up in "user32" on every call and the module released after
// it, so a box can be shown whatever state the process is in.
#include "startup.h"

#include <windows.h>

#include "../resources/resource_ids.h"

namespace {
typedef int(WINAPI* MessageBoxAFn)(HWND, LPCSTR, LPCSTR, UINT);
}

void ShowErrorBox(const char* text) {
    const UINT codePage = CP_THREAD_ACP;
    HMODULE user32 = LoadLibraryW(L"user32");

    WCHAR caption[1024];
    if (LoadStringW(GetModuleHandleW(nullptr), IDS_CAPTION, caption, 1024) == 0) lstrcpyW(caption, L"Error");

    if (user32 == nullptr) RaiseException(kErrorBoxNoUser32, EXCEPTION_NONCONTINUABLE, 0, nullptr);
    MessageBoxAFn messageBox = reinterpret_cast<MessageBoxAFn>(reinterpret_cast<void*>(GetProcAddress(user32, "MessageBoxA")));
    if (messageBox == nullptr) RaiseException(kErrorBoxNoMessageBox, EXCEPTION_NONCONTINUABLE, 0, nullptr);

    // Two bytes per caption unit are enough for any code page the launcher runs under.
    char narrowCaption[(1024 + 1) * 2];
    int length = lstrlenW(caption);
    const char* shownCaption = narrowCaption;
    if (WideCharToMultiByte(codePage, 0, caption, -1, narrowCaption, (length + 1) * 2, nullptr, nullptr) == 0)
        shownCaption = nullptr;

    messageBox(nullptr, text, shownCaption, MB_OK | MB_ICONERROR | MB_TOPMOST);
    FreeLibrary(user32);
}
