// Single-instance hand-off: the named instance lock, activation of the running application's frame
// window, and forwarding of a second instance's arguments over local TCP.
//
// Caller: the start-up sequence, on the main thread, in this order: AcquireInstanceLock with the
// name FormInstanceLockName gives; when it fails, ActivateRunningInstances then ForwardArguments.
// Nothing here logs or shows a box. Platform files: instance_win32.cpp (lock, windows, sockets),
// instance_posix.cpp (lock, sockets), instance_x11.cpp (windows); instance_platform.h.
#ifndef LAUNCHER_INSTANCE_INSTANCE_H
#define LAUNCHER_INSTANCE_INSTANCE_H

#include "../core/core.h"

// The lock's name: the 18 bytes of the 8-bit instance name "QZ-Lumiscope_QZ-57" read as nine
// UTF-16 units, each from two consecutive bytes, the first as the low half ("QZ" gives U+5A51), then
// the zero unit. Every instance and every outside probe meets on exactly this name.
enum { kInstanceLockNameUnits = 10 };
void FormInstanceLockName(char16_t name[kInstanceLockNameUnits]);

// Takes the per-user lock `name`, held until the process ends. True for the first instance; false
// when the name already exists (another instance runs). Any other failure is false on Windows too;
// on POSIX it is said on standard error and the start goes on as the first instance (true).
bool AcquireInstanceLock(const char16_t* name);

// Restores (when minimised) and brings to the front every visible top-level window that passes the
// title and class tests, in enumeration order; the last one treated ends in front. Under X11 it
// returns after about two seconds at the most, whatever the display does.
void ActivateRunningInstances();

// Sends argv[1..argc-1], each through EncodeArgument as main's arguments are, to the running
// application on TCP port 6152 of the local host, then closes. 0 when connected, -1 otherwise.
Status ForwardArguments(char16_t** argv, int32_t argc);

#endif
