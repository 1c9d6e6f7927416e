// Inside the VM host: what each platform's file (jvm_win32.cpp, jvm_posix.cpp) provides to jvm.cpp,
// in the order LaunchJavaApplication calls it, and the records the two halves hand each other.
// Everything here runs on the launcher's main thread.
#ifndef LAUNCHER_JVM_JVM_PLATFORM_H
#define LAUNCHER_JVM_JVM_PLATFORM_H

#include <jni.h>

#include "../core/core.h"

// The creation entry point of the VM library, as the library exports it.
typedef jint(JNICALL* CreateJavaVmEntry)(JavaVM** vm, void** env, void* args);

// The VM state: zeroed by the platform's loading before it does anything else; filled by the
// creation; never cleared after the VM is destroyed.
struct VmState {
    CreateJavaVmEntry createJavaVm;  // null when the library lacks JNI_CreateJavaVM
    JavaVM* vm;
    JNIEnv* env;
};

// What the option list is built from. The texts are narrow; `userAppData` is the per-user settings
// folder as the platform passes it (on Windows narrowed byte by byte), meaningful only when
// `userAppDataFound`. A null `appDirectory` (its conversion failed) is written as "(null)".
struct VmOptionInputs {
    const char* appDirectory;
    int32_t argc;
    char16_t** argv;  // the whole command line, argv[0] included
    bool userAppDataFound;
    const char* userAppData;
    bool commonAppDataFound;  // gates the temp-path option, whose value is the per-user folder
};

// ---- Provided by each platform's file.

// The platform's directory separator as a one-character text ("\\" or "/"), for the class path.
extern const char kDirectorySeparator[];
// Makes the application directory the current directory for good and returns the current directory
// as re-read, narrow, in a heap copy (null when it cannot be had or converted).
char* EnterVmDirectory(const char16_t* argv0);
// Zeroes `vm`, loads the private runtime's VM library relative to the current directory and
// resolves its entry point into `vm`. 0 when the library loaded (even without the entry point), -1
// otherwise.
Status LoadPrivateRuntime(VmState* vm);
// The settings-folder inputs of the option list: userAppDataFound, userAppData, commonAppDataFound.
// `userAppData` points into storage that lives until the VM is created.
void FindSettingsFolders(VmOptionInputs* inputs);
// After the main call: what became of a Java exception that the lookups left or main threw. POSIX
// describes it on standard error as Java's own launcher does; Windows leaves it unnoticed, as that
// launcher always has.
void DescribeJavaException(const VmState& vm);

#endif
