// probe.exe: what only a Windows process can see of a launcher run, for the table's Wine driver.
//
//   probe.exe exe=HEX cmd=HEX cwd=HEX [lock=1] [debug=1] [splash_wait=MS] [timeout=MS]
//             [folder=HEX]... [window=HEX]...
//
// HEX is a text as four hex digits per UTF-16 unit, so any text passes Wine's command line intact
// (which holds 32,767 units: keep the program's command line under 8,000).
//   exe, cmd, cwd   program file, whole command line (argv[0] included), working directory
//   lock=1          hold the launcher's instance lock (its nine-unit name) during the run
//   debug=1         run the program as our debuggee
//   splash_wait     when a box shows, wait up to MS for a splash window before reading it
//   folder          "Personal=PATH", "AppData=PATH" or "Common AppData=PATH": that special folder
//                   points at PATH during the run (both registry views), then back
//   window          "STATE,CLASS,TITLE", STATE i (minimised), z (maximised) or h (hidden): a window
//                   of ours during the run; a plain window of ours is in front when the program starts
//
// Prints JSON lines, t in ms since the start:
//   {"ev":"screen","w":W,"h":H}
//   {"ev":"splash","t":T,"rect":[X,Y,W,H],"exstyle":N}     the splash window became visible
//   {"ev":"box","t":T,"caption":S,"text":S,"icon":B,"splash":B}   a message box (then dismissed);
//                                                           splash: a splash window was up with it
//   {"ev":"splash_gone","t":T,"alphas":[A...]}             every opacity seen, in order
//   {"ev":"window","i":I,"pos":P,"iconic":B,"zoomed":B,"visible":B,"front":B}   after the run;
//                                                           pos: its place in EnumWindows order
//   {"ev":"exit","t":T,"code":N,"killed":B,"stdout":S}     code: the full signed exit code
#include <windows.h>

#include <stdio.h>
#include <stdlib.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

namespace {

DWORD g_pid, g_start = GetTickCount();
DWORD Now() { return GetTickCount() - g_start; }
const char* Bool(bool value) { return value ? "true" : "false"; }

std::string Json(const std::wstring& text) {
    std::string out = "\"";
    char escape[8];
    for (wchar_t c : text) {
        if (c >= 0x20 && c < 0x7f) {
            if (c == L'"' || c == L'\\') out += '\\';
            out += static_cast<char>(c);
        } else {
            snprintf(escape, sizeof escape, "\\u%04x", static_cast<unsigned>(c));
            out += escape;
        }
    }
    return out + "\"";
}

HWND g_splash;  // of the last scan
std::vector<HWND> g_boxes, g_all;
BOOL CALLBACK Collect(HWND window, LPARAM) {
    DWORD pid = 0;
    wchar_t name[64] = {0};
    GetWindowThreadProcessId(window, &pid);
    GetClassNameW(window, name, 64);
    g_all.push_back(window);
    if (pid != g_pid || !IsWindowVisible(window)) return TRUE;
    if (lstrcmpW(name, L"#32770") == 0) g_boxes.push_back(window);
    if (lstrcmpW(name, L"SplashScreenWndClass") == 0) g_splash = window;
    return TRUE;
}
void Scan() {
    g_splash = nullptr;
    g_boxes.clear();
    g_all.clear();
    EnumWindows(Collect, 0);
}

void Pump() {
    MSG message;
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
}

// The program starts on a thread of its own, which as its debugger also takes its debug events: the
// main thread waits on the program's windows, and a debuggee stopped at an event would never answer.
struct Launch {
    std::wstring exe, cmd, cwd;
    bool debug;
    STARTUPINFOW startup;
    PROCESS_INFORMATION process;
    HANDLE ready;
};
DWORD WINAPI LaunchThread(LPVOID param) {
    Launch* l = static_cast<Launch*>(param);
    BOOL started = CreateProcessW(l->exe.c_str(), &l->cmd[0], nullptr, nullptr, TRUE, l->debug ? DEBUG_ONLY_THIS_PROCESS : 0,
                                  nullptr, l->cwd.c_str(), &l->startup, &l->process);
    SetEvent(l->ready);
    bool firstBreak = true;
    DEBUG_EVENT event;
    while (started && l->debug && WaitForDebugEvent(&event, INFINITE)) {
        bool initial = event.dwDebugEventCode == EXCEPTION_DEBUG_EVENT && firstBreak &&
                       event.u.Exception.ExceptionRecord.ExceptionCode == EXCEPTION_BREAKPOINT;  // the loader's, ours
        firstBreak = firstBreak && !initial;
        bool exception = event.dwDebugEventCode == EXCEPTION_DEBUG_EVENT && !initial;
        ContinueDebugEvent(event.dwProcessId, event.dwThreadId, exception ? DBG_EXCEPTION_NOT_HANDLED : DBG_CONTINUE);
        if (event.dwDebugEventCode == EXIT_PROCESS_DEBUG_EVENT) break;
    }
    return 0;
}

// A special folder pointed elsewhere in this process's registry view (that of the program, which
// is built for the same architecture), and put back.
const wchar_t kFolders[] = L"Software\\Microsoft\\Windows\\CurrentVersion\\Explorer\\User Shell Folders";
struct Saved {
    HKEY root;
    std::wstring name;
    LSTATUS had;
    DWORD type, size;
    BYTE data[2048];
};
std::vector<Saved> g_saved;
void Redirect(const std::wstring& folder) {
    std::wstring name = folder.substr(0, folder.find(L'=')), path = folder.substr(folder.find(L'=') + 1);
    g_saved.push_back({name == L"Common AppData" ? HKEY_LOCAL_MACHINE : HKEY_CURRENT_USER, name, 0, 0, 2048, {}});
    Saved& s = g_saved.back();
    s.had = RegGetValueW(s.root, kFolders, name.c_str(), RRF_RT_ANY | RRF_NOEXPAND, &s.type, s.data, &s.size);
    RegSetKeyValueW(s.root, kFolders, name.c_str(), REG_EXPAND_SZ, path.c_str(), static_cast<DWORD>(path.size() * 2 + 2));
}
void Restore() {
    for (const Saved& s : g_saved) {
        if (s.had == ERROR_SUCCESS) RegSetKeyValueW(s.root, kFolders, s.name.c_str(), s.type, s.data, s.size);
        else RegDeleteKeyValueW(s.root, kFolders, s.name.c_str());
    }
}

HWND MakeWindow(const std::wstring& className, const std::wstring& title, DWORD style) {
    WNDCLASSW windowClass = {0, DefWindowProcW, 0, 0, GetModuleHandleW(nullptr), nullptr, nullptr, nullptr, nullptr, className.c_str()};
    RegisterClassW(&windowClass);  // fails harmlessly for a class we already have, in any letter case
    return CreateWindowExW(0, className.c_str(), title.c_str(), style, 40, 40, 320, 200, nullptr, nullptr, nullptr, nullptr);
}

}  // namespace

