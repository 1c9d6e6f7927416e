// The VM host on Windows: the application directory, the VM library of the private runtime and the
// special folders of the option list.
#include <windows.h>
#include <shlobj.h>
#include <shlwapi.h>
#include <stdlib.h>

#include "jvm_platform.h"

#include "../text/text.h"

namespace {

// The 32-bit VM's entry point and function tables are __stdcall. A jni_md.h with an empty JNICALL
// (the Linux one) compiles without a word and corrupts the stack only with a real runtime, so the
// build refuses it. On x86_64 there is one calling convention and both sides are the same type.
template <typename A, typename B>
struct SameType {
    static const bool value = false;
};
template <typename A>
struct SameType<A, A> {
    static const bool value = true;
};
static_assert(SameType<CreateJavaVmEntry, jint(__stdcall*)(JavaVM**, void**, void*)>::value,
              "JNI_CreateJavaVM must be called as __stdcall");
static_assert(SameType<decltype(JNINativeInterface_::FindClass), jclass(__stdcall*)(JNIEnv*, const char*)>::value,
              "the JNI function table must be called as __stdcall");

const char kVmLibrary[] = "jre\\bin\\client\\jvm.dll";

enum { kFolderPathUnits = 260 };
// The per-user folder, narrowed byte by byte; lives until the VM is created.
char gUserAppDataNarrow[kFolderPathUnits + 1];

// The special-folder paths reach the VM as the low 8 bits of each of the buffer's 260 units, with
// no code-page conversion: characters above U+00FF arrive altered, and one whose low byte is zero
// ends the text there. `out` holds kFolderPathUnits + 1 bytes and is always terminated.
void NarrowLowBytes(const char16_t* folder, char* out) {
    for (int i = 0; i < kFolderPathUnits; ++i) out[i] = static_cast<char>(folder[i] & 0xFF);
    out[kFolderPathUnits] = 0;
}

// Zeroes `vm` and loads the library at `path`, relative to the current directory.
Status LoadJvmLibrary(VmState* vm, const char* path) {
    *vm = VmState();
    char16_t* widePath = WideCopy(path);
    if (widePath == nullptr) return kStatusNotFound;
    HMODULE library = LoadLibraryW(reinterpret_cast<LPCWSTR>(widePath));
    free(widePath);
    if (library == nullptr) return kStatusNotFound;
    // A library without the entry point still counts as loaded; CreateVm reports it.
    vm->createJavaVm =
        reinterpret_cast<CreateJavaVmEntry>(reinterpret_cast<void*>(GetProcAddress(library, "JNI_CreateJavaVM")));
    return kStatusOk;
}

}  // namespace

const char kDirectorySeparator[] = "\\";

// The directory of argv[0] as typed, made the current directory for good; from here on it is the
// current directory as re-read (normally without trailing backslash).
char* EnterVmDirectory(const char16_t* argv0) {
    WCHAR drive[_MAX_DRIVE], directory[_MAX_DIR], name[_MAX_FNAME], extension[_MAX_EXT];
    WCHAR appDirectory[MAX_PATH];
    _wsplitpath(reinterpret_cast<const wchar_t*>(argv0), drive, directory, name, extension);
    wsprintfW(appDirectory, L"%s%s", drive, directory);
    SetCurrentDirectoryW(appDirectory);
    GetCurrentDirectoryW(MAX_PATH, appDirectory);
    return NarrowCopy(reinterpret_cast<const char16_t*>(appDirectory));
}

// The VM library and the libraries the VM loads later need the C runtime that sits in the
// runtime's bin folder, which the standard search does not look in: that folder joins the DLL
// search for the rest of the process. The library itself is still found by its relative path.
// While a DLL folder is set the current directory leaves the search, so when that hides the
// library (argv[0] naming another directory than the program file's), the plain search is tried
// once more.
Status LoadPrivateRuntime(VmState* vm) {
    WCHAR current[MAX_PATH];
    WCHAR runtimeBin[MAX_PATH];
    bool dllDirectorySet = GetCurrentDirectoryW(MAX_PATH, current) != 0 &&
                           PathCombineW(runtimeBin, current, L"jre\\bin") != nullptr &&
                           SetDllDirectoryW(runtimeBin) != FALSE;
    Status loaded = LoadJvmLibrary(vm, kVmLibrary);
    if (loaded != kStatusOk && dllDirectorySet) {
        SetDllDirectoryW(nullptr);
        loaded = LoadJvmLibrary(vm, kVmLibrary);
    }
    return loaded;
}

void DescribeJavaException(const VmState&) {}

// Both folder queries without creating anything; a failed query only drops its option. The
// per-user path reaches the VM as the low byte of each of its 260 units, on purpose.
void FindSettingsFolders(VmOptionInputs* inputs) {
    WCHAR userAppData[MAX_PATH] = {0};
    WCHAR commonAppData[MAX_PATH] = {0};
    inputs->userAppDataFound = SHGetSpecialFolderPathW(nullptr, userAppData, CSIDL_APPDATA, FALSE) != FALSE;
    inputs->commonAppDataFound = SHGetSpecialFolderPathW(nullptr, commonAppData, CSIDL_COMMON_APPDATA, FALSE) != FALSE;
    NarrowLowBytes(reinterpret_cast<const char16_t*>(userAppData), gUserAppDataNarrow);
    inputs->userAppData = gUserAppDataNarrow;
}
