// Inside the log: what each platform's file (log_win32.cpp, log_posix.cpp) provides to log.cpp.
// Handles are the platform's own values: 0 means never opened, kLogInvalidHandle a failed open.
// Main thread only, as the log.
#ifndef LAUNCHER_LOG_LOG_PLATFORM_H
#define LAUNCHER_LOG_LOG_PLATFORM_H

#include <stdint.h>

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
// How many bytes of narrow `text` WidenForLog converts, given the unit count (terminator included)
// the conversion asked for: on Windows that count plus one, as the log has always done it (one byte
// past a single-byte text's terminator, which every source buffer keeps zero); on POSIX the text's
// own length through its terminator, since UTF-8 spends more bytes than units and the count would
// cut a text short, leaving it unterminated.
int LogPlatformWidenBytes(const char* text, int units);

#endif
