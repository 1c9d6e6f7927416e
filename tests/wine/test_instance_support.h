// Shared pieces of the instance hand-off tests: a running first instance (the launcher with the VM
// double keeping main busy until stop.flag appears), a TCP listener on the hand-off port standing in
// for the running application, and a look at the windows of another process.
#ifndef TESTS_WINE_TEST_INSTANCE_SUPPORT_H
#define TESTS_WINE_TEST_INSTANCE_SUPPORT_H

#include <winsock2.h>
#include <windows.h>

#include <stdio.h>

#include <string>
#include <thread>
#include <vector>

#include "support/testbed.h"

namespace handoff {

// The name the platform sees for the lock: the bytes of "QZ-Lumiscope_QZ-57" read pairwise as
// UTF-16 units ("QZ" is 0x5A51, "-L" 0x4C2D, ...). The running frame's title spells the same units.
const wchar_t kLockName[] = L"\x5A51\x4C2D\x6D75\x7369\x6F63\x6570\x515F\x2D5A\x3735";
const char kLockNameHex[] = "5a514c2d6d7573696f636570515f2d5a3735";
const wchar_t kReadableName[] = L"QZ-Lumiscope_QZ-57";
const char kFrameClass[] = "com.qz.kpo.emu57.app.EmulatorFrame";
const unsigned short kPort = 6152;

// Four lower-case hex digits per UTF-16 unit.
inline std::string Hex(const std::wstring& text) {
    std::string out;
    char unit[8];
    for (wchar_t c : text) {
        snprintf(unit, sizeof unit, "%04x", static_cast<unsigned>(c) & 0xFFFF);
        out += unit;
    }
    return out;
}

// ---- The first instance.

struct FirstInstance {
    std::wstring appDir;
    bed::Running* running = nullptr;
};

// The VM double recorded the call of main in `appDir`.
inline bool MainCalled(const std::wstring& appDir) {
    for (const std::string& line : bed::ReadRecord(appDir))
        if (line.compare(0, 21, "CallStaticVoidMethodV") == 0) return true;
    return false;
}

// A fresh application directory whose VM main waits for stop.flag, with `extraScript` lines
// (e.g. window=...). Started with "-noSplash" so that no splash window joins the windows under test.
// True once main runs (the lock is taken before the VM is loaded).
inline bool StartFirst(FirstInstance* first, const std::string& extraScript = std::string()) {
    bed::AppOptions options;
    options.script = "main_until_file=stop.flag\n" + extraScript;
    first->appDir = bed::MakeAppDir(options);
    bed::RunOptions run;
    run.timeoutMs = 150000;
    std::wstring exe = bed::AppExe(first->appDir);
    first->running = bed::Start(exe, bed::Quote(exe) + L" -noSplash", first->appDir, run);
    return bed::WaitFor([first] { return MainCalled(first->appDir); }, 20000);
}

inline bed::RunResult StopFirst(FirstInstance* first) {
    bed::Touch(first->appDir, L"stop.flag");
    bed::RunResult result = bed::Finish(first->running);
    first->running = nullptr;
    return result;
}

// Stops the first instance when a test leaves early.
struct FirstGuard {
    FirstInstance* first;
    ~FirstGuard() {
        if (first->running != nullptr) StopFirst(first);
    }
};

// ---- The listener on 127.0.0.1:6152.

class Listener {
  public:
    // closeAfterBytes < 0: read until the sender closes. Otherwise reset the connection as soon as
    // that many bytes have arrived.
    bool Start(int closeAfterBytes = -1) {
        WSADATA data;
        if (WSAStartup(MAKEWORD(2, 2), &data) != 0) return false;
        started_ = true;
        closeAfterBytes_ = closeAfterBytes;
        listening_ = socket(AF_INET, SOCK_STREAM, IPPROTO_TCP);
        if (listening_ == INVALID_SOCKET) return false;
        BOOL reuse = TRUE;  // a reset connection of an earlier test may still hold the port
        setsockopt(listening_, SOL_SOCKET, SO_REUSEADDR, reinterpret_cast<const char*>(&reuse), sizeof reuse);
        sockaddr_in address = {};
        address.sin_family = AF_INET;
        address.sin_port = htons(kPort);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (bind(listening_, reinterpret_cast<sockaddr*>(&address), sizeof address) == SOCKET_ERROR) return false;
        if (listen(listening_, 4) == SOCKET_ERROR) return false;
        thread_ = std::thread(&Listener::Serve, this);
        return true;
    }

