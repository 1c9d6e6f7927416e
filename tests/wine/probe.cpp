// probe.exe: what only a Windows process can see of a launcher run, for the table's Wine driver.
//   probe.exe exe=HEX cmd=HEX cwd=HEX out=HEX [lock=1] [debug=1] [splash_wait=MS] [timeout=MS] [folder=HEX]... [window=HEX]...
// HEX: a text as four hex digits per UTF-16 unit, so any text passes Wine's command line intact.
//   exe, cmd, cwd, out  program file, whole command line, working directory, file for its output
//   lock=1 / debug=1    hold the launcher's instance lock (its nine-unit name) / run it as our debuggee
//   splash_wait         when a box shows, wait up to MS for a splash window before reading it
//   folder              "Personal=PATH", "AppData=PATH" or "Common AppData=PATH" during the run, then back
//   window              "STATE,CLASS,TITLE", STATE i (minimised), z (maximised) or h (hidden): a window of
//                       ours during the run; a plain window of ours is in front when the program starts
// Prints one line per event, t in ms since the start, texts in HEX:
//   screen W H | splash T X Y W H EXSTYLE | box T CAPTION TEXT ICON SPLASH (then dismissed; SPLASH: one
//   was up with it) | splash_gone T ALPHA... | window POS ICONIC ZOOMED VISIBLE FRONT | exit T CODE KILLED
#include <windows.h>

#include <stdio.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

namespace {

DWORD g_pid, g_start = GetTickCount();
DWORD Now() { return GetTickCount() - g_start; }

std::string Hex(const wchar_t* text) {
    std::string out = "t";  // never an empty token, never a number
    for (char digits[8]; *text; ++text) snprintf(digits, sizeof digits, "%04x", static_cast<unsigned>(*text)), out += digits;
    return out;
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
    g_splash = nullptr, g_boxes.clear(), g_all.clear();
    EnumWindows(Collect, 0);
}
void Pump() {
    for (MSG message; PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE);) DispatchMessageW(&message);
}

// The program starts on a thread of its own, which as its debugger also takes its debug events: the
// main thread waits on the program's windows, and a debuggee stopped at an event would never answer.
struct Launch { std::wstring exe, cmd, cwd; bool debug; STARTUPINFOW startup; PROCESS_INFORMATION process; HANDLE ready; };
DWORD WINAPI LaunchThread(LPVOID param) {
    Launch* l = static_cast<Launch*>(param);
    BOOL started = CreateProcessW(l->exe.c_str(), &l->cmd[0], nullptr, nullptr, TRUE, l->debug ? DEBUG_ONLY_THIS_PROCESS : 0,
                                  nullptr, l->cwd.c_str(), &l->startup, &l->process);
    SetEvent(l->ready);
    bool loaderBreak = true;  // the loader's initial breakpoint is ours; every other exception is the program's
    for (DEBUG_EVENT e; started && l->debug && WaitForDebugEvent(&e, INFINITE) && e.dwDebugEventCode != EXIT_PROCESS_DEBUG_EVENT;) {
        bool exception = e.dwDebugEventCode == EXCEPTION_DEBUG_EVENT && !(loaderBreak && e.u.Exception.ExceptionRecord.ExceptionCode == EXCEPTION_BREAKPOINT);
        loaderBreak = loaderBreak && e.dwDebugEventCode != EXCEPTION_DEBUG_EVENT;
        ContinueDebugEvent(e.dwProcessId, e.dwThreadId, exception ? DBG_EXCEPTION_NOT_HANDLED : DBG_CONTINUE);
    }
    return 0;
}

