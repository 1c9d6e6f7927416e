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
#include <string.h>

#include <map>
#include <string>
#include <vector>

namespace {

DWORD g_pid, g_start = GetTickCount();
std::string g_output;

DWORD Now() { return GetTickCount() - g_start; }

std::wstring Unhex(const char* hex) {
    std::wstring text;
    for (unsigned unit = 0; strlen(hex) >= 4 && sscanf(hex, "%4x", &unit) == 1; hex += 4) text += static_cast<wchar_t>(unit);
    return text;
}

std::string Json(const std::wstring& text) {
    std::string out = "\"";
    char escape[8];
    for (wchar_t c : text) {
        if (c == L'"' || c == L'\\') out += '\\';
        if (c >= 0x20 && c < 0x7f) {
            out += static_cast<char>(c);
        } else {
            snprintf(escape, sizeof escape, "\\u%04x", static_cast<unsigned>(c));
            out += escape;
        }
    }
    return out + "\"";
}

const char* Bool(bool value) { return value ? "true" : "false"; }

struct Scan {
    std::vector<HWND> boxes;
    HWND splash = nullptr;
};
BOOL CALLBACK Collect(HWND window, LPARAM param) {
    DWORD pid = 0;
    wchar_t name[64] = {0};
    GetWindowThreadProcessId(window, &pid);
    GetClassNameW(window, name, 64);
    if (pid != g_pid || !IsWindowVisible(window)) return TRUE;
    Scan* scan = reinterpret_cast<Scan*>(param);
    if (lstrcmpW(name, L"#32770") == 0) scan->boxes.push_back(window);
    if (lstrcmpW(name, L"SplashScreenWndClass") == 0) scan->splash = window;
    return TRUE;
}
Scan ScanWindows() {
    Scan scan;
    EnumWindows(Collect, reinterpret_cast<LPARAM>(&scan));
    return scan;
}

BOOL CALLBACK Order(HWND window, LPARAM param) {
    reinterpret_cast<std::vector<HWND>*>(param)->push_back(window);
    return TRUE;
}

void Pump() {
    MSG message;
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
}

DWORD WINAPI ReadOutput(LPVOID pipe) {
    char buffer[4096];
    DWORD got = 0;
    while (ReadFile(pipe, buffer, sizeof buffer, &got, nullptr) && got > 0) g_output.append(buffer, got);
    return 0;
}

// The program is started on a thread of its own, which, as its debugger, must also take its debug
// events: the main thread may wait on the program's windows, and a debuggee stopped at an event
// would never answer them.
struct Launch {
    std::wstring exe, cmd, cwd;
    bool debug;
    STARTUPINFOW startup;
    PROCESS_INFORMATION process;
    BOOL started;
    HANDLE ready;
};
DWORD WINAPI LaunchThread(LPVOID param) {
    Launch* l = static_cast<Launch*>(param);
    l->started = CreateProcessW(l->exe.c_str(), &l->cmd[0], nullptr, nullptr, TRUE, l->debug ? DEBUG_ONLY_THIS_PROCESS : 0,
                                nullptr, l->cwd.c_str(), &l->startup, &l->process);
    SetEvent(l->ready);
    bool firstBreak = true;
    DEBUG_EVENT event;
    while (l->started && l->debug && WaitForDebugEvent(&event, INFINITE)) {
        DWORD status = DBG_CONTINUE;
        if (event.dwDebugEventCode == EXCEPTION_DEBUG_EVENT) {  // the loader's breakpoint is ours
            bool initial = firstBreak && event.u.Exception.ExceptionRecord.ExceptionCode == EXCEPTION_BREAKPOINT;
            firstBreak = firstBreak && !initial;
            if (!initial) status = DBG_EXCEPTION_NOT_HANDLED;
        }
        ContinueDebugEvent(event.dwProcessId, event.dwThreadId, status);
        if (event.dwDebugEventCode == EXIT_PROCESS_DEBUG_EVENT) break;
    }
    return 0;
}

const wchar_t kShellFolders[] = L"Software\\Microsoft\\Windows\\CurrentVersion\\Explorer\\User Shell Folders";
struct Saved {
    HKEY root;
    REGSAM view;
    std::wstring name;
    bool existed;
    DWORD type;
    std::vector<BYTE> data;
};

void Redirect(const std::wstring& spec, std::vector<Saved>* saved) {
    std::wstring name = spec.substr(0, spec.find(L'=')), path = spec.substr(spec.find(L'=') + 1);
    HKEY root = name == L"Common AppData" ? HKEY_LOCAL_MACHINE : HKEY_CURRENT_USER;
    for (REGSAM view : {KEY_WOW64_64KEY, KEY_WOW64_32KEY}) {
        HKEY key = nullptr;
        if (RegCreateKeyExW(root, kShellFolders, 0, nullptr, 0, KEY_ALL_ACCESS | view, nullptr, &key, nullptr)) continue;
        Saved s{root, view, name, false, 0, std::vector<BYTE>(4096)};
        DWORD size = 4096;
        s.existed = RegQueryValueExW(key, name.c_str(), nullptr, &s.type, s.data.data(), &size) == ERROR_SUCCESS;
        s.data.resize(size);
        RegSetValueExW(key, name.c_str(), 0, REG_EXPAND_SZ, reinterpret_cast<const BYTE*>(path.c_str()),
                       static_cast<DWORD>((path.size() + 1) * 2));
        RegCloseKey(key);
        saved->push_back(s);
    }
}

void Restore(const std::vector<Saved>& saved) {
    for (auto s = saved.rbegin(); s != saved.rend(); ++s) {  // last first: both views may be one key
        HKEY key = nullptr;
        if (RegOpenKeyExW(s->root, kShellFolders, 0, KEY_SET_VALUE | s->view, &key)) continue;
        if (s->existed) RegSetValueExW(key, s->name.c_str(), 0, s->type, s->data.data(), static_cast<DWORD>(s->data.size()));
        else RegDeleteValueW(key, s->name.c_str());
        RegCloseKey(key);
    }
}

HWND MakeWindow(const std::wstring& className, const std::wstring& title, DWORD style) {
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = DefWindowProcW;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.lpszClassName = className.c_str();
    RegisterClassW(&windowClass);  // fails harmlessly for a class we (in any letter case) already have
    return CreateWindowExW(0, className.c_str(), title.c_str(), style, 40, 40, 320, 200, nullptr, nullptr,
                           GetModuleHandleW(nullptr), nullptr);
}

}  // namespace

