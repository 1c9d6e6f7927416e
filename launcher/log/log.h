// Diagnostic log: one per-user UTF-16LE file, recreated at each run, without a byte-order mark.
// A line is written as four pieces (tag, " : ", message, CR LF), one write each, never buffered.
// Every failure is swallowed: the log never stops a launch and never shows anything.
//
// Calling order: LogOpen once, any number of LogWrite, LogClose once. Writes before LogOpen are
// dropped. Caller: the start-up sequence, on the main thread only (the log takes no lock).
// Platform files: log_win32.cpp, log_posix.cpp (log_platform.h).
#ifndef LAUNCHER_LOG_LOG_H
#define LAUNCHER_LOG_LOG_H

#include <stdint.h>

enum {
    kLogLevelProgress = 0,
    kLogLevelError = 3,
    kLogLevelLaunchEnd = 100,
};

// Creates (truncates) the file at `path` and writes the start line. Acts only on its first call.
void LogOpen(const char16_t* path);
// tag " : " message " : " code CR LF; the message passes through the narrow code page on purpose.
void LogWrite(int32_t level, const char16_t* tag, const char16_t* message, int32_t code);
// Writes the end line and closes the file. The handle keeps its value: later writes fail quietly.
void LogClose();

// Narrow text back to UTF-16 the way the log has always widened its texts (the start-up sequence's
// tag and stage texts, the log's own lines): a heap copy of the unit count the conversion asks for,
// plus one; "" when it cannot be made. Never released.
const char16_t* WidenForLog(const char* text);

#endif
