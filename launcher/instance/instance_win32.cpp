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
#include "instance_platform.h"

#include "../text/text_win32.h"

namespace {

// Title and class buffers of the window test, in UTF-16 units. WM_GETTEXT is asked for at most
// kTitleUnits characters and GetClassNameW for at most 2,048, so each buffer holds what it may be given.
const int kClassUnits = 2048;

}  // namespace

// The lock is an owned mutex whose name the caller passes (the nine-unit name every instance and
// every outside probe meets on). Any failure, and a name that already exists, mean "another instance
// runs". The handle is kept open until the process ends, also the one a
// second instance receives for the existing mutex.
bool AcquireInstanceLock(const char16_t* name) {
    HANDLE lock = CreateMutexW(nullptr, TRUE, reinterpret_cast<LPCWSTR>(name));
    if (GetLastError() == ERROR_ALREADY_EXISTS) return false;
    return lock != nullptr;
}

// EnumWindows callback: raises `window` when it is the running application's frame. The checks run
// in a fixed order and stop at the first one failed: visible, has a title, the title test, has a
// class name, the class test. A qualifying window is restored when minimised and brought to the
// front. Always TRUE, so every qualifying window is treated and the last one ends in front.
BOOL CALLBACK ActivateRunningInstance(HWND window, LPARAM) {
    if (window == nullptr) return TRUE;
    if (!IsWindowVisible(window)) return TRUE;

    WCHAR title[kTitleUnits];
    memset(title, 0, sizeof title);
    if (SendMessageW(window, WM_GETTEXT, kTitleUnits, reinterpret_cast<LPARAM>(title)) == 0) return TRUE;
    if (!TitleHoldsInstanceName(reinterpret_cast<const char16_t*>(title))) return TRUE;

    WCHAR className[kClassUnits];
    memset(className, 0, sizeof className);
    if (GetClassNameW(window, className, kClassUnits) == 0) return TRUE;
    if (!IsFrameClassName(reinterpret_cast<const char16_t*>(className), false)) return TRUE;

    if (IsIconic(window)) ShowWindow(window, SW_RESTORE);
    SetForegroundWindow(window);
    return TRUE;
}

void ActivateRunningInstances() { EnumWindows(ActivateRunningInstance, 0); }

bool HandOffStart() {
    WSADATA winsock;
    if (WSAStartup(MAKEWORD(2, 2), &winsock) != 0) {
        PrintText("Failed to load Winsock library!\n");
        return false;
    }
    return true;
}

// The socket is made and "localhost" resolved on the first attempt; every attempt reuses both. On
// the failure paths the socket and Winsock are left to the process end, which follows at once.
int HandOffConnect(HandOffLink* link) {
    sockaddr_in destination;
    memset(&destination, 0, sizeof destination);
    destination.sin_family = AF_INET;
    destination.sin_port = htons(HandOffPort);
    if (link->socket == kNoHandOffSocket) {
        SOCKET made = socket(AF_INET, SOCK_STREAM, IPPROTO_TCP);
        if (made == INVALID_SOCKET) return -1;
        link->socket = static_cast<intptr_t>(made);
        destination.sin_addr.s_addr = inet_addr("localhost");
        if (destination.sin_addr.s_addr == INADDR_NONE) {
            hostent* host = gethostbyname("localhost");
            if (host == nullptr || host->h_addr_list == nullptr || host->h_addr_list[0] == nullptr) return -1;
            size_t addressBytes = static_cast<size_t>(host->h_length);
            if (addressBytes > sizeof destination.sin_addr) addressBytes = sizeof destination.sin_addr;
            memcpy(&destination.sin_addr, host->h_addr_list[0], addressBytes);
        }
        link->address = destination.sin_addr.s_addr;
        link->resolved = true;
    }
    destination.sin_addr.s_addr = link->address;
    return connect(static_cast<SOCKET>(link->socket), reinterpret_cast<const sockaddr*>(&destination),
                   sizeof destination) != SOCKET_ERROR
               ? 1
               : 0;
}

void HandOffSend(const HandOffLink& link, const char* data, size_t bytes) {
    send(static_cast<SOCKET>(link.socket), data, static_cast<int>(bytes), 0);
}

void HandOffClose(HandOffLink* link) {
    closesocket(static_cast<SOCKET>(link->socket));
    WSACleanup();
}

void PauseMs(uint32_t ms) { Sleep(ms); }