int main(int argc, char** argv) {
    Launch launch = {};
    DWORD splashWait = 0, timeout = 120000;
    std::vector<HWND> windows;
    for (int i = 1; i < argc; ++i) {
        std::string key = std::string(argv[i]).substr(0, std::string(argv[i]).find('=')), value = argv[i] + key.size() + 1;
        std::wstring text;
        unsigned unit = 0;
        for (size_t at = 0; at + 4 <= value.size() && sscanf(value.c_str() + at, "%4x", &unit) == 1; at += 4) text += static_cast<wchar_t>(unit);
        if (key == "exe") launch.exe = text;
        if (key == "cmd") launch.cmd = text;
        if (key == "cwd") launch.cwd = text;
        if (key == "debug") launch.debug = true;
        if (key == "splash_wait") splashWait = strtoul(value.c_str(), nullptr, 10);
        if (key == "timeout") timeout = strtoul(value.c_str(), nullptr, 10);
        if (key == "lock") CreateMutexW(nullptr, TRUE, L"\x5A51\x4C2D\x6D75\x7369\x6F63\x6570\x515F\x2D5A\x3735");
        if (key == "folder") Redirect(text);
        if (key == "window") {
            size_t a = text.find(L','), b = text.find(L',', a + 1);
            windows.push_back(MakeWindow(text.substr(a + 1, b - a - 1), text.substr(b + 1),
                                         WS_OVERLAPPEDWINDOW | (text[0] == L'h' ? WS_MINIMIZE : 0)));
            if (text[0] != L'h') ShowWindow(windows.back(), text[0] == L'z' ? SW_SHOWMAXIMIZED : SW_SHOWMINIMIZED);
        }
    }
    printf("{\"ev\":\"screen\",\"w\":%d,\"h\":%d}\n", GetSystemMetrics(SM_CXSCREEN), GetSystemMetrics(SM_CYSCREEN));
    HWND front = windows.empty() ? nullptr : MakeWindow(L"ProbeFront", L"front", WS_OVERLAPPEDWINDOW | WS_VISIBLE);
    for (DWORD t = Now(); front != nullptr && !SetForegroundWindow(front) && Now() - t < 5000; Sleep(10)) Pump();
    Scan();
    const std::vector<HWND> order = g_all;

    // The program's output goes to a file of ours, read when it has ended.
    wchar_t outputPath[MAX_PATH], temp[MAX_PATH];
    GetTempPathW(MAX_PATH, temp);
    GetTempFileNameW(temp, L"out", 0, outputPath);
    SECURITY_ATTRIBUTES inherit = {sizeof inherit, nullptr, TRUE};
    HANDLE output = CreateFileW(outputPath, GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE, &inherit, CREATE_ALWAYS,
                                FILE_FLAG_DELETE_ON_CLOSE, nullptr);
    launch.startup.cb = sizeof launch.startup;
    launch.startup.dwFlags = STARTF_USESTDHANDLES;
    launch.startup.hStdOutput = launch.startup.hStdError = output;
    launch.ready = CreateEventW(nullptr, TRUE, FALSE, nullptr);
    CreateThread(nullptr, 0, LaunchThread, &launch, 0, nullptr);
    WaitForSingleObject(launch.ready, INFINITE);
    HANDLE process = launch.process.hProcess;
    g_pid = launch.process.dwProcessId;

    HWND splash = nullptr;
    bool gone = false, killed = false;
    std::string alphas;
    int lastAlpha = -1;
    std::map<HWND, DWORD> handled;  // box -> when its dismissal was last posted
    for (bool ended = process == nullptr; !ended;) {
        ended = WaitForSingleObject(process, 0) == WAIT_OBJECT_0;
        Scan();
        if (g_splash != nullptr && splash == nullptr) {
            RECT r;
            GetWindowRect(splash = g_splash, &r);
            printf("{\"ev\":\"splash\",\"t\":%lu,\"rect\":[%ld,%ld,%ld,%ld],\"exstyle\":%ld}\n", Now(), r.left, r.top,
                   r.right - r.left, r.bottom - r.top, GetWindowLongW(splash, GWL_EXSTYLE));
        }
        BYTE alpha = 0;
        if (splash != nullptr && !gone && GetLayeredWindowAttributes(splash, nullptr, &alpha, nullptr) && alpha != lastAlpha) {
            alphas += (lastAlpha < 0 ? "" : ",") + std::to_string(alpha);
            lastAlpha = alpha;
        }
        if (splash != nullptr && !gone && (gone = !IsWindow(splash) || ended))
            printf("{\"ev\":\"splash_gone\",\"t\":%lu,\"alphas\":[%s]}\n", Now(), alphas.c_str());
        for (HWND box : std::vector<HWND>(g_boxes)) {
            if (handled.count(box)) continue;
            bool withSplash = g_splash != nullptr;
            for (DWORD t = Now(); !withSplash && Now() - t < splashWait; Sleep(20)) Scan(), withSplash = g_splash != nullptr;
            Sleep(30);  // let the box fill in its controls
            wchar_t caption[1024] = {0}, text[4096] = {0};
            GetWindowTextW(box, caption, 1024);
            DWORD_PTR icon = 0;  // a hung program must not hang us
            SendMessageTimeoutW(GetDlgItem(box, 0xFFFF), WM_GETTEXT, 4096, reinterpret_cast<LPARAM>(text), SMTO_ABORTIFHUNG, 5000, &icon);
            icon = 0;
            SendMessageTimeoutW(GetDlgItem(box, 0x440), STM_GETICON, 0, 0, SMTO_ABORTIFHUNG, 5000, &icon);
            printf("{\"ev\":\"box\",\"t\":%lu,\"caption\":%s,\"text\":%s,\"icon\":%s,\"splash\":%s}\n", Now(),
                   Json(caption).c_str(), Json(text).c_str(), Bool(icon != 0), Bool(withSplash));
            handled[box] = Now() - 1000;
        }
        for (auto& box : handled)  // a dismissal posted while the box was still setting up may be lost
            if (IsWindow(box.first) && Now() - box.second >= 500) PostMessageW(box.first, WM_COMMAND, IDOK, 0), box.second = Now();
        fflush(stdout);
        if (!ended && Now() > timeout) killed = TerminateProcess(process, 0xDEAD);
        if (!ended) MsgWaitForMultipleObjects(1, &process, FALSE, 10, QS_ALLINPUT);
        Pump();
    }
    DWORD code = 0;
    GetExitCodeProcess(process, &code);

    for (DWORD t = Now(); front != nullptr && GetForegroundWindow() == front && Now() - t < 5000; Sleep(10)) Pump();
    for (size_t i = 0; i < windows.size(); ++i) {
        HWND w = windows[i];
        printf("{\"ev\":\"window\",\"i\":%u,\"pos\":%d,\"iconic\":%s,\"zoomed\":%s,\"visible\":%s,\"front\":%s}\n",
               static_cast<unsigned>(i), static_cast<int>(std::find(order.begin(), order.end(), w) - order.begin()),
               Bool(IsIconic(w)), Bool(IsZoomed(w)), Bool(IsWindowVisible(w)), Bool(GetForegroundWindow() == w));
    }
    std::wstring text;
    char byte;
    DWORD got = 0;
    HANDLE written = CreateFileW(outputPath, GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr,
                                 OPEN_EXISTING, 0, nullptr);
    while (ReadFile(written, &byte, 1, &got, nullptr) && got == 1) text += static_cast<wchar_t>(byte & 0xFF);  // Latin-1
    printf("{\"ev\":\"exit\",\"t\":%lu,\"code\":%ld,\"killed\":%s,\"stdout\":%s}\n", Now(), static_cast<long>(code),
           Bool(killed), Json(text).c_str());
    Restore();
    return process == nullptr;
}
