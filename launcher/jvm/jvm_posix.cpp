// The VM host on POSIX systems: the directory of the executable file, libjvm of the private runtime
// checked and loaded with the dynamic loader, the VM's own end during its creation, and the settings
// folders of the option list.
#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <link.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>

#include "jvm_platform.h"

#include "../errorbox/errorbox.h"
#include "../errorbox/errorbox_posix.h"
#include "../folders/folders_posix.h"
#include "../text/text.h"

const char kDirectorySeparator[] = "/";

namespace {

// Relative on purpose: the dynamic loader takes a name with a slash from the current directory,
// which is the application directory by now, and never searches a system Java.
const char kVmLibrary[] = "jre/lib/server/libjvm.so";

// The settings folder's text; lives until the VM is created.
char gConfigHome[PATH_MAX];

// The library's own entry point; the VM state holds CreateWatched in its place.
CreateJavaVmEntry gVmEntry = nullptr;
// True only while JNI_CreateJavaVM runs (see _exit below).
std::atomic<bool> gVmBeingCreated(false);

bool IsDirectory(const char* path) {
    struct stat info;
    return stat(path, &info) == 0 && S_ISDIR(info.st_mode);
}

// `count` records of `size` bytes at `offset` lie inside a file of `fileSize` bytes.
bool Inside(uint64_t offset, uint64_t count, uint64_t size, uint64_t fileSize) {
    return offset <= fileSize && count * size <= fileSize - offset;
}

// What keeps the library at `path` from being loaded safely, or null. The dynamic loader maps every
// loadable segment that the program headers promise and touches them: a truncated file (a broken
// download or copy, a full disk) ends the process with SIGBUS inside dlopen, whatever size it was
// cut to, and a FIFO in its place blocks dlopen for good. So the file must be a regular file in
// which the program headers, every PT_LOAD segment and the section-header table lie whole. A file
// that is not an ELF object of this process's class is left to the loader, which refuses it by its
// headers alone and says why.
const char* DamageOfLibrary(const char* path) {
    int file = open(path, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (file < 0) return strerror(errno);
    const char* damage = nullptr;
    struct stat info;
    ElfW(Ehdr) header;
    if (fstat(file, &info) != 0 || !S_ISREG(info.st_mode)) {
        damage = "not a regular file";
    } else if (pread(file, &header, sizeof header, 0) == sizeof header && memcmp(header.e_ident, ELFMAG, SELFMAG) == 0 &&
               header.e_ident[EI_CLASS] == (sizeof(void*) == 8 ? ELFCLASS64 : ELFCLASS32)) {
        uint64_t size = static_cast<uint64_t>(info.st_size);
        bool whole = header.e_phentsize == sizeof(ElfW(Phdr)) &&
                     Inside(header.e_phoff, header.e_phnum, sizeof(ElfW(Phdr)), size) &&
                     (header.e_shoff == 0 || Inside(header.e_shoff, header.e_shnum, header.e_shentsize, size));
        for (int i = 0; whole && i < header.e_phnum; ++i) {
            ElfW(Phdr) segment;
            off_t at = static_cast<off_t>(header.e_phoff + i * sizeof segment);
            whole = pread(file, &segment, sizeof segment, at) == sizeof segment &&
                    (segment.p_type != PT_LOAD || Inside(segment.p_offset, 1, segment.p_filesz, size));
        }
        if (!whole) damage = "damaged: the file ends before the parts its headers describe";
    }
    close(file);
    return damage;
}

// The VM is being created from the time it is called until it returns; a failure is named by its
// JNI code.
jint JNICALL CreateWatched(JavaVM** vm, void** env, void* args) {
    gVmBeingCreated = true;
    jint result = gVmEntry(vm, env, args);
    gVmBeingCreated = false;
    static const char* const kJniErrors[] = {"unknown error", "thread detached", "JNI version not supported",
                                             "not enough memory", "a VM exists already", "invalid arguments"};
    if (result != JNI_OK) {
        ReportCause("the Java VM was not created: JNI error %d (%s)", static_cast<int>(result),
                    result <= -1 && result >= -6 ? kJniErrors[-1 - result] : "unknown error");
    }
    return result;
}

// Zeroes `vm` and loads the library at `path`, relative to the current directory.
Status LoadJvmLibrary(VmState* vm, const char* path) {
    *vm = VmState();
    if (path == nullptr) return kStatusNotFound;
    char folder[PATH_MAX];
    if (getcwd(folder, sizeof folder) == nullptr) FormatText(folder, sizeof folder, ".");
    const char* damage = DamageOfLibrary(path);
    if (damage != nullptr) {
        ReportCause("cannot load the Java VM from %s: %s: %s", folder, path, damage);
        return kStatusNotFound;
    }
    void* library = dlopen(path, RTLD_NOW | RTLD_GLOBAL);
    if (library == nullptr) {
        ReportCause("cannot load the Java VM from %s: %s", folder, dlerror());
        return kStatusNotFound;
    }
    // A library without the entry point still counts as loaded; CreateVm reports it.
    gVmEntry = reinterpret_cast<CreateJavaVmEntry>(dlsym(library, "JNI_CreateJavaVM"));
    if (gVmEntry == nullptr) ReportCause("the Java VM in %s cannot be created: %s", folder, dlerror());
    vm->createJavaVm = gVmEntry != nullptr ? CreateWatched : nullptr;
    return kStatusOk;
}

}  // namespace

// HotSpot ends the process itself when it fails during its own start (an address space too small
// for its heap, say): it prints its reason on standard output and calls _exit(1), which runs no
// atexit handler, so JNI_CreateJavaVM never returns and the launcher would end without its box. The
// executable exports this definition (the link's --export-dynamic-symbol=_exit), so the VM library's
// calls of _exit come here first. While the VM is being created the user gets the "VM not created"
// box before the process ends with the VM's own code; every other call (a child process between
// fork and exec among them) ends at once, as the C library's _exit does.
void _exit(int status) {
    if (gVmBeingCreated.load() && gVmBeingCreated.exchange(false)) {
        ReportCause("the Java VM ended the process while it was being created (exit status %d)", status);
        char* text = LoadMessageText(kMessageVmNotCreated);
        if (text != nullptr) ShowErrorBox(text);
    }
    for (;;) syscall(SYS_exit_group, status);
}

Status LoadPrivateRuntime(VmState* vm) { return LoadJvmLibrary(vm, kVmLibrary); }

// An exception left by the main class's lookup or thrown out of main is described on standard
// error, as Java's own launcher does ("Exception in thread "main" ..." and its stack trace).
void DescribeJavaException(const VmState& vm) {
    if (vm.env != nullptr && vm.env->ExceptionCheck()) vm.env->ExceptionDescribe();
}

// The application directory is the directory of the executable file itself, made the current
// directory for good and then re-read.
char* EnterVmDirectory(const char16_t*) {
    EnterExecutableDirectory();
    char path[PATH_MAX];
    return getcwd(path, sizeof path) != nullptr ? strdup(path) : nullptr;
}

// The per-user settings folder when it exists as a directory; the temp-path option is gated by the
// first system settings folder ($XDG_CONFIG_DIRS, /etc/xdg when unset or empty) and carries the
// per-user folder, as the all-users folder gates it on Windows.
void FindSettingsFolders(VmOptionInputs* inputs) {
    inputs->userAppDataFound = FindConfigHome(gConfigHome, sizeof gConfigHome) && IsDirectory(gConfigHome);
    inputs->userAppData = gConfigHome;

    char systemConfig[PATH_MAX];
    const char* dirs = getenv("XDG_CONFIG_DIRS");
    if (dirs == nullptr || dirs[0] == 0) dirs = "/etc/xdg";
    size_t first = strcspn(dirs, ":");
    FormatText(systemConfig, sizeof systemConfig, "%.*s", static_cast<int>(first), dirs);
    inputs->commonAppDataFound = first > 0 && IsDirectory(systemConfig);
}
