// Single-instance hand-off on Windows: the named mutex, the search for the running frame window
// among the top-level windows, and the TCP hand-off of a second instance's arguments.
//
// Everything here runs on the launcher's main thread; nothing is logged or shown.

// inet_addr and gethostbyname are the calls the hand-off is defined with; keep MSVC quiet about them.
#ifndef _WINSOCK_DEPRECATED_NO_WARNINGS
#define _WINSOCK_DEPRECATED_NO_WARNINGS
#endif

#include <winsock2.h>
#include <windows.h>

#include <string.h>
#include <wchar.h>

#include "instance.h"
#include "../jvm/jvm.h"

namespace {

// Title and class buffers of the window test, in UTF-16 units. WM_GETTEXT is asked for at most
// 1,024 characters and GetClassNameW for at most 2,048, so each buffer holds what it may be given.
const int kTitleUnits = 1024;
const int kClassUnits = 2048;

const char kFrameClassName[] = LAUNCHER_FRAME_CLASS_NAME;

const int kConnectAttempts = 5;
const DWORD kConnectRetryDelayMs = 5000;

// The frame class name as UTF-16 in `out` (capacity `units`); false when it cannot be widened.
bool WidenFrameClassName(WCHAR* out, int units) {
    out[0] = 0;
    return MultiByteToWideChar(CP_THREAD_ACP, 0, kFrameClassName, -1, out, units) != 0;
}

}  // namespace

// The lock is an owned mutex whose name the caller passes. The start-up sequence hands over the
// 8-bit instance name as it is, so the platform sees nine UTF-16 units made of its byte pairs; every
// instance and every outside probe meets on that name. Any failure, and a name that already exists,
// gives null: both mean "another instance runs". The handle is kept open until the process ends,
// also the one a second instance receives for the existing mutex.
void* AcquireInstanceLock(const char16_t* name) {
    HANDLE lock = CreateMutexW(nullptr, TRUE, reinterpret_cast<LPCWSTR>(name));
    if (GetLastError() == ERROR_ALREADY_EXISTS) return nullptr;
    return lock;
}

// EnumWindows callback: raises `window` when it is the running application's frame. The checks run in
// a fixed order and stop at the first one failed: visible, has a title, the title's bytes hold the
// instance name before their first zero byte, has a class name, the class name is the frame class
// (ignoring ASCII letter case). A qualifying window is restored when minimised and brought to the
// front. Always TRUE, so every qualifying window is treated and the last one ends in front.
BOOL CALLBACK ActivateRunningInstance(HWND window, LPARAM) {
    if (window == nullptr) return TRUE;
    if (!IsWindowVisible(window)) return TRUE;

    WCHAR title[kTitleUnits];
    memset(title, 0, sizeof title);
    if (SendMessageW(window, WM_GETTEXT, kTitleUnits, reinterpret_cast<LPARAM>(title)) == 0) return TRUE;
    // Byte-wise on purpose: the title's UTF-16 bytes up to the first zero byte must contain the 8-bit
    // instance name, which is how the frame's title spells the lock name. A title starting with a
    // character below U+0100 is a one-byte string here and never matches.
    if (strstr(reinterpret_cast<const char*>(title), InstanceName) == nullptr) return TRUE;

    WCHAR className[kClassUnits];
    memset(className, 0, sizeof className);
    if (GetClassNameW(window, className, kClassUnits) == 0) return TRUE;

    // Its 34 characters and the terminator.
    WCHAR frameClass[sizeof kFrameClassName];
    memset(frameClass, 0, sizeof frameClass);
    if (!WidenFrameClassName(frameClass, lstrlenA(kFrameClassName) + 1)) return TRUE;
    if (_wcsicmp(className, frameClass) != 0) return TRUE;

    if (IsIconic(window)) ShowWindow(window, SW_RESTORE);
    SetForegroundWindow(window);
    return TRUE;
}

void ActivateRunningInstances() { EnumWindows(ActivateRunningInstance, 0); }

// One connection to port 6152 of "localhost": every argument after argv[0], hex-encoded, one send
// each, nothing between them; the close ends the message. Five connects on the same socket, each
// failure followed by a 5 s pause. On the failure paths after WSAStartup the socket and Winsock are
// left to the process end, which follows at once.
Status ForwardArguments(char16_t** argv, int32_t argc) {
    WSADATA winsock;
    if (WSAStartup(MAKEWORD(2, 2), &winsock) != 0) {
        PrintText("Failed to load Winsock library!\n");
        return -1;
    }

    SOCKET connection = socket(AF_INET, SOCK_STREAM, IPPROTO_TCP);
    if (connection == INVALID_SOCKET) return -1;

    sockaddr_in destination;
    memset(&destination, 0, sizeof destination);
    destination.sin_family = AF_INET;
    destination.sin_port = htons(kHandOffPort);
    destination.sin_addr.s_addr = inet_addr("localhost");
    if (destination.sin_addr.s_addr == INADDR_NONE) {
        hostent* host = gethostbyname("localhost");
        if (host == nullptr || host->h_addr_list == nullptr || host->h_addr_list[0] == nullptr) return -1;
        size_t addressBytes = static_cast<size_t>(host->h_length);
        if (addressBytes > sizeof destination.sin_addr) addressBytes = sizeof destination.sin_addr;
        memcpy(&destination.sin_addr, host->h_addr_list[0], addressBytes);
    }

    bool connected = false;
    for (int attempt = 0; attempt < kConnectAttempts; ++attempt) {
        if (connect(connection, reinterpret_cast<const sockaddr*>(&destination), sizeof destination) != SOCKET_ERROR) {
            connected = true;
            break;
        }
        Sleep(kConnectRetryDelayMs);
    }
    if (!connected) return -1;

    // The buffer starts empty and an empty argument leaves it as it is: an empty first argument
    // sends nothing, a later one repeats the argument before it. A failed send drops that argument
    // only. The buffer lives until the process ends, which follows at once.
    EncodeBuffer encoded = {nullptr, 0};
    for (int32_t i = 1; i < argc; ++i) {
        if (!EncodeArgumentInto(argv[i], &encoded)) continue;  // out of memory: this argument is dropped
        const char* text = encoded.text != nullptr ? encoded.text : "";
        send(connection, text, static_cast<int>(strlen(text)), 0);
    }

    closesocket(connection);
    WSACleanup();
    return 0;
}
