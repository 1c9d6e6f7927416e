// Shared pieces of the instance tests: a running first instance (the launcher with the VM double
// keeping main busy until stop.flag appears), a TCP listener on the hand-off port standing in for
// the running application, and second starts that keep this thread's windows answering.
#ifndef TESTS_WINE_TEST_INSTANCE_SUPPORT_H
#define TESTS_WINE_TEST_INSTANCE_SUPPORT_H

#include <winsock2.h>
#include <windows.h>

#include <string>
#include <thread>

#include "support/testbed.h"
#include "test_jvm_support.h"

namespace handoff {

using jvmtest::Hex;

// The bytes of "QZ-Lumiscope_QZ-57" read pairwise as UTF-16 units ("QZ" is 0x5A51, "-L" 0x4C2D, ...).
// The lock has this name; the running frame's title spells the same units.
const wchar_t kLockName[] = L"\x5A51\x4C2D\x6D75\x7369\x6F63\x6570\x515F\x2D5A\x3735";
const wchar_t kReadableName[] = L"QZ-Lumiscope_QZ-57";

inline void Pump() {
    MSG message;
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
}

// Started with "-noSplash" so that no splash window joins the windows under test; stopped when it goes.
struct FirstInstance {
    std::wstring appDir;
    bed::Running* running = nullptr;

    // `extraScript`: more VM double lines (e.g. window=...). True once main runs.
    bool Start(const std::string& extraScript = std::string()) {
        bed::AppOptions options;
        options.script = "main_until_file=stop.flag\n" + extraScript;
        appDir = bed::MakeAppDir(options);
        bed::RunOptions run;
        run.timeoutMs = 150000;
        std::wstring exe = bed::AppExe(appDir);
        running = bed::Start(exe, bed::Quote(exe) + L" -noSplash", appDir, run);
        return bed::WaitFor([this] { return bed::RecordHas(appDir, "CallStaticVoidMethodV"); }, 20000);
    }
    bed::RunResult Stop() {
        bed::Touch(appDir, L"stop.flag");
        bed::RunResult result = bed::Finish(running);
        running = nullptr;
        return result;
    }
    ~FirstInstance() {
        if (running != nullptr) Stop();
    }
};

// A listener on 127.0.0.1:6152 taking one connection. closeAfterBytes >= 0: the connection is
// reset as soon as that many bytes arrived; otherwise it reads until the sender closes.
class Listener {
  public:
    bool Start(int closeAfterBytes = -1) {
        WSADATA data;
        if (WSAStartup(MAKEWORD(2, 2), &data) != 0) return false;
        started_ = true;
        closeAfter_ = closeAfterBytes;
        listening_ = socket(AF_INET, SOCK_STREAM, IPPROTO_TCP);
        BOOL reuse = TRUE;  // a reset connection of an earlier test may still hold the port
        setsockopt(listening_, SOL_SOCKET, SO_REUSEADDR, reinterpret_cast<const char*>(&reuse), sizeof reuse);
        sockaddr_in address = {};
        address.sin_family = AF_INET;
        address.sin_port = htons(6152);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (listening_ == INVALID_SOCKET || bind(listening_, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
            listen(listening_, 4) != 0)
            return false;
        thread_ = std::thread(&Listener::Serve, this);
        return true;
    }

    // Waits for the connection to end; the serving thread has its own time limits.
    void Finish() {
        if (thread_.joinable()) thread_.join();
        if (listening_ != INVALID_SOCKET) {
            extraConnection = Readable(listening_, 0);  // the hand-off connects exactly once
            closesocket(listening_);
            listening_ = INVALID_SOCKET;
        }
        if (started_) WSACleanup();
        started_ = false;
    }
    ~Listener() { Finish(); }

    bool accepted = false, endedByClose = false, extraConnection = false;
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
        SOCKET connection = Readable(listening_, 40000) ? accept(listening_, nullptr, nullptr) : INVALID_SOCKET;
        accepted = connection != INVALID_SOCKET;
        if (!accepted) return;
        char buffer[8192];
        for (;;) {
            int want = static_cast<int>(sizeof buffer);
            int left = closeAfter_ - static_cast<int>(received.size());
            if (closeAfter_ >= 0 && left < want) want = left;
            if (want <= 0) {
                linger abort = {1, 0};
                setsockopt(connection, SOL_SOCKET, SO_LINGER, reinterpret_cast<const char*>(&abort), sizeof abort);
                break;
            }
            int got = Readable(connection, 20000) ? recv(connection, buffer, want, 0) : -1;
            endedByClose = got == 0;
            if (got <= 0) break;
            received.append(buffer, static_cast<size_t>(got));
        }
        closesocket(connection);
    }

    bool started_ = false;
    int closeAfter_ = -1;
    SOCKET listening_ = INVALID_SOCKET;
    std::thread thread_;
};

// Runs the launcher of `appDir` with `args` (already quoted), pumping this thread's messages
// meanwhile so that windows of this process answer the second instance.
inline bed::RunResult RunSecond(const std::wstring& appDir, const std::wstring& args) {
    std::wstring exe = bed::AppExe(appDir);
    bed::Running* running = bed::Start(exe, bed::Quote(exe) + (args.empty() ? L"" : L" " + args), appDir);
    HANDLE process = bed::ProcessHandle(running);
    for (DWORD start = GetTickCount(); GetTickCount() - start < 60000;) {
        if (MsgWaitForMultipleObjects(1, &process, FALSE, 100, QS_ALLINPUT) == WAIT_OBJECT_0) break;
        Pump();
    }
    return bed::Finish(running);
}

}  // namespace handoff

#endif
