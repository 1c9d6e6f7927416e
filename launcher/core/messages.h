// What the user is told: the error box and the texts of the string table. Below both the start-up
// sequence and the VM host, which call it; the platform file decides what a box is (a Windows
// message box; on POSIX a line on standard error, and a dialog of our own when there is a display).
//
// Main thread only. ShowErrorBox returns when the user has dismissed the box.
#ifndef LAUNCHER_CORE_MESSAGES_H
#define LAUNCHER_CORE_MESSAGES_H

#include "core.h"
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

// The POSIX box as a dialog on the display (error_box_x11.cpp). False when there is no display or
// the dialog could not be shown; the caller has written the standard-error line already.
bool ShowErrorDialog(const char* caption, const char* text);

// POSIX only (messages_posix.cpp): one line "QZ-Lumiscope_QZ-57: <cause>" on standard error that
// names what a user or packager can act on (the loader's or the system's text, the JNI code). The
// boxes say what failed in the product's words; this line says why. Any thread.
void ReportCause(const char* format, ...);

#endif
