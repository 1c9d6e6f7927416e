// Single-instance hand-off: the named instance lock, activation of the running application's frame
// window, and forwarding of a second instance's arguments over local TCP.
//
// Callers: the start-up sequence, on the main thread, in this order: AcquireInstanceLock; when it
// fails, ActivateRunningInstances then ForwardArguments. Nothing here logs or shows a box.
// Platform files: instance_win32.cpp (lock, windows, sockets), instance_posix.cpp (lock, sockets),
// instance_x11.cpp (windows).
#ifndef LAUNCHER_INSTANCE_INSTANCE_H
#define LAUNCHER_INSTANCE_INSTANCE_H

#include "../core/core.h"

// Takes the per-user lock `name`, held until the process ends. True for the first instance; false
// when the name already exists (another instance runs). Any other failure is false on Windows too;
// on POSIX it is said on standard error and the start goes on as the first instance (true).
bool AcquireInstanceLock(const char16_t* name);

// Restores (when minimised) and brings to the front every visible top-level window that passes the
// title and class tests, in enumeration order; the last one treated ends in front. Under X11 it
// returns after about two seconds at the most, whatever the display does.
void ActivateRunningInstances();

// Sends argv[1..argc-1], each encoded as the VM host encodes main's arguments, to the running
// application on TCP port 6152 of the local host, then closes. 0 when connected, -1 otherwise.
Status ForwardArguments(char16_t** argv, int32_t argc);

// ---- Portable pieces of the window test (instance.cpp).

// The title test: the title's UTF-16LE bytes, read as an 8-bit string up to their first zero byte,
// hold the 18 bytes of InstanceName. Byte-wise and case-sensitive on purpose.
bool TitleHoldsInstanceName(const char16_t* title);
// The class test: `className` equals FrameClassName ignoring ASCII letter case; with
// `javaToolkitClass`, also the class Java's X11 toolkit gives the frames of the main class.
bool IsFrameClassName(const char16_t* className, bool javaToolkitClass);

// ---- Platform layer of the forwarding (instance_win32.cpp, instance_posix.cpp).
// Starts the socket library; false after printing "Failed to load Winsock library!" where it has one.
bool HandOffStart();
// One connection attempt to port 6152 of "localhost" (resolved by name); -1 when the name does not
// resolve or no socket can be had (the forwarding then gives up), 0 refused, 1 connected.
int HandOffConnect();
// One send of `bytes` bytes on the connection; a failure is ignored by the caller.
void HandOffSend(const char* data, size_t bytes);
// Closes the connection and the socket library.
void HandOffClose();
// Blocks the calling thread for `ms` milliseconds.
void PauseMs(uint32_t ms);

#endif