    // Waits for the connection to end (the thread gives up after its own time limits).
    void Finish() {
        if (thread_.joinable()) thread_.join();
        if (listening_ != INVALID_SOCKET) {
            // A second connection would be a fault: the hand-off makes exactly one.
            extraConnection = Readable(listening_, 0);
            closesocket(listening_);
            listening_ = INVALID_SOCKET;
        }
        if (started_) WSACleanup();
        started_ = false;
    }

    ~Listener() { Finish(); }

    bool accepted = false;
    bool endedByClose = false;  // recv reported the sender's orderly close
    bool extraConnection = false;
    std::string received;

  private:
    static bool Readable(SOCKET s, int timeoutMs) {
        fd_set set;
        FD_ZERO(&set);
        FD_SET(s, &set);
        timeval limit = {timeoutMs / 1000, (timeoutMs % 1000) * 1000};
        return select(0, &set, nullptr, nullptr, &limit) == 1;
    }

    void Serve() {
        if (!Readable(listening_, 40000)) return;
        SOCKET connection = accept(listening_, nullptr, nullptr);
        if (connection == INVALID_SOCKET) return;
        accepted = true;
        char buffer[8192];
        for (;;) {
            int want = static_cast<int>(sizeof buffer);
            if (closeAfterBytes_ >= 0) {
                int left = closeAfterBytes_ - static_cast<int>(received.size());
                if (left <= 0) {
                    linger abort = {1, 0};
                    setsockopt(connection, SOL_SOCKET, SO_LINGER, reinterpret_cast<const char*>(&abort), sizeof abort);
                    break;
                }
                if (left < want) want = left;
            }
            if (!Readable(connection, 20000)) break;
            int got = recv(connection, buffer, want, 0);
            if (got == 0) endedByClose = true;
            if (got <= 0) break;
            received.append(buffer, static_cast<size_t>(got));
        }
        closesocket(connection);
    }

    bool started_ = false;
    int closeAfterBytes_ = -1;
    SOCKET listening_ = INVALID_SOCKET;
    std::thread thread_;
};

// ---- Second instances.

// Runs the launcher of `appDir` with `args` (already quoted) and keeps this thread's messages
// flowing meanwhile, so that windows of this process answer while the second instance works.
inline bed::RunResult RunSecond(const std::wstring& appDir, const std::wstring& args) {
    std::wstring exe = bed::AppExe(appDir);
    std::wstring line = bed::Quote(exe);
    if (!args.empty()) line += L" " + args;
    bed::RunOptions options;
    options.timeoutMs = 60000;
    bed::Running* running = bed::Start(exe, line, appDir, options);
    HANDLE process = bed::ProcessHandle(running);
    DWORD start = GetTickCount();
    while (process != nullptr && GetTickCount() - start < options.timeoutMs) {
        DWORD wait = MsgWaitForMultipleObjects(1, &process, FALSE, 100, QS_ALLINPUT);
        if (wait == WAIT_OBJECT_0) break;
        MSG message;
        while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
    }
    return bed::Finish(running);
}

// ---- Windows of another process.

struct WindowScan {
    DWORD processId;
    std::vector<HWND> windows;
};

inline BOOL CALLBACK CollectWindowsOf(HWND window, LPARAM param) {
    WindowScan* scan = reinterpret_cast<WindowScan*>(param);
    DWORD owner = 0;
    GetWindowThreadProcessId(window, &owner);
    if (owner == scan->processId) scan->windows.push_back(window);
    return TRUE;
}

// Top-level windows of `processId`, in the order EnumWindows delivers them.
inline std::vector<HWND> WindowsOf(DWORD processId) {
    WindowScan scan = {processId, {}};
    EnumWindows(CollectWindowsOf, reinterpret_cast<LPARAM>(&scan));
    return scan.windows;
}

// "CLASS|TITLEHEX" of a window, the form in which the VM double's window= lines name them.
inline std::string KeyOf(HWND window) {
    wchar_t className[256] = {0};
    GetClassNameW(window, className, 256);
    wchar_t title[1024] = {0};
    GetWindowTextW(window, title, 1024);
    return bed::ToUtf8(className) + "|" + Hex(title);
}

}  // namespace handoff

#endif
