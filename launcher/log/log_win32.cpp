// The log file on Windows: read/write, shared for reading only (a second launcher cannot write
// into a running instance's log), always recreated.
#include "log_platform.h"

#include "../text/text_win32.h"

#include <windows.h>

LogHandle LogPlatformOpen(const char16_t* path) {
    HANDLE h = CreateFileW(reinterpret_cast<LPCWSTR>(path), GENERIC_READ | GENERIC_WRITE, FILE_SHARE_READ, nullptr,
                           CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
    return reinterpret_cast<LogHandle>(h);
}

bool LogPlatformWrite(LogHandle handle, const void* data, uint32_t bytes, uint32_t* written, uint32_t* error) {
    DWORD done = 0;
    BOOL ok = WriteFile(reinterpret_cast<HANDLE>(handle), data, bytes, &done, nullptr);
    *written = done;
    *error = ok ? 0 : GetLastError();
    return ok != FALSE;
}

void LogPlatformClose(LogHandle handle) { CloseHandle(reinterpret_cast<HANDLE>(handle)); }

void LogPlatformWriteFailed(uint32_t error) { PrintText("WriteFile failed with error %d.\n", static_cast<int>(error)); }

int LogPlatformWidenBytes(const char*, int units) { return units + 1; }
