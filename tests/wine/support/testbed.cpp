// Windows-side test support (see testbed.h).
#include "support/testbed.h"

#include <shlobj.h>
#include <shlwapi.h>

#include <atomic>
#include <map>
#include <thread>

namespace bed {

std::wstring LauncherExe() { return TESTBED_LAUNCHER; }
std::wstring LauncherNoStringsExe() { return TESTBED_LAUNCHER_NOSTRINGS; }
std::wstring VmDoubleDll() { return TESTBED_VMDOUBLE; }
std::wstring HelperExe(const wchar_t* name) { return std::wstring(TESTBED_HELPERS) + L"\\" + name; }

std::string ToUtf8(const std::wstring& text) {
    if (text.empty()) return std::string();
    int n = WideCharToMultiByte(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), nullptr, 0, nullptr, nullptr);
    std::string out(static_cast<size_t>(n), '\0');
    WideCharToMultiByte(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), &out[0], n, nullptr, nullptr);
    return out;
}

std::wstring FromUtf8(const std::string& text) {
    if (text.empty()) return std::wstring();
    int n = MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), nullptr, 0);
    std::wstring out(static_cast<size_t>(n), L'\0');
    MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), &out[0], n);
    return out;
}

std::string Utf16Bytes(const std::string& utf8) {
    std::wstring wide = FromUtf8(utf8);
    std::string out;
    for (wchar_t c : wide) {
        out.push_back(static_cast<char>(c & 0xFF));
        out.push_back(static_cast<char>((c >> 8) & 0xFF));
    }
    return out;
}

bool WaitFor(const std::function<bool()>& condition, DWORD timeoutMs) {
    DWORD start = GetTickCount();
    for (;;) {
        if (condition()) return true;
        if (GetTickCount() - start >= timeoutMs) return condition();
        Sleep(10);
    }
}

bool FileExists(const std::wstring& path) { return GetFileAttributesW(path.c_str()) != INVALID_FILE_ATTRIBUTES; }

std::string ReadFileBytes(const std::wstring& path) {
    // Shared for writing too: the launcher may still hold the file open.
    HANDLE h = CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr,
                           OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr);
    if (h == INVALID_HANDLE_VALUE) return std::string();
    std::string out;
    char buffer[65536];
    DWORD got = 0;
    while (ReadFile(h, buffer, sizeof buffer, &got, nullptr) && got > 0) out.append(buffer, got);
    CloseHandle(h);
    return out;
}

static void WriteFileBytes(const std::wstring& path, const std::string& bytes) {
    HANDLE h = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
    if (h == INVALID_HANDLE_VALUE) return;
    DWORD done = 0;
    if (!bytes.empty()) WriteFile(h, bytes.data(), static_cast<DWORD>(bytes.size()), &done, nullptr);
    CloseHandle(h);
}

std::wstring AppExe(const std::wstring& appDir) { return appDir + L"\\QZ-Lumiscope_QZ-57.exe"; }

std::wstring MakeAppDir(const AppOptions& options) {
    static std::atomic<int> counter(0);
    wchar_t temp[MAX_PATH];
    GetTempPathW(MAX_PATH, temp);
    std::wstring dir = std::wstring(temp) + L"qzapp-" + std::to_wstring(GetCurrentProcessId()) + L"-" +
                       std::to_wstring(counter++) + L"-" + std::to_wstring(GetTickCount());
    CreateDirectoryW(dir.c_str(), nullptr);
    std::wstring exe = !options.exeOverride.empty() ? options.exeOverride
                       : options.withStrings        ? LauncherExe()
                                                    : LauncherNoStringsExe();
    CopyFileW(exe.c_str(), AppExe(dir).c_str(), FALSE);
    CreateDirectoryW((dir + L"\\jre").c_str(), nullptr);
    CreateDirectoryW((dir + L"\\jre\\bin").c_str(), nullptr);
    CreateDirectoryW((dir + L"\\jre\\bin\\client").c_str(), nullptr);
    if (options.vm == Vm::Double) CopyFileW(VmDoubleDll().c_str(), (dir + L"\\jre\\bin\\client\\jvm.dll").c_str(), FALSE);
    WriteFileBytes(dir + L"\\emu57.jar", std::string());
    if (!options.script.empty()) WriteScript(dir, options.script);
    return dir;
}

