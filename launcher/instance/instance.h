// Single-instance hand-off: the named instance lock, activation of the running application's frame
// window, and forwarding of a second instance's arguments over local TCP.
//
// Callers: the start-up sequence, on the main thread, in this order: AcquireInstanceLock; when it
// is null, ActivateRunningInstances then ForwardArguments. Nothing here logs or shows anything.
#ifndef LAUNCHER_INSTANCE_INSTANCE_H
#define LAUNCHER_INSTANCE_INSTANCE_H

#include "../core/core.h"

// Creates the named lock, owned. Returns null when the name already exists (another instance runs)
// and on any other failure. The handle is never released.
void* AcquireInstanceLock(const char16_t* name);

// Restores (when minimised) and brings to the front every visible top-level window that passes the
// title and class tests, in enumeration order.
void ActivateRunningInstances();

// Sends argv[1..argc-1], each encoded as the VM host encodes main's arguments, to the running
// application on TCP port 6152 of the local host, then closes. 0 when connected, -1 otherwise.
Status ForwardArguments(char16_t** argv, int32_t argc);

#endif
