// Self-protection checks on Windows: our own executable file read through a mapped view, and the
// two ways the system tells a process that it is being debugged.
#include "protection.h"
#include "protection_platform.h"

#include <windows.h>

// The one switch of the stage. Without it nothing below reaches the executable.
#if defined(LAUNCHER_PROTECTION) && LAUNCHER_PROTECTION

namespace {

// Long enough for any path the loader accepts for a program; a longer one counts as unreadable.
const DWORD kModulePathUnits = 1024;

}  // namespace

Status ProtectionCheckImage() {
    WCHAR path[kModulePathUnits];
    DWORD units = GetModuleFileNameW(nullptr, path, kModulePathUnits);
    if (units == 0 || units >= kModulePathUnits) return kProtectionImageUnreadable;

    // The loader holds the file open for reading and execution, never for writing.
    HANDLE file = CreateFileW(path, GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_DELETE, nullptr, OPEN_EXISTING,
                              FILE_ATTRIBUTE_NORMAL, nullptr);
    if (file == INVALID_HANDLE_VALUE) return kProtectionImageUnreadable;
    DWORD sizeHigh = 0;
    DWORD size = GetFileSize(file, &sizeHigh);
    Status result = kProtectionImageUnreadable;
    // An empty file cannot be mapped; one of 4 GB or more is not our launcher.
    if (size != INVALID_FILE_SIZE && size != 0 && sizeHigh == 0) {
        HANDLE mapping = CreateFileMappingW(file, nullptr, PAGE_READONLY, 0, 0, nullptr);
        if (mapping != nullptr) {
            const void* view = MapViewOfFile(mapping, FILE_MAP_READ, 0, 0, 0);
            if (view != nullptr) {
                result = VerifyImageChecksum(static_cast<const uint8_t*>(view), size);
                UnmapViewOfFile(view);
            }
            CloseHandle(mapping);
        }
    }
    CloseHandle(file);
    return result;
}

Status ProtectionCheckDebugger() {
    if (IsDebuggerPresent()) return kProtectionDebuggerLocal;
    // Also catches a debugger that cleared the process's "being debugged" flag.
    BOOL attached = FALSE;
    if (CheckRemoteDebuggerPresent(GetCurrentProcess(), &attached) && attached) return kProtectionDebuggerRemote;
    return kProtectionPassed;
}

#else

Status ProtectionCheckImage() { return kProtectionPassed; }
Status ProtectionCheckDebugger() { return kProtectionPassed; }

#endif