void WriteScript(const std::wstring& appDir, const std::string& script) {
    WriteFileBytes(appDir + L"\\vmdouble.ini", script);
}

std::vector<std::string> ReadRecord(const std::wstring& appDir) {
    std::string bytes = ReadFileBytes(appDir + L"\\vmdouble.log");
    std::vector<std::string> lines;
    size_t start = 0;
    while (start < bytes.size()) {
        size_t end = bytes.find('\n', start);
        if (end == std::string::npos) end = bytes.size();
        std::string line = bytes.substr(start, end - start);
        if (!line.empty() && line.back() == '\r') line.pop_back();
        lines.push_back(line);
        start = end + 1;
    }
    return lines;
}

bool RecordHas(const std::wstring& appDir, const char* prefix) {
    for (const std::string& line : ReadRecord(appDir))
        if (line.rfind(prefix, 0) == 0) return true;
    return false;
}

void Touch(const std::wstring& appDir, const wchar_t* name) { WriteFileBytes(appDir + L"\\" + name, "x"); }

// ---- Running programs.

struct Running {
    PROCESS_INFORMATION process{};
    RunOptions options;
    DWORD startTick = 0;
    std::thread watcher;
    std::atomic<bool> stop{false};
    std::vector<MessageBoxInfo> boxes;  // written by the watcher only until it is joined
    HANDLE outputRead = nullptr;
    std::thread reader;
    std::string output;  // written by the reader only until it is joined
};

namespace {

struct BoxScan {
    Running* running;
    std::vector<HWND> found;
};

BOOL CALLBACK CollectBoxes(HWND window, LPARAM param) {
    BoxScan* scan = reinterpret_cast<BoxScan*>(param);
    DWORD pid = 0;
    GetWindowThreadProcessId(window, &pid);
    if (scan->running->options.anyProcess ? pid == GetCurrentProcessId() : pid != scan->running->process.dwProcessId)
        return TRUE;
    wchar_t className[64] = {0};
    GetClassNameW(window, className, 64);
    if (lstrcmpW(className, L"#32770") == 0 && IsWindowVisible(window)) scan->found.push_back(window);
    return TRUE;
}

MessageBoxInfo ReadBox(HWND box) {
    MessageBoxInfo info;
    wchar_t text[4096] = {0};
    GetWindowTextW(box, text, 4096);
    info.caption = ToUtf8(text);
    text[0] = 0;
    GetDlgItemTextW(box, 0xFFFF, text, 4096);
    info.text = ToUtf8(text);
    HWND icon = GetDlgItem(box, 0x440);
    info.errorIcon = icon != nullptr && IsWindowVisible(icon) && SendMessageW(icon, STM_GETICON, 0, 0) != 0;
    return info;
}

void WatchBoxes(Running* running) {
    // Boxes already read, with the time the dismissal was last posted. A box that is still there
    // half a second later is asked again: a dismissal posted while the box was still setting
    // itself up may be lost.
    std::map<HWND, DWORD> handled;
    for (;;) {
        bool ended = WaitForSingleObject(running->process.hProcess, 0) == WAIT_OBJECT_0;
        BoxScan scan{running, {}};
        EnumWindows(CollectBoxes, reinterpret_cast<LPARAM>(&scan));
        for (HWND box : scan.found) {
            if (handled.count(box)) continue;
            // Give the box a moment to fill in its controls before reading it.
            Sleep(30);
            MessageBoxInfo info = ReadBox(box);
            running->boxes.push_back(info);
            if (running->options.onBox) running->options.onBox(info, box);
            handled[box] = GetTickCount();
            if (running->options.dismissBoxes) PostMessageW(box, WM_COMMAND, IDOK, 0);
        }
        for (auto it = handled.begin(); it != handled.end();) {
            if (!IsWindow(it->first)) {
                it = handled.erase(it);
                continue;
            }
            if (running->options.dismissBoxes && GetTickCount() - it->second > 500) {
                PostMessageW(it->first, WM_COMMAND, IDOK, 0);
                it->second = GetTickCount();
            }
            ++it;
        }
        if (ended || running->stop) return;
        Sleep(10);
    }
}

}  // namespace

