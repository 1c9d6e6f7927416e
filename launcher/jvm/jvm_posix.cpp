// The VM host on POSIX systems: the directory of the executable file, libjvm of the private runtime
// loaded with the dynamic loader, and the settings folders of the option list.
#include <dlfcn.h>
#include <limits.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

#include "jvm_internal.h"

namespace {

// Relative on purpose: the dynamic loader takes a name with a slash from the current directory,
// which is the application directory by now, and never searches a system Java.
const char kVmLibrary[] = "jre/lib/server/libjvm.so";

// The settings folder's text; lives until the VM is created.
char configHome[PATH_MAX];

bool IsDirectory(const char* path) {
    struct stat info;
    return stat(path, &info) == 0 && S_ISDIR(info.st_mode);
}

}  // namespace

Status LoadJvmLibrary(const char* path) {
    JvmState = VmState();
    if (path == nullptr) return kStatusNotFound;
    void* library = dlopen(path, RTLD_NOW | RTLD_GLOBAL);
    if (library == nullptr) return kStatusNotFound;
    // A library without the entry point still counts as loaded; CreateVm reports it.
    JvmState.createJavaVm = reinterpret_cast<CreateJavaVmEntry>(dlsym(library, "JNI_CreateJavaVM"));
    return kStatusOk;
}

// The application directory is the directory of the executable file itself, made the current
// directory for good and then re-read.
char* EnterVmDirectory(const char16_t*) {
    EnterExecutableDirectory();
    char path[PATH_MAX];
    return getcwd(path, sizeof path) != nullptr ? strdup(path) : nullptr;
}

Status LoadPrivateRuntime() { return LoadJvmLibrary(kVmLibrary); }

// The per-user settings folder when it exists as a directory; the temp-path option is gated by the
// first system settings folder ($XDG_CONFIG_DIRS, /etc/xdg when unset or empty) and carries the
// per-user folder, as the all-users folder gates it on Windows.
void FindSettingsFolders(VmOptionInputs* inputs) {
    inputs->userAppDataFound = FindConfigHome(configHome, sizeof configHome) && IsDirectory(configHome);
    inputs->userAppData = configHome;

    char systemConfig[PATH_MAX];
    const char* dirs = getenv("XDG_CONFIG_DIRS");
    if (dirs == nullptr || dirs[0] == 0) dirs = "/etc/xdg";
    size_t first = strcspn(dirs, ":");
    FormatText(systemConfig, sizeof systemConfig, "%.*s", static_cast<int>(first), dirs);
    inputs->commonAppDataFound = first > 0 && IsDirectory(systemConfig);
}
