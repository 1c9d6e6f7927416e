// For the POSIX files of every room: why a failure happened, told on standard error.
#ifndef LAUNCHER_ERRORBOX_ERRORBOX_POSIX_H
#define LAUNCHER_ERRORBOX_ERRORBOX_POSIX_H

// One line "QZ-Lumiscope_QZ-57: <cause>" on standard error that names what a user or packager can
// act on (the loader's or the system's text, the JNI code). The boxes say what failed in the
// product's words; this line says why. Any thread.
void ReportCause(const char* format, ...);

#endif