Running* Start(const std::wstring& application, const std::wstring& commandLine, const std::wstring& workingDir,
               const RunOptions& options) {
    Running* running = new Running;
    running->options = options;
    STARTUPINFOW startup{};
    startup.cb = sizeof startup;
    HANDLE outputWrite = nullptr;
    if (options.captureOutput) {
        SECURITY_ATTRIBUTES inherit{sizeof inherit, nullptr, TRUE};
        CreatePipe(&running->outputRead, &outputWrite, &inherit, 0);
        SetHandleInformation(running->outputRead, HANDLE_FLAG_INHERIT, 0);
        startup.dwFlags = STARTF_USESTDHANDLES;
        startup.hStdOutput = outputWrite;
        startup.hStdError = outputWrite;
        startup.hStdInput = GetStdHandle(STD_INPUT_HANDLE);
    }
    std::wstring mutableLine = commandLine;
    running->startTick = GetTickCount();
    BOOL started = CreateProcessW(application.c_str(), &mutableLine[0], nullptr, nullptr, options.captureOutput, 0,
                                  nullptr, workingDir.empty() ? nullptr : workingDir.c_str(), &startup,
                                  &running->process);
    if (outputWrite != nullptr) CloseHandle(outputWrite);  // the child holds the only write end now
    if (running->outputRead != nullptr) {
        running->reader = std::thread([running] {
            char buffer[4096];
            DWORD got = 0;
            while (ReadFile(running->outputRead, buffer, sizeof buffer, &got, nullptr) && got > 0)
                running->output.append(buffer, got);
        });
    }
    if (!started) {
        running->process.hProcess = nullptr;
        if (running->reader.joinable()) running->reader.join();
        return running;
    }
    running->watcher = std::thread(WatchBoxes, running);
    return running;
}

DWORD ProcessId(Running* running) { return running->process.dwProcessId; }
HANDLE ProcessHandle(Running* running) { return running->process.hProcess; }

RunResult Finish(Running* running) {
    RunResult result;
    if (running->process.hProcess == nullptr) {
        result.exitCode = 0xFFFFFFFF;
        result.timedOut = true;
        if (running->outputRead != nullptr) CloseHandle(running->outputRead);
        delete running;
        return result;
    }
    DWORD elapsed = GetTickCount() - running->startTick;
    DWORD left = elapsed >= running->options.timeoutMs ? 0 : running->options.timeoutMs - elapsed;
    if (WaitForSingleObject(running->process.hProcess, left) != WAIT_OBJECT_0) {
        result.timedOut = true;
        TerminateProcess(running->process.hProcess, 0xDEADBEEF);
        WaitForSingleObject(running->process.hProcess, 10000);
    }
    running->stop = true;
    if (running->watcher.joinable()) running->watcher.join();
    if (running->reader.joinable()) running->reader.join();
    if (running->outputRead != nullptr) CloseHandle(running->outputRead);
    result.output = running->output;
    GetExitCodeProcess(running->process.hProcess, &result.exitCode);
    result.boxes = running->boxes;
    CloseHandle(running->process.hThread);
    CloseHandle(running->process.hProcess);
    delete running;
    return result;
}

RunResult Run(const std::wstring& application, const std::wstring& commandLine, const std::wstring& workingDir,
              const RunOptions& options) {
    return Finish(Start(application, commandLine, workingDir, options));
}

std::wstring Quote(const std::wstring& text) {
    // Backslashes are literal except in front of a quote; double those that end the text.
    std::wstring out = L"\"";
    size_t backslashes = 0;
    for (wchar_t c : text) {
        if (c == L'\\') {
            ++backslashes;
        } else if (c == L'"') {
            out.append(backslashes + 1, L'\\');
            backslashes = 0;
        } else {
            backslashes = 0;
        }
        out.push_back(c);
    }
    out.append(backslashes, L'\\');
    out.push_back(L'"');
    return out;
}

RunResult RunLauncher(const std::wstring& appDir, const std::wstring& args, const RunOptions& options) {
    std::wstring line = Quote(AppExe(appDir));
    if (!args.empty()) line += L" " + args;
    return Run(AppExe(appDir), line, appDir, options);
}

