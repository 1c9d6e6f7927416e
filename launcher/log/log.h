// Diagnostic log: one per-user UTF-16LE file, recreated at each run, without a byte-order mark.
// A line is written as four pieces (tag, " : ", message, CR LF), one write each, never buffered.
// Every failure is swallowed: the log never stops a launch and never shows anything.
//
// Calling order: LogOpen once, any number of LogWrite / LogWriteText, LogClose once. Writes before
// LogOpen are dropped. Callers: the start-up sequence and the self-protection stage, on the main
// thread only (the log takes no lock).
#ifndef LAUNCHER_LOG_LOG_H
#define LAUNCHER_LOG_LOG_H

#include "../core/core.h"

enum {
    kLogLevelProgress = 0,
    kLogLevelError = 3,
    kLogLevelLaunchEnd = 100,
};

// Creates (truncates) the file at `path` and writes the start line. Acts only on its first call.
void LogOpen(const char16_t* path);
// tag " : " message " : " code CR LF; the message passes through the narrow code page on purpose.
void LogWrite(int32_t level, const char16_t* tag, const char16_t* message, int32_t code);
// tag " : " message CR LF.
void LogWriteText(int32_t level, const char16_t* tag, const char16_t* message);
// Writes the end line and closes the file. The handle keeps its value: later writes fail quietly.
void LogClose();

// Platform layer of the log (log_win32.cpp / a test double). Handles are the platform's own values:
// 0 means never opened, kLogInvalidHandle a failed open.
typedef intptr_t LogHandle;
static const LogHandle kLogInvalidHandle = -1;
LogHandle LogPlatformOpen(const char16_t* path);
// Writes `bytes` bytes at the current position; returns false and the error code on failure.
bool LogPlatformWrite(LogHandle handle, const void* data, uint32_t bytes, uint32_t* written, uint32_t* error);
void LogPlatformClose(LogHandle handle);
// A failed write, told where the platform tells it: Windows prints "WriteFile failed with error N."
// on standard output, which a windowed process does not have; POSIX keeps it to the log's own
// bookkeeping, since standard output there is the user's terminal.
void LogPlatformWriteFailed(uint32_t error);

#endif
