// Inside the single-instance hand-off: the portable window tests that each platform's window search
// applies (instance.cpp), and the connection steps of the forwarding that each platform's file
// provides to handoff.cpp. Main thread only.
#ifndef LAUNCHER_INSTANCE_INSTANCE_PLATFORM_H
#define LAUNCHER_INSTANCE_INSTANCE_PLATFORM_H

#include <stddef.h>
#include <stdint.h>

// ---- The window tests (instance.cpp).

// Titles are looked at up to this many UTF-16 units (what the Windows side asks WM_GETTEXT for).
enum { kTitleUnits = 1024 };
// The title test: the title's UTF-16LE bytes, read as an 8-bit string up to their first zero byte,
// hold the 18 bytes of the instance name. Byte-wise and case-sensitive on purpose.
bool TitleHoldsInstanceName(const char16_t* title);
// The class test: `className` equals the frame's class name ignoring ASCII letter case; with
// `javaToolkitClass`, also the class Java's X11 toolkit gives the frames of the main class.
bool IsFrameClassName(const char16_t* className, bool javaToolkitClass);

// ---- The forwarding's connection, provided by each platform's file.

// The running application's end: TCP port 6152 (0x1808) of the local host.
static const uint16_t HandOffPort = 6152;

// One hand-off's connection, owned by ForwardArguments. Start it as {kNoHandOffSocket, 0, false}.
static const intptr_t kNoHandOffSocket = -1;
struct HandOffLink {
    intptr_t socket;   // the platform's socket, kNoHandOffSocket while there is none
    uint32_t address;  // the local host's IPv4 address in network byte order, once resolved
    bool resolved;
};

// Starts the socket library; false after printing "Failed to load Winsock library!" where it has one.
bool HandOffStart();
// One connection attempt to port 6152 of "localhost" (resolved by name); -1 when the name does not
// resolve or no socket can be had (the forwarding then gives up), 0 refused, 1 connected.
int HandOffConnect(HandOffLink* link);
// One send of `bytes` bytes on the connection; a failure is ignored by the caller.
void HandOffSend(const HandOffLink& link, const char* data, size_t bytes);
// Closes the connection and the socket library.
void HandOffClose(HandOffLink* link);
// Blocks the calling thread for `ms` milliseconds.
void PauseMs(uint32_t ms);

#endif
