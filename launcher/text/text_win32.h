// For the Windows files of every room: the launcher's two texts on standard output.
#ifndef LAUNCHER_TEXT_TEXT_WIN32_H
#define LAUNCHER_TEXT_TEXT_WIN32_H

// printf to standard output ("WriteFile failed with error N.", "Failed to load Winsock library!"),
// which a windowed process normally does not have. Formatted by the C runtime itself, so every
// caller gets its printf rather than MinGW's larger one. Any thread.
void PrintText(const char* format, ...);

#endif