// A special folder pointed elsewhere in this process's registry view (that of the program, built
// for the same architecture), and put back.
const wchar_t kFolders[] = L"Software\\Microsoft\\Windows\\CurrentVersion\\Explorer\\User Shell Folders";
struct Saved { HKEY root; std::wstring name; LSTATUS had; DWORD type, size; BYTE data[2048]; };
std::vector<Saved> g_saved;
void Redirect(const std::wstring& folder) {
    std::wstring name = folder.substr(0, folder.find(L'=')), path = folder.substr(folder.find(L'=') + 1);
    g_saved.push_back({name == L"Common AppData" ? HKEY_LOCAL_MACHINE : HKEY_CURRENT_USER, name, 0, 0, 2048, {}});
    Saved& s = g_saved.back();
    s.had = RegGetValueW(s.root, kFolders, name.c_str(), RRF_RT_ANY | RRF_NOEXPAND, &s.type, s.data, &s.size);
    RegSetKeyValueW(s.root, kFolders, name.c_str(), REG_EXPAND_SZ, path.c_str(), static_cast<DWORD>(path.size() * 2 + 2));
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
    std::map<std::string, std::wstring> texts;
    std::vector<HWND> windows;
    for (int i = 1; i < argc; ++i) {
        std::string key = std::string(argv[i]).substr(0, std::string(argv[i]).find('=')), value = argv[i] + key.size() + 1;
        std::wstring& text = texts[key] = L"";
        for (size_t at = 0; at + 4 <= value.size(); at += 4) text += static_cast<wchar_t>(std::stoul(value.substr(at, 4), nullptr, 16));
        if (key == "debug") launch.debug = true;
        if (key == "splash_wait") splashWait = std::stoul(value);
        if (key == "timeout") timeout = std::stoul(value);
        if (key == "lock") CreateMutexW(nullptr, TRUE, L"\x5A51\x4C2D\x6D75\x7369\x6F63\x6570\x515F\x2D5A\x3735");
        if (key == "folder") Redirect(text);
        if (key == "window") {
            size_t a = text.find(L','), b = text.find(L',', a + 1);
            windows.push_back(MakeWindow(text.substr(a + 1, b - a - 1), text.substr(b + 1), WS_OVERLAPPEDWINDOW | (text[0] == L'h' ? WS_MINIMIZE : 0)));
            if (text[0] != L'h') ShowWindow(windows.back(), text[0] == L'z' ? SW_SHOWMAXIMIZED : SW_SHOWMINIMIZED);
        }
    }
    printf("screen %d %d\n", GetSystemMetrics(SM_CXSCREEN), GetSystemMetrics(SM_CYSCREEN));
    HWND front = windows.empty() ? nullptr : MakeWindow(L"ProbeFront", L"front", WS_OVERLAPPEDWINDOW | WS_VISIBLE);
    for (DWORD t = Now(); front != nullptr && !SetForegroundWindow(front) && Now() - t < 5000; Sleep(10)) Pump();
    Scan();
    const std::vector<HWND> order = g_all;

    SECURITY_ATTRIBUTES inherit = {sizeof inherit, nullptr, TRUE};
    launch.exe = texts["exe"], launch.cmd = texts["cmd"], launch.cwd = texts["cwd"], launch.startup = {sizeof launch.startup};
    launch.startup.dwFlags = STARTF_USESTDHANDLES;
    launch.startup.hStdOutput = launch.startup.hStdError =
        CreateFileW(texts["out"].c_str(), GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE, &inherit, CREATE_ALWAYS, 0, nullptr);
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
        RECT r;
        if (g_splash != nullptr && splash == nullptr && GetWindowRect(splash = g_splash, &r))
            printf("splash %lu %ld %ld %ld %ld %ld\n", Now(), r.left, r.top, r.right - r.left, r.bottom - r.top, GetWindowLongW(splash, GWL_EXSTYLE));
        BYTE alpha = 0;
        if (splash != nullptr && !gone && GetLayeredWindowAttributes(splash, nullptr, &alpha, nullptr) && alpha != lastAlpha)
            alphas += " " + std::to_string(lastAlpha = alpha);
        if (splash != nullptr && !gone && (gone = !IsWindow(splash) || ended)) printf("splash_gone %lu%s\n", Now(), alphas.c_str());
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
            printf("box %lu %s %s %d %d\n", Now(), Hex(caption).c_str(), Hex(text).c_str(), icon != 0, withSplash);
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
    for (HWND w : windows)
        printf("window %d %d %d %d %d\n", static_cast<int>(std::find(order.begin(), order.end(), w) - order.begin()), IsIconic(w) != 0,
               IsZoomed(w) != 0, IsWindowVisible(w) != 0, GetForegroundWindow() == w);
    printf("exit %lu %ld %d\n", Now(), static_cast<long>(code), killed);
    for (const Saved& s : g_saved)
        s.had == ERROR_SUCCESS ? RegSetKeyValueW(s.root, kFolders, s.name.c_str(), s.type, s.data, s.size) : RegDeleteKeyValueW(s.root, kFolders, s.name.c_str());
    return process == nullptr;
}
