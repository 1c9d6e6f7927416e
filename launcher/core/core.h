// Shared core of the launcher: the fixed names every subsystem agrees on, the two pieces of
// process-wide state that cross subsystem borders, and the narrow-text conversions.
//
// Portable: no platform header is included here. UTF-16 text is char16_t everywhere in portable
// code; on Windows it is the same representation as wchar_t, and the *_win32.cpp files convert the
// pointer type at their border.
//
// Threads: everything here is used from the launcher's main thread, except the conversions, which
// keep no state and may be called from any thread.
#ifndef LAUNCHER_CORE_CORE_H
#define LAUNCHER_CORE_CORE_H

#include <stddef.h>
#include <stdint.h>

#include "status.h"

// Fixed names of this product. They are constants of the build, never read from the environment.
#define LAUNCHER_EXE_NAME "QZ-Lumiscope_QZ-57.exe"
#define LAUNCHER_MAIN_CLASS "com/qz/kpo/emu57/app/ApplicationMainForm"
#define LAUNCHER_FRAME_CLASS_NAME "com.qz.kpo.emu57.app.EmulatorFrame"
#define LAUNCHER_SPLASH_RESOURCE "BITMAP_SPLASH_57"
#define LAUNCHER_CLASS_PATH_JAR "emu57.jar"
#define LAUNCHER_NO_SPLASH_SWITCH u"-noSplash"

// The instance name is 8-bit text. It is the mutex name (its 18 bytes read as nine UTF-16 units)
// and the byte string searched for in window titles. The two zero bytes behind it end the
// nine-unit name; the array is aligned so that it can be read as UTF-16.
extern const char InstanceName[20];
enum { kInstanceNameBytes = 18 };

enum { kHandOffPort = 6152 };

enum { kMaxPathUnits = 260 };

// The platform's directory separator as a one-character text ("\\" or "/"), for the class path.
extern const char kDirectorySeparator[];

// The user's settings folder on POSIX systems: $XDG_CONFIG_HOME, or $HOME/.config when the
// variable is unset or empty; its bytes as they are. False when there is no home to put it in.
// (core/paths_posix.cpp; used by the POSIX platform files of the start-up and the VM host.)
bool FindConfigHome(char* out, size_t size);
// Makes the directory of the executable file itself the current directory; false when it cannot
// be found or entered (the current directory then stays as it was).
bool EnterExecutableDirectory();

// "QZ-Lumiscope_QZ-57.exe" once the documents folder was found, empty otherwise. Written by the
// start-up sequence before any other thread exists; read by the start-up sequence and the
// self-protection stage as the tag of their log lines.
extern char ModuleName[260];

// Set when "-noSplash" is the first argument (start-up) or any argument (VM host). Main thread only.
extern bool NoSplash;

// Narrow text is the thread's ANSI code page on Windows (UTF-8 on POSIX). All conversions take a
// zero-terminated source (source length -1) and use no flags.
//
// NarrowSize / WideSize: the size the converted text needs, terminator included (bytes / units);
// 0 when the text cannot be converted.
int NarrowSize(const char16_t* text);
int WideSize(const char* text);
// ToNarrow / ToWide: convert into the caller's buffer; result as the platform's conversion call
// (units or bytes written including the terminator, 0 on failure). ToWide converts at most
// `sourceBytes` bytes of the source (-1: up to and with the terminator).
int ToNarrow(const char16_t* text, char* out, int outBytes);
int ToWide(const char* text, int sourceBytes, char16_t* out, int outUnits);

// Heap copy of `text` in the other encoding, or null when the conversion fails. Never released by
// the launcher (its log and VM option texts live until the process ends).
char* NarrowCopy(const char16_t* text);
char16_t* WideCopy(const char* text);

// Bounded printf-style formatting into `out` (always zero-terminated when size > 0; a longer text
// is cut). On Windows this is the C runtime's own formatter, which keeps the executable small.
void FormatText(char* out, size_t size, const char* format, ...);

// Windows only: printf to standard output (the launcher's two diagnostics that a windowed process
// normally loses). Kept in the platform file so every caller gets the C runtime's own printf.
void PrintText(const char* format, ...);

// Length in UTF-16 units of a zero-terminated text.
size_t Utf16Length(const char16_t* text);

// ASCII-only case-insensitive comparison, as the C runtime's _wcsicmp does in the "C" locale.
int Utf16CompareNoCase(const char16_t* a, const char16_t* b);

#endif
