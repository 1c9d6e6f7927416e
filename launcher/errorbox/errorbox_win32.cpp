// The error box and the string table on Windows. MessageBoxA is looked up in "user32" on every call
// and the module released after it, so a box can be shown whatever state the process is in.
#include "errorbox.h"

#include "../core/core.h"
#include "../text/text.h"

#include <windows.h>

namespace {
typedef int(WINAPI* MessageBoxAFn)(HWND, LPCSTR, LPCSTR, UINT);
const int kMessageUnits = 1024;
}  // namespace

char* LoadMessageText(int32_t id) {
    WCHAR message[kMessageUnits];
    if (LoadStringW(GetModuleHandleW(nullptr), static_cast<UINT>(id), message, kMessageUnits) <= 0) return nullptr;
    return NarrowCopy(reinterpret_cast<const char16_t*>(message));
}

void ShowErrorBox(const char* text) {
    const UINT codePage = CP_THREAD_ACP;
    HMODULE user32 = LoadLibraryW(L"user32");

    WCHAR caption[kMessageUnits];
    if (LoadStringW(GetModuleHandleW(nullptr), kMessageCaption, caption, kMessageUnits) == 0) lstrcpyW(caption, L"Error");

    if (user32 == nullptr) RaiseException(kErrorBoxNoUser32, EXCEPTION_NONCONTINUABLE, 0, nullptr);
    MessageBoxAFn messageBox = reinterpret_cast<MessageBoxAFn>(reinterpret_cast<void*>(GetProcAddress(user32, "MessageBoxA")));
    if (messageBox == nullptr) RaiseException(kErrorBoxNoMessageBox, EXCEPTION_NONCONTINUABLE, 0, nullptr);

    // Two bytes per caption unit are enough for any code page the launcher runs under.
    char narrowCaption[(kMessageUnits + 1) * 2];
    int length = lstrlenW(caption);
    const char* shownCaption = narrowCaption;
    if (WideCharToMultiByte(codePage, 0, caption, -1, narrowCaption, (length + 1) * 2, nullptr, nullptr) == 0)
        shownCaption = nullptr;

    messageBox(nullptr, text, shownCaption, MB_OK | MB_ICONERROR | MB_TOPMOST);
    FreeLibrary(user32);
}
