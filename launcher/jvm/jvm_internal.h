// Inside the VM host: the VM state shared by its portable and platform files, the option list, and
// the inputs from which the option list is composed.
//
// launch.cpp is LaunchJavaApplication itself; the platform file (jvm_win32.cpp, jvm_posix.cpp)
// finds the application directory and the settings folders and loads the VM library;
// vm_options.cpp turns the inputs into options and owns the VM state; java_main.cpp reads the
// JNIEnv pointer from it. Everything here runs on the launcher's main thread.
#ifndef LAUNCHER_JVM_JVM_INTERNAL_H
#define LAUNCHER_JVM_JVM_INTERNAL_H

#include <jni.h>

#include "jvm.h"

// The creation entry point of the VM library, as the library exports it.
typedef jint(JNICALL* CreateJavaVmEntry)(JavaVM** vm, void** env, void* args);

// Zeroed by LoadJvmLibrary before it does anything else; never cleared after DestroyVm.
struct VmState {
    CreateJavaVmEntry createJavaVm;  // null when the library lacks JNI_CreateJavaVM
    JavaVM* vm;
    JNIEnv* env;
};
extern VmState JvmState;

// The option list as CreateVm hands it to the VM. The records and their texts are never freed.
int32_t VmOptionCount();
const JavaVMOption* VmOptionRecords();

// What the option list is built from. The texts are narrow; `userAppData` is the per-user settings
// folder as the platform passes it (on Windows narrowed byte by byte, NarrowLowBytes), meaningful
// only when `userAppDataFound`. A null `appDirectory` (its conversion failed) is written as "(null)".
struct VmOptionInputs {
    const char* appDirectory;
    int32_t argc;
    char16_t** argv;  // the whole command line, argv[0] included
    bool userAppDataFound;
    const char* userAppData;
    bool commonAppDataFound;  // gates the temp-path option, whose value is the per-user folder
};

// Appends the launch options in their fixed order (see vm_options.cpp). Sets NoSplash once for
// every "-noSplash" argument, in any letter case, at any position.
void ComposeVmOptions(const VmOptionInputs& inputs);

// ---- Platform layer, called by LaunchJavaApplication in this order.

// Makes the application directory the current directory for good and returns the current directory
// as re-read, narrow, in a heap copy (null when it cannot be had or converted).
char* EnterVmDirectory(const char16_t* argv0);
// Loads the private runtime's VM library, relative to the current directory (LoadJvmLibrary).
Status LoadPrivateRuntime();
// The settings-folder inputs of the option list: userAppDataFound, userAppData, commonAppDataFound.
// `userAppData` points into storage that lives until the VM is created.
void FindSettingsFolders(VmOptionInputs* inputs);
// After CallJavaMain: what became of a Java exception that the lookups left or main threw. POSIX
// describes it on standard error as Java's own launcher does; Windows leaves it unnoticed, as that
// launcher always has.
void DescribeJavaException();

enum { kFolderPathUnits = 260 };
// The special-folder paths reach the VM as the low 8 bits of each of the buffer's 260 units, with
// no code-page conversion: characters above U+00FF arrive altered, and one whose low byte is zero
// ends the text there. `out` holds kFolderPathUnits + 1 bytes and is always terminated.
void NarrowLowBytes(const char16_t* folder, char* out);

#endif
