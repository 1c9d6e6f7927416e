// Text work every room shares: the narrow text of the platform and its conversions, small UTF-16
// helpers, bounded formatting, and the argument encoding that the VM host (main's arguments) and the
// instance hand-off (the bytes on the wire) both use.
//
// Portable. The conversions are the platform's (text_win32.cpp: the thread's ANSI code page;
// text_posix.cpp: UTF-8); the rest is text.cpp and encode_argument.cpp.
//
// Threads: nothing here keeps state; any thread may call it.
#ifndef LAUNCHER_TEXT_TEXT_H
#define LAUNCHER_TEXT_TEXT_H

#include <stddef.h>
#include <stdint.h>

// Narrow text is the thread's ANSI code page on Windows (UTF-8 on POSIX). All conversions take a
// zero-terminated source and use no flags.
//
// NarrowSize / WideSize: the size the converted text needs, terminator included (bytes / units);
// 0 when the text cannot be converted.
int NarrowSize(const char16_t* text);
int WideSize(const char* text);
// ToNarrow / ToWide: convert into the caller's buffer; result as the platform's conversion call
// (units or bytes written including the terminator, 0 on failure). ToWide converts at most
// `sourceBytes` bytes of the source (-1: up to and with the terminator); a count that stops short of
// the terminator leaves the output unterminated.
int ToNarrow(const char16_t* text, char* out, int outBytes);
int ToWide(const char* text, int sourceBytes, char16_t* out, int outUnits);

// Heap copy of `text` in the other encoding (malloc: the caller frees it, unless it lives until the
// process ends, as the log's and the VM options' texts do), or null when the conversion fails.
char* NarrowCopy(const char16_t* text);
char16_t* WideCopy(const char* text);

// Bounded printf-style formatting into `out` (always zero-terminated when size > 0; a longer text
// is cut). On Windows this is the C runtime's own formatter, which keeps the executable small.
void FormatText(char* out, size_t size, const char* format, ...);

// Length in UTF-16 units of a zero-terminated text.
size_t Utf16Length(const char16_t* text);

// ASCII-only case-insensitive comparison, as the C runtime's _wcsicmp does in the "C" locale.
int Utf16CompareNoCase(const char16_t* a, const char16_t* b);

// ---- The argument encoding: four lower-case hex digits per UTF-16 unit, most significant first, no
// prefix and no separator. Every argument that leaves the launcher, to main or over the hand-off, is
// this text; the Java side turns each group of four digits back into one unit.
//
// One buffer is reused for a whole argument list, sized from each argument. It starts as the empty
// text; an empty argument leaves it unchanged, so it repeats the previous argument's encoding (the
// form the application has always received). False when memory runs out (the buffer then still holds
// its previous text). The caller frees `text` when it is done.
struct EncodeBuffer {
    char* text;
    size_t capacity;
};
bool EncodeArgument(const char16_t* text, EncodeBuffer* buffer);

#endif
