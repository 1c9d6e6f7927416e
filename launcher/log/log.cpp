// Diagnostic log: line layout and levels. The file itself is reached through LogPlatform*
// (log_platform.h).
#include "log.h"
#include "log_platform.h"

#include "../text/text.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <time.h>

namespace {

LogHandle gLogHandle = 0;         // 0: never opened; otherwise what the platform's open returned
const int32_t kLogThreshold = 0;  // lowest level written; nothing in the launcher changes it
// The piece writer's bookkeeping: the bytes asked for, the bytes written and the result of the last
// write. Nothing reads them; they are kept as the log has always kept them, for a debugger to see.
uint32_t gLastRequest = 0;
uint32_t gLastWritten = 0;
uint32_t gLastResult = 0;

const char16_t kSeparator[] = u" : ";
const char16_t kLineEnd[] = u"\r\n";

// One piece: the text without its terminator, one write. A failure is told to the platform (a text
// no user sees) and the line goes on with its next piece.
int WritePiece(const char16_t* piece) {
    uint32_t bytes = static_cast<uint32_t>(Utf16Length(piece) * sizeof(char16_t));
    uint32_t written = 0;
    uint32_t error = 0;
    gLastRequest = bytes;
    bool ok = LogPlatformWrite(gLogHandle, piece, bytes, &written, &error);
    gLastWritten = written;
    gLastResult = ok ? 1 : 0;
    if (!ok) {
        LogPlatformWriteFailed(error);
        return 5;
    }
    return 0;
}

// tag " : " message CR LF.
void LogWriteText(int32_t level, const char16_t* tag, const char16_t* message) {
    if (gLogHandle == 0) return;
    if (level < kLogThreshold) return;
    WritePiece(tag);
    WritePiece(kSeparator);
    WritePiece(message);
    WritePiece(kLineEnd);
}

}  // namespace

// Ask for the count (terminator included), take count + 1 units, and convert as many bytes of the
// source as the platform's rule says.
const char16_t* WidenForLog(const char* text) {
    int count = WideSize(text);
    if (count <= 0) return u"";
    char16_t* wide = static_cast<char16_t*>(malloc((static_cast<size_t>(count) + 1) * sizeof(char16_t)));
    if (wide == nullptr) return u"";
    if (ToWide(text, LogPlatformWidenBytes(text, count), wide, count + 1) == 0) return u"";
    return wide;
}

void LogWrite(int32_t level, const char16_t* tag, const char16_t* message, int32_t code) {
    if (gLogHandle == 0) return;
    if (level < kLogThreshold) return;
    // The message goes through the narrow code page and back on purpose: characters the code page
    // lacks arrive as its default character, as in every log this launcher has written.
    const char* narrow = NarrowCopy(message);
    if (narrow == nullptr) narrow = "";
    char formatted[1001] = {0};
    FormatText(formatted, 1000, "%s : %d", narrow, static_cast<int>(code));
    WritePiece(tag);
    WritePiece(kSeparator);
    WritePiece(WidenForLog(formatted));
    WritePiece(kLineEnd);
}

void LogOpen(const char16_t* path) {
    if (gLogHandle != 0) return;
    gLogHandle = LogPlatformOpen(path);
    if (gLogHandle == kLogInvalidHandle || gLogHandle == 0) return;

    // The C runtime's asctime layout with a zero-padded day, English names, and its line feed,
    // which stays in front of the line's own CR LF.
    static const char kDays[] = "SunMonTueWedThuFriSat";
    static const char kMonths[] = "JanFebMarAprMayJunJulAugSepOctNovDec";
    time_t now = time(nullptr);
    const struct tm* t = localtime(&now);
    char started[81] = {0};
    if (t != nullptr) {
        FormatText(started, 80, "Started logging...%.3s %.3s %02d %02d:%02d:%02d %d\n", kDays + 3 * (t->tm_wday % 7),
                 kMonths + 3 * (t->tm_mon % 12), t->tm_mday, t->tm_hour, t->tm_min, t->tm_sec, t->tm_year + 1900);
    } else {
        FormatText(started, 80, "Started logging...");
    }
    LogWriteText(kLogLevelError, u"QZ_CW_startLOG", WidenForLog(started));
}

void LogClose() {
    if (gLogHandle == 0) return;
    if (kLogThreshold <= 0) {
        WritePiece(u"Ended logging...");
        WritePiece(kSeparator);
        WritePiece(u"");
        WritePiece(kLineEnd);
    }
    LogPlatformClose(gLogHandle);
}
