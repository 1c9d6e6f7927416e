// The VM library on POSIX systems: libjvm loaded with the dynamic loader.
#include <dlfcn.h>

#include "jvm_internal.h"

Status LoadJvmLibrary(const char* path) {
    JvmState = VmState();
    if (path == nullptr) return kStatusNotFound;
    void* library = dlopen(path, RTLD_NOW | RTLD_GLOBAL);
    if (library == nullptr) return kStatusNotFound;
    // A library without the entry point still counts as loaded; CreateVm reports it.
    JvmState.createJavaVm = reinterpret_cast<CreateJavaVmEntry>(dlsym(library, "JNI_CreateJavaVM"));
    return kStatusOk;
}
