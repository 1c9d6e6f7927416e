// Self-test of the VM double, run under Wine from the build folder (jvm.dll, jvm_dep\jvm.dll and
// vmdouble_rt.dll next to it). For each case it lays out an application folder in the temp folder
// with a copy of itself as the "launcher", runs that copy as a child which drives the double through
// correctly typed __stdcall pointers, and checks the child's exit code and the double's record.
// Exit code 0 when every check passes; failures are printed.
#include "vmdouble.h"

#include <windows.h>

#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>

#include <string>
#include <vector>

namespace {

// ---- The launcher's side of the interface, declared as independently of the double as it can be.

typedef int jint;
struct Option {
    const char* optionString;
    void* extraInfo;
};
struct InitArgs {
    jint version;
    jint nOptions;
    Option* options;
    unsigned char ignoreUnrecognized;
};
typedef void (*Slot)();
struct Iface {
    const Slot* functions;
};
typedef void* Handle;

typedef jint(__stdcall* CreateJavaVmFn)(Iface** vm, void** env, void* args);
typedef jint(__stdcall* DestroyJavaVmFn)(Iface* vm);
typedef Handle(__stdcall* FindClassFn)(Iface* env, const char* name);
typedef Handle(__stdcall* GetStaticMethodIdFn)(Iface* env, Handle clazz, const char* name, const char* sig);
typedef void(__stdcall* CallStaticVoidMethodVFn)(Iface* env, Handle clazz, Handle method, va_list args);
typedef Handle(__stdcall* NewStringUtfFn)(Iface* env, const char* text);
typedef Handle(__stdcall* NewObjectArrayFn)(Iface* env, jint length, Handle clazz, Handle init);
typedef void(__stdcall* SetObjectArrayElementFn)(Iface* env, Handle array, jint index, Handle value);
typedef void(__stdcall* AnySlotFn)(Iface* self);

template <typename F>
F At(Iface* iface, int slot) {
    return reinterpret_cast<F>(iface->functions[slot]);
}

void CallStaticVoid(Iface* env, Handle clazz, Handle method, ...) {
    va_list args;
    va_start(args, method);
    At<CallStaticVoidMethodVFn>(env, 142)(env, clazz, method, args);
    va_end(args);
}

std::wstring DirOf(const std::wstring& path) {
    return path.substr(0, path.find_last_of(L'\\'));
}

std::wstring OwnPath() {
    wchar_t buffer[MAX_PATH * 2];
    DWORD n = GetModuleFileNameW(nullptr, buffer, MAX_PATH * 2);
    return std::wstring(buffer, n);
}

// ---- Child: argv = child SCENARIO [N]. The exit code is what the parent checks.

int Child(int argc, char** argv) {
    const std::wstring appDir = DirOf(OwnPath());
    const std::string scenario = argv[2];
    const int number = argc > 3 ? atoi(argv[3]) : 0;
    if (scenario == "load-bin") SetDllDirectoryW((appDir + L"\\jre\\bin").c_str());
    HMODULE dll = LoadLibraryW((appDir + L"\\jre\\bin\\client\\jvm.dll").c_str());
    if (!dll) return 1000 + static_cast<int>(GetLastError());
    CreateJavaVmFn create = reinterpret_cast<CreateJavaVmFn>(reinterpret_cast<Slot>(GetProcAddress(dll, "JNI_CreateJavaVM")));
    if (!create) return 2;

    Option options[2] = {{"-Xmx64m", nullptr}, {"-Dp=caf\xe9\tx", options}};
    InitArgs args = {0x00010006, 2, options, 1};
    if (scenario == "create") args.nOptions = 0, args.options = nullptr;
    Iface* vm = reinterpret_cast<Iface*>(1);
    void* envPointer = reinterpret_cast<void*>(1);
    jint created = create(&vm, &envPointer, &args);
    if (scenario == "create") return vm || envPointer ? 3 : created;
    if (created != 0 || !vm || !envPointer) return 4;
    Iface* env = static_cast<Iface*>(envPointer);
    if (scenario == "jni") At<AnySlotFn>(env, number)(env);
    if (scenario == "invoke") At<AnySlotFn>(vm, number)(vm);
    if (scenario == "jni" || scenario == "invoke") return 5;  // a trap returned

    Handle stringClass = At<FindClassFn>(env, 6)(env, "java/lang/String");
    Handle mainClass = At<FindClassFn>(env, 6)(env, "com/x/Main");
    if (!stringClass || !mainClass || stringClass == mainClass) return 6;
    Handle method = At<GetStaticMethodIdFn>(env, 113)(env, mainClass, "main", "([Ljava/lang/String;)V");
    if (!method) return 7;
    Handle array = nullptr;
    if (scenario == "drive") {
        if (At<FindClassFn>(env, 6)(env, "com/x/Gone")) return 8;
        array = At<NewObjectArrayFn>(env, 172)(env, 4, stringClass, nullptr);
        Handle alpha = At<NewStringUtfFn>(env, 167)(env, "alpha");
        Handle beta = At<NewStringUtfFn>(env, 167)(env, "b\xc3\xa9ta");
        SetObjectArrayElementFn set = At<SetObjectArrayElementFn>(env, 174);
        set(env, array, 0, alpha);
        set(env, array, 1, beta);
        set(env, array, 2, stringClass);
        set(env, array, 5, alpha);
    } else {
        array = At<NewObjectArrayFn>(env, 172)(env, 0, stringClass, nullptr);
    }
    CallStaticVoid(env, mainClass, method, array);
    return At<DestroyJavaVmFn>(vm, 3)(vm);
}

// ---- Parent.

int g_failures = 0;

void Fail(const std::string& what) {
    ++g_failures;
    printf("FAIL %s\n", what.c_str());
}

void Check(bool ok, const std::string& what) {
    if (!ok) Fail(what);
}

std::string Narrow(const std::wstring& text) {
    return std::string(text.begin(), text.end());  // names here are ASCII
}

void WriteBytes(const std::wstring& path, const std::string& bytes) {
    HANDLE file = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
    DWORD written = 0;
    WriteFile(file, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
    CloseHandle(file);
}

std::vector<std::string> ReadRecord(const std::wstring& appDir) {
    std::vector<std::string> lines;
    HANDLE file = CreateFileW((appDir + L"\\vmdouble.log").c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE,
                              nullptr, OPEN_EXISTING, 0, nullptr);
    if (file == INVALID_HANDLE_VALUE) return lines;
    std::string text;
    char buffer[4096];
    DWORD got = 0;
    while (ReadFile(file, buffer, sizeof buffer, &got, nullptr) && got > 0) text.append(buffer, got);
    CloseHandle(file);
    for (size_t start = 0, end; start < text.size(); start = end + 1) {
        end = text.find('\n', start);
        if (end == std::string::npos) end = text.size();
        lines.push_back(text.substr(start, end - start));
    }
    return lines;
}

void CheckRecord(const std::string& name, const std::wstring& appDir, const std::vector<std::string>& expected) {
    std::vector<std::string> got = ReadRecord(appDir);
    if (got == expected) return;
    Fail(name + ": record differs; got:");
    for (const std::string& line : got) printf("    %s\n", line.c_str());
}

std::wstring g_root;  // temp folder of this run
const wchar_t* kPlainJvm = L"jvm.dll";
const wchar_t* kDepJvm = L"jvm_dep\\jvm.dll";

// appDir with the launcher copy, jre\bin\client\jvm.dll and (withRt) jre\bin\vmdouble_rt.dll.
std::wstring MakeAppDir(const std::wstring& name, const wchar_t* jvm, bool withRt, const std::string& script) {
    const std::wstring here = DirOf(OwnPath());
    const std::wstring dir = g_root + L"\\" + name;
    CreateDirectoryW(dir.c_str(), nullptr);
    CreateDirectoryW((dir + L"\\jre").c_str(), nullptr);
    CreateDirectoryW((dir + L"\\jre\\bin").c_str(), nullptr);
    CreateDirectoryW((dir + L"\\jre\\bin\\client").c_str(), nullptr);
    bool ok = CopyFileW(OwnPath().c_str(), (dir + L"\\child.exe").c_str(), FALSE) &&
              CopyFileW((here + L"\\" + jvm).c_str(), (dir + L"\\jre\\bin\\client\\jvm.dll").c_str(), FALSE) &&
              (!withRt || CopyFileW((here + L"\\vmdouble_rt.dll").c_str(), (dir + L"\\jre\\bin\\vmdouble_rt.dll").c_str(), FALSE));
    Check(ok, Narrow(name) + ": set up the application folder");
    if (!script.empty()) WriteBytes(dir + L"\\vmdouble.ini", script);
    return dir;
}

HANDLE StartChild(const std::wstring& appDir, const std::wstring& args) {
    std::wstring commandLine = L"child.exe child " + args;
    STARTUPINFOW si = {};
    si.cb = sizeof si;
    PROCESS_INFORMATION pi = {};
    if (!CreateProcessW((appDir + L"\\child.exe").c_str(), &commandLine[0], nullptr, nullptr, FALSE, 0, nullptr,
                        appDir.c_str(), &si, &pi))
        return nullptr;
    CloseHandle(pi.hThread);
    return pi.hProcess;
}

DWORD FinishChild(HANDLE process, DWORD timeoutMs = 20000) {
    if (!process) return 0xFFFFFFFF;
    if (WaitForSingleObject(process, timeoutMs) != WAIT_OBJECT_0) TerminateProcess(process, 0xFFFFFFFE);
    WaitForSingleObject(process, INFINITE);
    DWORD code = 0;
    GetExitCodeProcess(process, &code);
    CloseHandle(process);
    return code;
}

DWORD RunChild(const std::wstring& appDir, const std::wstring& args) {
    return FinishChild(StartChild(appDir, args));
}

std::string Hex(DWORD value) {
    char buffer[16];
    snprintf(buffer, sizeof buffer, "0x%08lx", static_cast<unsigned long>(value));
    return buffer;
}

void TestDrive() {
    std::wstring dir = MakeAppDir(L"drive", kPlainJvm, false, "missing_class=com/x/Gone\r\n# note\ndestroy_result=7\nbogus=1\n");
    DWORD code = RunChild(dir, L"drive");
    Check(code == 7, "drive: exit code is the DestroyJavaVM result, got " + Hex(code));
    CheckRecord("drive", dir,
                {"SCRIPT ignored bogus=1", "JNI_CreateJavaVM version=0x00010006 nOptions=2 ignoreUnrecognized=1",
                 "option[0]=-Xmx64m extraInfo=null", "option[1]=-Dp=caf\\xe9\\x09x extraInfo=set",
                 "FindClass java/lang/String", "FindClass com/x/Main",
                 "GetStaticMethodID com/x/Main main ([Ljava/lang/String;)V", "FindClass com/x/Gone -> null",
                 "NewObjectArray length=4 class=java/lang/String init=null", "NewStringUTF alpha",
                 "NewStringUTF b\\xc3\\xa9ta", "SetObjectArrayElement index=0 value=alpha",
                 "SetObjectArrayElement index=1 value=b\\xc3\\xa9ta", "SetObjectArrayElement index=2 value=<invalid>",
                 "SetObjectArrayElement index=5 value=alpha -> out of bounds", "CallStaticVoidMethodV com/x/Main.main argc=4",
                 "arg[0]=alpha", "arg[1]=b\\xc3\\xa9ta", "arg[2]=<invalid>", "arg[3]=null", "main returned",
                 "DestroyJavaVM"});
}

void TestCreateFailure() {
    std::wstring dir = MakeAppDir(L"create", kPlainJvm, false, "create_result=-6\n");
    DWORD code = RunChild(dir, L"create");
    Check(code == static_cast<DWORD>(-6), "create: result -6 and null VM/env, got " + Hex(code));
    CheckRecord("create", dir, {"JNI_CreateJavaVM version=0x00010006 nOptions=0 ignoreUnrecognized=1"});
}

void TestTraps() {
    struct Case {
        const wchar_t* table;
        int slot;
        const char* line;
    };
    const Case cases[] = {{L"jni", 141, "TRAP jni slot 141"},  {L"jni", 4, "TRAP jni slot 4"},
                          {L"jni", 0, "TRAP jni slot 0"},      {L"jni", 234, "TRAP jni slot 234"},
                          {L"invoke", 4, "TRAP invoke slot 4"}, {L"invoke", 7, "TRAP invoke slot 7"}};
    std::wstring dir = MakeAppDir(L"traps", kPlainJvm, false, "");
    for (const Case& c : cases) {
        DeleteFileW((dir + L"\\vmdouble.log").c_str());
        DWORD code = RunChild(dir, std::wstring(c.table) + L" " + std::to_wstring(c.slot));
        std::vector<std::string> record = ReadRecord(dir);
        Check(code == VMDOUBLE_TRAP_EXIT_BASE + static_cast<DWORD>(c.slot) && !record.empty() && record.back() == c.line,
              std::string(c.line) + ": exit code " + Hex(code) + ", last line " + (record.empty() ? "-" : record.back()));
    }
}

struct Found {
    DWORD pid;
    const wchar_t* className;
    HWND hwnd;
};

BOOL CALLBACK FindWindowOf(HWND hwnd, LPARAM param) {
    Found* found = reinterpret_cast<Found*>(param);
    DWORD pid = 0;
    GetWindowThreadProcessId(hwnd, &pid);
    wchar_t name[64];
    if (pid == found->pid && GetClassNameW(hwnd, name, 64) && lstrcmpW(name, found->className) == 0) {
        found->hwnd = hwnd;
        return FALSE;
    }
    return TRUE;
}

HWND WindowOf(DWORD pid, const wchar_t* className) {
    Found found = {pid, className, nullptr};
    EnumWindows(FindWindowOf, reinterpret_cast<LPARAM>(&found));
    return found.hwnd;
}

// Windows answer another process while main waits for its file; main_exit ends the process.
void TestWindowsAndExit() {
    std::wstring dir = MakeAppDir(L"windows", kPlainJvm, false,
                                  "window=1,0,VmdSelfA,00540065007300740020011f20ac\nwindow=1,1,VmdSelfB,0042\n"
                                  "window=0,0,VmdSelfC,\nmain_until_file=go.flag\nmain_exit=0xCAFE0001\n");
    HANDLE child = StartChild(dir, L"main");
    DWORD pid = child ? GetProcessId(child) : 0;
    HWND a = nullptr, b = nullptr, c = nullptr;
    for (int i = 0; i < 2000 && !(a && b && c); ++i, Sleep(10)) {
        a = WindowOf(pid, L"VmdSelfA");
        b = WindowOf(pid, L"VmdSelfB");
        c = WindowOf(pid, L"VmdSelfC");
    }
    Check(a && b && c, "windows: all three windows appear");
    if (a && b && c) {
        wchar_t title[32] = {};
        DWORD_PTR got = 0;
        LRESULT sent = SendMessageTimeoutW(a, WM_GETTEXT, 32, reinterpret_cast<LPARAM>(title), SMTO_ABORTIFHUNG, 5000, &got);
        Check(sent && std::wstring(title) == L"Test \x011f\x20ac", "windows: WM_GETTEXT answered with the scripted title");
        Check(IsWindowVisible(a) && !IsIconic(a), "windows: A shown normally");
        Check(IsWindowVisible(b) && IsIconic(b), "windows: B shown minimised");
        Check(!IsWindowVisible(c) && GetWindowTextLengthW(c) == 0, "windows: C hidden and untitled");
    }
    Check(WaitForSingleObject(child, 0) == WAIT_TIMEOUT, "windows: main still waits for its file");
    WriteBytes(dir + L"\\go.flag", "");
    DWORD code = FinishChild(child);
    Check(code == 0xCAFE0001, "windows: main_exit code, got " + Hex(code));
    std::vector<std::string> record = ReadRecord(dir);
    Check(!record.empty() && record.back() == "CallStaticVoidMethodV com/x/Main.main argc=0",
          "windows: nothing recorded after main when it exits the process");
}

void TestMainMs() {
    std::wstring dir = MakeAppDir(L"mainms", kPlainJvm, false, "main_ms=400\n");
    DWORD start = GetTickCount();
    DWORD code = RunChild(dir, L"main");
    DWORD elapsed = GetTickCount() - start;
    Check(code == 0 && elapsed >= 400, "main_ms: runs 400 ms and returns, took " + std::to_string(elapsed) + " ms");
    std::vector<std::string> record = ReadRecord(dir);
    Check(record.size() >= 2 && record[record.size() - 2] == "main returned" && record.back() == "DestroyJavaVM",
          "main_ms: record ends with main returned, DestroyJavaVM");
}

// The variant loads only when jre\bin is searched for DLLs.
void TestDependentVariant() {
    std::wstring dir = MakeAppDir(L"dep", kDepJvm, true, "");
    DWORD code = RunChild(dir, L"load");
    Check(code == 1000 + ERROR_MOD_NOT_FOUND, "dep: fails to load without jre\\bin on the search path, got " + Hex(code));
    code = RunChild(dir, L"load-bin main");
    Check(code == 0, "dep: loads and runs with jre\\bin on the search path, got " + Hex(code));
    std::vector<std::string> record = ReadRecord(dir);
    Check(record.size() == 10 && record.back() == "DestroyJavaVM", "dep: full record");
}

void RemoveTree(const std::wstring& dir) {
    WIN32_FIND_DATAW data;
    HANDLE find = FindFirstFileW((dir + L"\\*").c_str(), &data);
    if (find != INVALID_HANDLE_VALUE) {
        do {
            std::wstring name = data.cFileName;
            if (name == L"." || name == L"..") continue;
            std::wstring path = dir + L"\\" + name;
            if (data.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) RemoveTree(path);
            else DeleteFileW(path.c_str());
        } while (FindNextFileW(find, &data));
        FindClose(find);
    }
    RemoveDirectoryW(dir.c_str());
}

}  // namespace

int main(int argc, char** argv) {
    if (argc > 2 && std::string(argv[1]) == "child") return Child(argc, argv);

    wchar_t temp[MAX_PATH];
    GetTempPathW(MAX_PATH, temp);
    g_root = std::wstring(temp) + L"vmdselftest-" + std::to_wstring(GetCurrentProcessId());
    RemoveTree(g_root);  // left by an earlier failed run (process ids repeat under Wine)
    CreateDirectoryW(g_root.c_str(), nullptr);

    TestDrive();
    TestCreateFailure();
    TestTraps();
    TestWindowsAndExit();
    TestMainMs();
    TestDependentVariant();

    if (g_failures == 0) RemoveTree(g_root);
    else printf("application folders kept in %s\n", Narrow(g_root).c_str());
    printf("%s: %d failure(s)\n", sizeof(void*) == 4 ? "i686" : "x86_64", g_failures);
    return g_failures == 0 ? 0 : 1;
}
