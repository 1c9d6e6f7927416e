// debug_runner.exe [--hide-flag] COMMAND LINE...
//
// Starts COMMAND LINE (the rest of our own command line, unchanged) as a process being debugged by
// us, runs the debug loop until it ends and exits with its exit code. The working directory is
// inherited. --hide-flag clears the debuggee's "being debugged" flag in its process block, so that
// only the system's own record of the attached debugger gives us away.
//
// Prints "debuggee pid=N" when the process has started and "debuggee exit=N" at its end. When the
// program cannot be started the exit code is 0xDEB00000 plus the system's error code (low 16 bits).
#include <windows.h>

#include <stdio.h>
#include <string.h>
#include <wchar.h>

namespace {

const DWORD kRunnerFailed = 0xDEB00000u;

// Skips one command-line element (quoted or not) and the blanks after it.
const wchar_t* SkipElement(const wchar_t* p) {
    bool quoted = false;
    for (; *p != 0 && (quoted || (*p != L' ' && *p != L'\t')); ++p)
        if (*p == L'"') quoted = !quoted;
    while (*p == L' ' || *p == L'\t') ++p;
    return p;
}

// PROCESS_BASIC_INFORMATION as NtQueryInformationProcess fills it (class 0).
struct BasicInformation {
    LONG exitStatus;
    BYTE* pebBaseAddress;
    ULONG_PTR affinityMask;
    LONG basePriority;
    ULONG_PTR uniqueProcessId;
    ULONG_PTR inheritedFromUniqueProcessId;
};
typedef LONG(WINAPI* QueryInformationProcessFn)(HANDLE, ULONG, void*, ULONG, ULONG*);

// BeingDebugged is the byte at offset 2 of the process environment block, on both architectures.
void ClearBeingDebugged(HANDLE process) {
    QueryInformationProcessFn query = reinterpret_cast<QueryInformationProcessFn>(
        reinterpret_cast<void*>(GetProcAddress(GetModuleHandleW(L"ntdll"), "NtQueryInformationProcess")));
    BasicInformation info = {};
    if (query == nullptr || query(process, 0, &info, sizeof info, nullptr) != 0 || info.pebBaseAddress == nullptr) {
        printf("debug_runner: no process block\n");
        return;
    }
    const BYTE zero = 0;
    if (!WriteProcessMemory(process, info.pebBaseAddress + 2, &zero, 1, nullptr))
        printf("debug_runner: flag not cleared (%lu)\n", GetLastError());
}

}  // namespace

int main() {
    const wchar_t* rest = SkipElement(GetCommandLineW());
    bool hideFlag = false;
    if (wcsncmp(rest, L"--hide-flag", 11) == 0 && (rest[11] == L' ' || rest[11] == L'\t')) {
        hideFlag = true;
        rest = SkipElement(rest);
    }
    if (*rest == 0) {
        printf("usage: debug_runner [--hide-flag] PROGRAM [ARGUMENTS...]\n");
        return static_cast<int>(kRunnerFailed);
    }

    wchar_t* line = _wcsdup(rest);
    STARTUPINFOW startup = {};
    startup.cb = sizeof startup;
    PROCESS_INFORMATION process = {};
    if (!CreateProcessW(nullptr, line, nullptr, nullptr, FALSE, DEBUG_ONLY_THIS_PROCESS, nullptr, nullptr, &startup,
                        &process)) {
        DWORD error = GetLastError();
        printf("debug_runner: cannot start (%lu)\n", error);
        return static_cast<int>(kRunnerFailed | (error & 0xFFFF));
    }
    printf("debuggee pid=%lu\n", process.dwProcessId);
    fflush(stdout);

    DWORD exitCode = 0;
    bool initialBreakSeen = false;
    for (bool running = true; running;) {
        DEBUG_EVENT event = {};
        if (!WaitForDebugEvent(&event, INFINITE)) break;
        DWORD status = DBG_CONTINUE;
        switch (event.dwDebugEventCode) {
        case CREATE_PROCESS_DEBUG_EVENT:
            if (event.u.CreateProcessInfo.hFile != nullptr) CloseHandle(event.u.CreateProcessInfo.hFile);
            if (hideFlag) ClearBeingDebugged(process.hProcess);
            break;
        case LOAD_DLL_DEBUG_EVENT:
            if (event.u.LoadDll.hFile != nullptr) CloseHandle(event.u.LoadDll.hFile);
            break;
        case EXCEPTION_DEBUG_EVENT:
            // The loader's breakpoint is ours to swallow; everything else goes back to the program.
            if (!initialBreakSeen && event.u.Exception.ExceptionRecord.ExceptionCode == EXCEPTION_BREAKPOINT) {
                initialBreakSeen = true;
                if (hideFlag) ClearBeingDebugged(process.hProcess);  // the loader may have set it again
            } else {
                status = DBG_EXCEPTION_NOT_HANDLED;
            }
            break;
        case EXIT_PROCESS_DEBUG_EVENT:
            exitCode = event.u.ExitProcess.dwExitCode;
            running = false;
            break;
        default:
            break;
        }
        ContinueDebugEvent(event.dwProcessId, event.dwThreadId, status);
    }
    WaitForSingleObject(process.hProcess, INFINITE);
    DWORD reported = 0;
    if (GetExitCodeProcess(process.hProcess, &reported) && reported != STILL_ACTIVE) exitCode = reported;
    printf("debuggee exit=%lu\n", exitCode);
    CloseHandle(process.hThread);
    CloseHandle(process.hProcess);
    return static_cast<int>(exitCode);
}
