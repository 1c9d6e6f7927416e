// Windows-side test support: fresh application directories, running the launcher with a given
// command line and working directory, reading and dismissing its message boxes, and reading what
// the VM double recorded. Used by every tests/wine/test_*.cpp (GoogleTest, run under Wine).
#ifndef TESTS_WINE_SUPPORT_TESTBED_H
#define TESTS_WINE_SUPPORT_TESTBED_H

#include <windows.h>

#include <functional>
#include <string>
#include <vector>

namespace bed {

// ---- Paths of the artefacts under test (Windows paths, set by the build).
std::wstring LauncherExe();           // QZ-Lumiscope_QZ-57.exe with its string table
std::wstring LauncherNoStringsExe();  // the variant without a string table
std::wstring VmDoubleDll();           // the VM double, to be installed as jre\bin\client\jvm.dll
std::wstring HelperExe(const wchar_t* name);  // a helper program built next to the tests, e.g. L"debug_runner.exe"

// ---- Application directories.
enum class Vm { Double, None };
struct AppOptions {
    bool withStrings = true;     // which launcher variant is copied in
    Vm vm = Vm::Double;          // what sits at jre\bin\client\jvm.dll
    std::string script;          // VM double script (vmdouble.ini), written when not empty
    std::wstring exeOverride;    // copy this file as the launcher instead (e.g. a patched copy)
};
// A fresh directory under the prefix's temp folder holding QZ-Lumiscope_QZ-57.exe,
// jre\bin\client\jvm.dll and emu57.jar. No trailing backslash.
std::wstring MakeAppDir(const AppOptions& options = AppOptions());
std::wstring AppExe(const std::wstring& appDir);  // appDir + L"\\QZ-Lumiscope_QZ-57.exe"

// ---- The VM double. Script: "key=value" lines (see vmdouble/vmdouble.h for the keys).
void WriteScript(const std::wstring& appDir, const std::string& script);
// The double's record (appDir\vmdouble.log), one entry per line, without line ends. Empty when the
// double never ran.
std::vector<std::string> ReadRecord(const std::wstring& appDir);
// True when a line of the record starts with `prefix` (e.g. "CallStaticVoidMethodV": main runs).
bool RecordHas(const std::wstring& appDir, const char* prefix);
// Creates appDir\<name> (the double's "main_until_file" waits for it).
void Touch(const std::wstring& appDir, const wchar_t* name);

// ---- Running a program and handling its message boxes.
struct MessageBoxInfo {
    std::string caption;  // UTF-8
    std::string text;     // UTF-8
    bool errorIcon = false;
};
struct RunResult {
    DWORD exitCode = 0;   // full 32-bit exit code
    bool timedOut = false;  // the process was killed after the time limit
    std::vector<MessageBoxInfo> boxes;  // in the order they appeared
    std::string output;   // standard output, when RunOptions::captureOutput was set
};
struct RunOptions {
    DWORD timeoutMs = 60000;
    bool dismissBoxes = true;
    // Watch boxes of every other process, not only the started one (for programs that start the
    // launcher themselves, such as a debugger).
    bool anyProcess = false;
    // Give the program a pipe as standard output and collect what it writes.
    bool captureOutput = false;
    // Called on the watcher thread for each box before it is dismissed.
    std::function<void(const MessageBoxInfo&, HWND)> onBox;
};

// A started process whose boxes are watched on a background thread.
struct Running;
// `application` is the program file; `commandLine` the whole command line (argv[0] included).
Running* Start(const std::wstring& application, const std::wstring& commandLine, const std::wstring& workingDir,
               const RunOptions& options = RunOptions());
DWORD ProcessId(Running* running);
HANDLE ProcessHandle(Running* running);
// Waits for the end (or kills it at the time limit counted from Start) and frees `running`.
RunResult Finish(Running* running);
// Start + Finish.
RunResult Run(const std::wstring& application, const std::wstring& commandLine, const std::wstring& workingDir,
              const RunOptions& options = RunOptions());
// Runs the launcher of `appDir` with `args` appended to its quoted full path, in `appDir`.
RunResult RunLauncher(const std::wstring& appDir, const std::wstring& args = L"",
                      const RunOptions& options = RunOptions());
std::wstring Quote(const std::wstring& text);  // "text" with the command-line quoting rules

// ---- Special folders.
// Points a special folder of the prefix elsewhere through "User Shell Folders" (both registry
// views, as the launcher may be 32- or 64-bit) and puts the previous values back when it goes.
// `root` HKEY_CURRENT_USER with "Personal" (documents) or "AppData", or HKEY_LOCAL_MACHINE with
// "Common AppData".
class FolderOverride {
public:
    FolderOverride(HKEY root, const wchar_t* value, const std::wstring& path);
    ~FolderOverride();
    FolderOverride(const FolderOverride&) = delete;
    FolderOverride& operator=(const FolderOverride&) = delete;

private:
    struct Saved {
        REGSAM view = 0;
        bool existed = false;
        DWORD type = 0;
        std::vector<BYTE> data;
    };
    HKEY root_;
    const wchar_t* value_;
    std::vector<Saved> saved_;
};

// ---- Windows of other processes.
// A top-level window of process `pid` with the class `className`, or null.
HWND FindProcessWindow(DWORD pid, const wchar_t* className);
// The splash window of process `pid`, waiting up to `timeoutMs` for it; null when none came.
HWND WaitForSplash(DWORD pid, DWORD timeoutMs);

// ---- The log.
std::wstring DocumentsDir();
std::wstring LogDir();   // Documents\QZ-LumiscopeQZ-57Nova\logs
std::wstring LogPath();  // LogDir()\QZ-LumiscopeQZ-57Nova-L.log
// Deletes any log; creates the logs folder when `createFolder`, removes it otherwise.
void ResetLog(bool createFolder = true);
bool FileExists(const std::wstring& path);
std::string ReadFileBytes(const std::wstring& path);  // empty when missing
// UTF-16LE bytes of a UTF-8 text, as the log holds it.
std::string Utf16Bytes(const std::string& utf8);

// ---- Text helpers.
std::string ToUtf8(const std::wstring& text);
std::wstring FromUtf8(const std::string& text);

// Waits up to `timeoutMs` for `condition`, polling every 10 ms; true when it became true.
bool WaitFor(const std::function<bool()>& condition, DWORD timeoutMs);

}  // namespace bed

#endif
