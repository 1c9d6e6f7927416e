// Java VM host: loads the private runtime's VM library, builds the VM option list, creates the VM,
// calls the application's main class with every argument hex-encoded, destroys the VM.
//
// Caller: the start-up sequence, once, on the main thread; the call lasts as long as the Java
// application's main thread. Platform files: jvm_win32.cpp, jvm_posix.cpp (jvm_platform.h).
#ifndef LAUNCHER_JVM_JVM_H
#define LAUNCHER_JVM_JVM_H

#include "../core/core.h"

// argv[0] is the program as started. Result: -1 VM library not loaded; the creation error, -1 for
// a missing entry point, or -3 when the VM was not created and there is no message text; otherwise
// the DestroyJavaVM result. Sets NoSplash for every "-noSplash" argument; closes the splash.
Status LaunchJavaApplication(int32_t argc, char16_t** argv);

#endif