int main(int argc, char** argv) {
    std::wstring exe, cmd, cwd;
    bool debug = false;
    DWORD splashWait = 0, timeout = 120000;
    std::vector<Saved> saved;
    std::vector<HWND> windows;
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i], key = arg.substr(0, arg.find('=')), value = arg.substr(arg.find('=') + 1);
        std::wstring text = Unhex(value.c_str());
        if (key == "exe") exe = text;
        if (key == "cmd") cmd = text;
        if (key == "cwd") cwd = text;
        if (key == "debug") debug = true;
        if (key == "splash_wait") splashWait = strtoul(value.c_str(), nullptr, 10);
        if (key == "timeout") timeout = strtoul(value.c_str(), nullptr, 10);
        if (key == "lock") CreateMutexW(nullptr, TRUE, L"\x5A51\x4C2D\x6D75\x7369\x6F63\x6570\x515F\x2D5A\x3735");
        if (key == "folder") Redirect(text, &saved);
        if (key == "window") {
            size_t a = text.find(L','), b = text.find(L',', a + 1);
            DWORD style = WS_OVERLAPPEDWINDOW | (text[0] == L'h' ? WS_MINIMIZE : 0);
            HWND window = MakeWindow(text.substr(a + 1, b - a - 1), text.substr(b + 1), style);
            if (text[0] != L'h') ShowWindow(window, text[0] == L'z' ? SW_SHOWMAXIMIZED : SW_SHOWMINIMIZED);
            windows.push_back(window);
        }
    }
    printf("{\"ev\":\"screen\",\"w\":%d,\"h\":%d}\n", GetSystemMetrics(SM_CXSCREEN), GetSystemMetrics(SM_CYSCREEN));
    HWND front = nullptr;
    if (!windows.empty()) {
        front = MakeWindow(L"ProbeFront", L"front", WS_OVERLAPPEDWINDOW | WS_VISIBLE);
        SetForegroundWindow(front);
        for (DWORD t = Now(); GetForegroundWindow() != front && Now() - t < 5000; Sleep(10)) Pump();
    }
    std::vector<HWND> order;
    EnumWindows(Order, reinterpret_cast<LPARAM>(&order));

    SECURITY_ATTRIBUTES inherit = {sizeof inherit, nullptr, TRUE};
    HANDLE readEnd = nullptr, writeEnd = nullptr;
    CreatePipe(&readEnd, &writeEnd, &inherit, 0);
    SetHandleInformation(readEnd, HANDLE_FLAG_INHERIT, 0);
    Launch launch = {exe, cmd, cwd, debug, {}, {}, FALSE, CreateEventW(nullptr, TRUE, FALSE, nullptr)};
    launch.startup.cb = sizeof launch.startup;
    launch.startup.dwFlags = STARTF_USESTDHANDLES;
    launch.startup.hStdOutput = launch.startup.hStdError = writeEnd;
    CreateThread(nullptr, 0, LaunchThread, &launch, 0, nullptr);
    WaitForSingleObject(launch.ready, INFINITE);
    PROCESS_INFORMATION& process = launch.process;
    if (!launch.started) {
        printf("{\"ev\":\"exit\",\"t\":%lu,\"code\":null,\"error\":%lu}\n", Now(), GetLastError());
        Restore(saved);
        return 1;
    }
    CloseHandle(writeEnd);
    HANDLE reader = CreateThread(nullptr, 0, ReadOutput, readEnd, 0, nullptr);
    g_pid = process.dwProcessId;

    HWND splash = nullptr;
    bool splashGone = false, killed = false;
    std::string alphas;
    int lastAlpha = -1;
    std::map<HWND, DWORD> handled;  // box -> when its dismissal was last posted
    for (bool ended = false; !ended;) {
        ended = WaitForSingleObject(process.hProcess, 0) == WAIT_OBJECT_0;
        Scan scan = ScanWindows();
        if (scan.splash != nullptr && splash == nullptr) {
            splash = scan.splash;
            RECT r;
            GetWindowRect(splash, &r);
            printf("{\"ev\":\"splash\",\"t\":%lu,\"rect\":[%ld,%ld,%ld,%ld],\"exstyle\":%lu}\n", Now(), r.left, r.top,
                   r.right - r.left, r.bottom - r.top, static_cast<unsigned long>(GetWindowLongW(splash, GWL_EXSTYLE)));
        }
        BYTE alpha = 0;
        if (splash != nullptr && !splashGone && GetLayeredWindowAttributes(splash, nullptr, &alpha, nullptr) && alpha != lastAlpha) {
            alphas += (lastAlpha < 0 ? "" : ",") + std::to_string(alpha);
            lastAlpha = alpha;
        }
        if (splash != nullptr && !splashGone && (!IsWindow(splash) || ended)) {
            splashGone = true;
            printf("{\"ev\":\"splash_gone\",\"t\":%lu,\"alphas\":[%s]}\n", Now(), alphas.c_str());
        }
        for (HWND box : scan.boxes) {
            if (handled.count(box)) continue;
            bool withSplash = scan.splash != nullptr;
            for (DWORD t = Now(); !withSplash && Now() - t < splashWait; Sleep(20)) withSplash = ScanWindows().splash != nullptr;
            Sleep(30);  // let the box fill in its controls
            wchar_t caption[1024] = {0}, text[4096] = {0};
            GetWindowTextW(box, caption, 1024);
            DWORD_PTR got = 0;  // a hung program must not hang us
            SendMessageTimeoutW(GetDlgItem(box, 0xFFFF), WM_GETTEXT, 4096, reinterpret_cast<LPARAM>(text), SMTO_ABORTIFHUNG, 5000, &got);
            HWND icon = GetDlgItem(box, 0x440);
            bool hasIcon = icon != nullptr && IsWindowVisible(icon) &&
                           SendMessageTimeoutW(icon, STM_GETICON, 0, 0, SMTO_ABORTIFHUNG, 5000, &got) && got != 0;
            printf("{\"ev\":\"box\",\"t\":%lu,\"caption\":%s,\"text\":%s,\"icon\":%s,\"splash\":%s}\n", Now(),
                   Json(caption).c_str(), Json(text).c_str(), Bool(hasIcon), Bool(withSplash));
            PostMessageW(box, WM_COMMAND, IDOK, 0);
            handled[box] = Now();
        }
        for (auto& box : handled) {  // a dismissal posted while the box was still setting up may be lost
            if (IsWindow(box.first) && Now() - box.second > 500) PostMessageW(box.first, WM_COMMAND, IDOK, 0), box.second = Now();
        }
        fflush(stdout);
        if (!ended && Now() > timeout) TerminateProcess(process.hProcess, 0xDEAD), killed = true;
        if (!ended) MsgWaitForMultipleObjects(1, &process.hProcess, FALSE, 10, QS_ALLINPUT);
        Pump();
    }
    WaitForSingleObject(reader, 5000);
    DWORD code = 0;
    GetExitCodeProcess(process.hProcess, &code);

    for (DWORD t = Now(); front != nullptr && GetForegroundWindow() == front && Now() - t < 5000; Sleep(10)) Pump();
    for (size_t i = 0; i < windows.size(); ++i) {
        size_t pos = 0;
        while (pos < order.size() && order[pos] != windows[i]) ++pos;
        printf("{\"ev\":\"window\",\"i\":%u,\"pos\":%u,\"iconic\":%s,\"zoomed\":%s,\"visible\":%s,\"front\":%s}\n",
               static_cast<unsigned>(i), static_cast<unsigned>(pos), Bool(IsIconic(windows[i])),
               Bool(IsZoomed(windows[i])), Bool(IsWindowVisible(windows[i])), Bool(GetForegroundWindow() == windows[i]));
    }
    std::wstring output(g_output.begin(), g_output.end());
    for (wchar_t& c : output) c &= 0xFF;  // bytes as Latin-1
    printf("{\"ev\":\"exit\",\"t\":%lu,\"code\":%ld,\"killed\":%s,\"stdout\":%s}\n", Now(), static_cast<long>(code),
           Bool(killed), Json(output).c_str());
    Restore(saved);
    return 0;
}
