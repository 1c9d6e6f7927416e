// The VM host on Windows: the application directory, the VM library of the private runtime, the
// special folders of the option list, the message boxes of the failure paths.
#include <windows.h>
#include <shlobj.h>
#include <shlwapi.h>
#include <stdlib.h>

#include "jvm_internal.h"
#include "../resources/resource_ids.h"
#include "../splash/splash.h"
#include "../startup/startup.h"

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

const int kMessageUnits = 1024;

// Shows string `id` of the string table, converted to narrow text; false when there is no such
// string (then nothing is shown).
bool ShowStringBox(HINSTANCE instance, UINT id) {
    WCHAR message[kMessageUnits];
    if (LoadStringW(instance, id, message, kMessageUnits) <= 0) return false;
    ShowErrorBox(NarrowCopy(reinterpret_cast<const char16_t*>(message)));
    return true;
}

}  // namespace

Status LoadJvmLibrary(const char* path) {
    JvmState = VmState();
    char16_t* widePath = WideCopy(path);
    if (widePath == nullptr) return kStatusNotFound;
    HMODULE library = LoadLibraryW(reinterpret_cast<LPCWSTR>(widePath));
    free(widePath);
    if (library == nullptr) return kStatusNotFound;
    // A library without the entry point still counts as loaded; CreateVm reports it.
    JvmState.createJavaVm =
        reinterpret_cast<CreateJavaVmEntry>(reinterpret_cast<void*>(GetProcAddress(library, "JNI_CreateJavaVM")));
    return kStatusOk;
}

Status LaunchJavaApplication(void* instance, int32_t argc, char16_t** argv) {
    HINSTANCE module = static_cast<HINSTANCE>(instance);

    // The application directory is the directory of argv[0], made the current directory for good;
    // from here on it is the current directory as re-read (normally without trailing backslash).
    WCHAR drive[_MAX_DRIVE], directory[_MAX_DIR], name[_MAX_FNAME], extension[_MAX_EXT];
    WCHAR appDirectory[MAX_PATH];
    _wsplitpath(reinterpret_cast<const wchar_t*>(argv[0]), drive, directory, name, extension);
    wsprintfW(appDirectory, L"%s%s", drive, directory);
    SetCurrentDirectoryW(appDirectory);
    GetCurrentDirectoryW(MAX_PATH, appDirectory);

    // The VM library and the libraries the VM loads later need the C runtime that sits in the
    // runtime's bin folder, which the standard search does not look in: that folder joins the DLL
    // search for the rest of the process. The library itself is still found by its relative path.
    // While a DLL folder is set the current directory leaves the search, so when that hides the
    // library (argv[0] naming another directory than the program file's), the plain search is
    // tried once more.
    WCHAR runtimeBin[MAX_PATH];
    bool dllDirectorySet =
        PathCombineW(runtimeBin, appDirectory, L"jre\\bin") != nullptr && SetDllDirectoryW(runtimeBin) != FALSE;
    Status loaded = LoadJvmLibrary(LAUNCHER_VM_LIBRARY);
    if (loaded != kStatusOk && dllDirectorySet) {
        SetDllDirectoryW(nullptr);
        loaded = LoadJvmLibrary(LAUNCHER_VM_LIBRARY);
    }
    if (loaded != kStatusOk) {
        ShowStringBox(module, IDS_VM_LIBRARY_NOT_LOADED);
        return kStatusNotFound;
    }

    // Both folder queries without creating anything; a failed query only drops its option.
    WCHAR userAppData[MAX_PATH] = {0};
    WCHAR commonAppData[MAX_PATH] = {0};
    bool userAppDataFound = SHGetSpecialFolderPathW(nullptr, userAppData, CSIDL_APPDATA, FALSE) != FALSE;
    bool commonAppDataFound = SHGetSpecialFolderPathW(nullptr, commonAppData, CSIDL_COMMON_APPDATA, FALSE) != FALSE;
    char userAppDataNarrow[kFolderPathUnits + 1];
    NarrowLowBytes(reinterpret_cast<const char16_t*>(userAppData), userAppDataNarrow);

    char* appDirectoryNarrow = NarrowCopy(reinterpret_cast<const char16_t*>(appDirectory));
    VmOptionInputs inputs;
    inputs.appDirectory = appDirectoryNarrow;
    inputs.argc = argc;
    inputs.argv = argv;
    inputs.userAppDataFound = userAppDataFound;
    inputs.userAppData = userAppDataNarrow;
    inputs.commonAppDataFound = commonAppDataFound;
    ComposeVmOptions(inputs);
    free(appDirectoryNarrow);

    Status created = CreateVm();
    if (created != kStatusOk) {
        // Without a message text the result is -3 whatever the VM said.
        return ShowStringBox(module, IDS_VM_NOT_CREATED) ? created : kStatusNoVmSilent;
    }

    // Returns when the Java main method has returned.
    if (CallJavaMain(LAUNCHER_MAIN_CLASS, argv, argc) != kStatusOk) ShowStringBox(module, IDS_MAIN_CLASS_NOT_CALLED);

    // Waits for the Java application's last non-daemon thread.
    Status destroyed = DestroyVm();
    char destroyText[64];
    FormatText(destroyText, sizeof destroyText, "jvm destroy res=%d", static_cast<int>(destroyed));
    ShowErrorBox(destroyText);
    SplashClose();
    return destroyed;
}