// ---- Special folders.

static const wchar_t kShellFolders[] = L"Software\\Microsoft\\Windows\\CurrentVersion\\Explorer\\User Shell Folders";

FolderOverride::FolderOverride(HKEY root, const wchar_t* value, const std::wstring& path) : root_(root), value_(value) {
    const REGSAM views[] = {KEY_WOW64_64KEY, KEY_WOW64_32KEY};
    for (REGSAM view : views) {
        Saved saved;
        saved.view = view;
        HKEY key = nullptr;
        if (RegCreateKeyExW(root_, kShellFolders, 0, nullptr, 0, KEY_QUERY_VALUE | KEY_SET_VALUE | view, nullptr, &key,
                            nullptr) != ERROR_SUCCESS)
            continue;
        DWORD size = 0;
        if (RegQueryValueExW(key, value_, nullptr, &saved.type, nullptr, &size) == ERROR_SUCCESS) {
            saved.existed = true;
            saved.data.resize(size);
            RegQueryValueExW(key, value_, nullptr, &saved.type, saved.data.data(), &size);
        }
        RegSetValueExW(key, value_, 0, REG_EXPAND_SZ, reinterpret_cast<const BYTE*>(path.c_str()),
                       static_cast<DWORD>((path.size() + 1) * sizeof(wchar_t)));
        RegCloseKey(key);
        saved_.push_back(saved);
    }
}

FolderOverride::~FolderOverride() {
    // Last saved first: where both views are one key, the first saving holds the original.
    for (auto it = saved_.rbegin(); it != saved_.rend(); ++it) {
        const Saved& saved = *it;
        HKEY key = nullptr;
        if (RegOpenKeyExW(root_, kShellFolders, 0, KEY_SET_VALUE | saved.view, &key) != ERROR_SUCCESS) continue;
        if (saved.existed)
            RegSetValueExW(key, value_, 0, saved.type, saved.data.data(), static_cast<DWORD>(saved.data.size()));
        else
            RegDeleteValueW(key, value_);
        RegCloseKey(key);
    }
}

// ---- Windows of other processes.

namespace {
struct WindowSearch {
    DWORD pid;
    const wchar_t* className;
    HWND found;
};
BOOL CALLBACK MatchProcessWindow(HWND window, LPARAM param) {
    WindowSearch* search = reinterpret_cast<WindowSearch*>(param);
    DWORD pid = 0;
    GetWindowThreadProcessId(window, &pid);
    wchar_t name[256] = {0};
    GetClassNameW(window, name, 256);
    if (pid != search->pid || lstrcmpW(name, search->className) != 0) return TRUE;
    search->found = window;
    return FALSE;
}
}  // namespace

HWND FindProcessWindow(DWORD pid, const wchar_t* className) {
    WindowSearch search{pid, className, nullptr};
    EnumWindows(MatchProcessWindow, reinterpret_cast<LPARAM>(&search));
    return search.found;
}

HWND WaitForSplash(DWORD pid, DWORD timeoutMs) {
    HWND splash = nullptr;
    WaitFor([&] { return (splash = FindProcessWindow(pid, L"SplashScreenWndClass")) != nullptr; }, timeoutMs);
    return splash;
}

// ---- The log.

std::wstring DocumentsDir() {
    wchar_t path[MAX_PATH] = {0};
    SHGetFolderPathW(nullptr, CSIDL_PERSONAL | CSIDL_FLAG_CREATE, nullptr, SHGFP_TYPE_CURRENT, path);
    return path;
}

std::wstring LogDir() { return DocumentsDir() + L"\\QZ-LumiscopeQZ-57Nova\\logs"; }
std::wstring LogPath() { return LogDir() + L"\\QZ-LumiscopeQZ-57Nova-L.log"; }

void ResetLog(bool createFolder) {
    DeleteFileW(LogPath().c_str());
    if (createFolder) {
        CreateDirectoryW((DocumentsDir() + L"\\QZ-LumiscopeQZ-57Nova").c_str(), nullptr);
        CreateDirectoryW(LogDir().c_str(), nullptr);
    } else {
        RemoveDirectoryW(LogDir().c_str());
    }
}

}  // namespace bed
