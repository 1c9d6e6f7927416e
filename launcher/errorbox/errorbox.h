// The error box: what the user is told when the launch fails, and the texts of the string table it
// is told in. Below both the start-up sequence and the VM host, which call it; the platform file
// decides what a box is (errorbox_win32.cpp: a Windows message box; errorbox_x11.cpp: a line on
// standard error, and a dialog of our own when there is a display).
//
// Main thread only. ShowErrorBox returns when the user has dismissed the box.
#ifndef LAUNCHER_ERRORBOX_ERRORBOX_H
#define LAUNCHER_ERRORBOX_ERRORBOX_H

#include <stdint.h>

#include "../resources/resource_ids.h"

// Numbers of the string table, shared with the Windows resource script.
enum : int32_t {
    kMessageVmLibraryNotLoaded = IDS_VM_LIBRARY_NOT_LOADED,
    kMessageMainClassNotCalled = IDS_MAIN_CLASS_NOT_CALLED,
    kMessageVmNotCreated = IDS_VM_NOT_CREATED,
    kMessageCaption = IDS_CAPTION,
};

// A modal error box: `text` as it is (narrow), the caption string 7 or "Error", one OK button.
void ShowErrorBox(const char* text);

// String `id` of the string table as narrow text in a heap copy (never released); null when the
// executable has no such string.
char* LoadMessageText(int32_t id);

#endif
