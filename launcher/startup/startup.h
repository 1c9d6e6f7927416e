// Launcher start-up: the entry point (WinMain in startup_win32.cpp) and the error box.
//
// ShowErrorBox is the launcher's one way of telling the user that something went wrong: a modal,
// topmost box with the error icon and one OK button. The text is shown as it is (narrow, the
// thread's code page); the caption is string 7 of the executable's string table, or "Error".
// Called on the main thread only, by the start-up sequence and the VM host; it returns when the
// user has dismissed the box. It raises a non-continuable exception when the window manager's
// entry cannot be found (kErrorBoxNoUser32 / kErrorBoxNoMessageBox), which nobody catches.
#ifndef LAUNCHER_STARTUP_STARTUP_H
#define LAUNCHER_STARTUP_STARTUP_H

#include "../core/core.h"

enum : uint32_t {
    kErrorBoxNoUser32 = 0x05400010u,
    kErrorBoxNoMessageBox = 0x05400011u,
};

void ShowErrorBox(const char* text);

#endif
