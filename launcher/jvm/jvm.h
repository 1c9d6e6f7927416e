// Java VM host: loads the private runtime's VM library, builds the VM option list, creates the VM,
// calls the application's main class with every argument hex-encoded, destroys the VM.
//
// Callers: LaunchJavaApplication by the start-up sequence, once, on the main thread (it runs as
// long as the Java application's main thread and becomes the exit code). EncodeArgument keeps no
// state and is also used by the instance hand-off, from any thread. Everything else is the VM
// host's own and runs on the main thread.
#ifndef LAUNCHER_JVM_JVM_H
#define LAUNCHER_JVM_JVM_H

#include "../core/core.h"

// argv[0] is the program as started. Result: -1 VM library not loaded; the creation error, -1 for
// a missing entry point, or -3 when the VM was not created and there is no message text; otherwise
// the DestroyJavaVM result.
Status LaunchJavaApplication(int32_t argc, char16_t** argv);

// Appends a private heap copy of `text` to the process-wide option list (grows by one per call).
void AddVmOption(const char* text);
// Zeroes the VM state, loads the library at `path` (narrow, relative to the current directory) and
// resolves JNI_CreateJavaVM. 0 when the library loaded (even without the entry point), -1 otherwise.
Status LoadJvmLibrary(const char* path);
// Creates the VM with the option list; -1 without calling anything when there is no entry point.
Status CreateVm();
// DestroyJavaVM; -1 when no VM is held.
Status DestroyVm();
// Calls the static main(String[]) of `className` (slash form) with argv[1..argc-1] encoded.
// 0 after main returned, -1 a class not found, -2 no static main method.
Status CallJavaMain(const char* className, char16_t** argv, int32_t argc);

// Four lower-case hex digits per UTF-16 unit, zero-terminated; `out` holds 4 * length + 1 bytes.
// An empty text writes nothing at all, leaving `out` as it was.
void EncodeArgument(const char16_t* text, char* out);

// A reusable encoding buffer sized from each argument. It starts as the empty text; an empty
// argument leaves it unchanged, so it repeats the previous argument's encoding. Returns false
// when memory runs out (the buffer then still holds its previous text).
struct EncodeBuffer {
    char* text;
    size_t capacity;
};
bool EncodeArgumentInto(const char16_t* text, EncodeBuffer* buffer);

#endif
