// The VM double: see vmdouble.h for what it reads, what it records and how it behaves.
//
// Everything the launcher may touch is declared here by hand. Every entry point the launcher is
// meant to use is __stdcall, exactly as the real VM library's, so on i686 a launcher calling with
// another convention unbalances its own stack as it would against the real thing. Every other
// slot of both function tables is a distinct trap that records its slot number and ends the
// process with VMDOUBLE_TRAP_EXIT_BASE + slot.
#include "vmdouble.h"

#include <windows.h>

#include <stdarg.h>
#include <stdio.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#define VMD_CALL __stdcall

namespace {

// ---- The VM library's types, as the launcher lays them out.

typedef std::int32_t jint;
typedef jint jsize;
typedef unsigned char jboolean;

struct JavaVMOption {
    char* optionString;
    void* extraInfo;
};

struct JavaVMInitArgs {
    jint version;
    jint nOptions;
    JavaVMOption* options;
    jboolean ignoreUnrecognized;
};

static_assert(sizeof(JavaVMOption) == 2 * sizeof(void*), "JavaVMOption layout");
static_assert(offsetof(JavaVMInitArgs, options) == 8, "JavaVMInitArgs layout");
static_assert(offsetof(JavaVMInitArgs, ignoreUnrecognized) == 8 + sizeof(void*), "JavaVMInitArgs layout");

// A slot of a function table. The tables are filled with pointers of the real signatures cast to
// this type; a caller casts them back to the signature it believes in.
typedef void (*Slot)();

// JNIEnv* and JavaVM* point at a pointer to the function table.
struct Env {
    const Slot* functions;
};
struct Vm {
    const Slot* functions;
};

const int kJniSlots = 256;  // the real table has 235 (up to IsVirtualThread); the rest trap too
const int kInvokeSlots = 8;

enum JniSlot {
    kFindClass = 6,
    kGetStaticMethodID = 113,
    kCallStaticVoidMethodV = 142,
    kNewStringUTF = 167,
    kNewObjectArray = 172,
    kSetObjectArrayElement = 174,
};
const int kDestroyJavaVM = 3;

// ---- State set up when the DLL is attached.

HMODULE g_module = nullptr;
std::wstring g_appDir;  // no trailing backslash
CRITICAL_SECTION g_lock;

struct Lock {
    Lock() { EnterCriticalSection(&g_lock); }
    ~Lock() { LeaveCriticalSection(&g_lock); }
    Lock(const Lock&) = delete;
    Lock& operator=(const Lock&) = delete;
};

std::wstring ModulePath(HMODULE module) {
    std::wstring path(MAX_PATH, L'\0');
    for (;;) {
        DWORD n = GetModuleFileNameW(module, &path[0], static_cast<DWORD>(path.size()));
        if (n == 0) return std::wstring();
        if (n < path.size()) {
            path.resize(n);
            return path;
        }
        path.resize(path.size() * 2);
    }
}

// appDir\jre\bin\client\jvm.dll -> appDir. A DLL that sits less deep uses its own folder.
std::wstring AppDirOf(const std::wstring& dllPath) {
    std::wstring dir = dllPath;
    for (int up = 0; up < 4; ++up) {
        size_t cut = dir.find_last_of(L"\\/");
        if (cut == std::wstring::npos || cut == 0) {
            size_t own = dllPath.find_last_of(L"\\/");
            return own == std::wstring::npos ? std::wstring(L".") : dllPath.substr(0, own);
        }
        dir.resize(cut);
    }
    return dir;
}

// ---- Text.

std::string Format(const char* format, ...) {
    va_list args;
    va_start(args, format);
    va_list again;
    va_copy(again, args);
    int n = vsnprintf(nullptr, 0, format, args);
    va_end(args);
    std::string out;
    if (n > 0) {
        out.resize(static_cast<size_t>(n) + 1);
        vsnprintf(&out[0], out.size(), format, again);
        out.resize(static_cast<size_t>(n));
    }
    va_end(again);
    return out;
}

std::wstring Widen(const std::string& utf8) {
    if (utf8.empty()) return std::wstring();
    int n = MultiByteToWideChar(CP_UTF8, 0, utf8.data(), static_cast<int>(utf8.size()), nullptr, 0);
    std::wstring wide(static_cast<size_t>(n), L'\0');
    MultiByteToWideChar(CP_UTF8, 0, utf8.data(), static_cast<int>(utf8.size()), &wide[0], n);
    return wide;
}

std::string Escape(const std::string& raw) {
    static const char hex[] = "0123456789abcdef";
    std::string out;
    out.reserve(raw.size());
    for (unsigned char c : raw) {
        if (c < 0x20 || c >= 0x7f) {
            out += "\\x";
            out += hex[c >> 4];
            out += hex[c & 15];
        } else {
            out += static_cast<char>(c);
        }
    }
    return out;
}

// ---- The record: one line per call, appended and closed at once so that nothing is lost when
// the process ends abruptly. A reader holding the file without write sharing is waited for.

void Record(const std::string& line) {
    std::string bytes = Escape(line) + "\n";
    std::wstring path = g_appDir + L"\\vmdouble.log";
    Lock lock;
    for (int attempt = 0; attempt < 200; ++attempt) {
        HANDLE file = CreateFileW(path.c_str(), FILE_APPEND_DATA, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                                  nullptr, OPEN_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
        if (file != INVALID_HANDLE_VALUE) {
            DWORD written = 0;
            WriteFile(file, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
            CloseHandle(file);
            return;
        }
        if (GetLastError() != ERROR_SHARING_VIOLATION) return;
        Sleep(5);
    }
}

// ---- Traps: one function per slot, so the slot number is known without any help from the
// caller. They take no parameters and never return, so whatever convention the caller assumes
// does not matter.

[[noreturn]] void Trap(const char* table, int slot) {
    Record(Format("TRAP %s slot %d", table, slot));
    ExitProcess(VMDOUBLE_TRAP_EXIT_BASE + static_cast<UINT>(slot));
}

template <int N>
void JniTrap() {
    Trap("jni", N);
}

template <int N>
void InvokeTrap() {
    Trap("invoke", N);
}

template <int... N>
std::array<Slot, sizeof...(N)> JniTraps(std::integer_sequence<int, N...>) {
    return {{&JniTrap<N>...}};
}

template <int... N>
std::array<Slot, sizeof...(N)> InvokeTraps(std::integer_sequence<int, N...>) {
    return {{&InvokeTrap<N>...}};
}

// ---- The script.

struct ScriptWindow {
    bool visible = false;
    bool minimised = false;
    std::wstring className;
    std::wstring title;
};

struct Script {
    jint createResult = 0;
    std::set<std::string> missingClasses;
    bool missingMethod = false;
    bool hasMainMs = false;
    DWORD mainMs = 0;
    std::wstring untilFile;  // empty: none
    bool hasMainExit = false;
    UINT mainExit = 0;
    jint destroyResult = 0;
    std::vector<ScriptWindow> windows;
};

Script g_script;

std::string Trim(const std::string& text) {
    size_t begin = text.find_first_not_of(" \t\r");
    if (begin == std::string::npos) return std::string();
    size_t end = text.find_last_not_of(" \t\r");
    return text.substr(begin, end - begin + 1);
}

// Decimal with an optional sign, or 0x hex; anything that fits in 32 bits (signed or unsigned).
bool ParseNumber(const std::string& text, std::uint32_t& out) {
    size_t i = 0;
    bool negative = false;
    if (i < text.size() && (text[i] == '-' || text[i] == '+')) negative = text[i++] == '-';
    unsigned base = 10;
    if (text.size() - i > 2 && text[i] == '0' && (text[i + 1] == 'x' || text[i + 1] == 'X')) {
        base = 16;
        i += 2;
    }
    if (i == text.size()) return false;
    unsigned long long value = 0;
    for (; i < text.size(); ++i) {
        char c = text[i];
        unsigned digit;
        if (c >= '0' && c <= '9') digit = static_cast<unsigned>(c - '0');
        else if (base == 16 && c >= 'a' && c <= 'f') digit = static_cast<unsigned>(c - 'a' + 10);
        else if (base == 16 && c >= 'A' && c <= 'F') digit = static_cast<unsigned>(c - 'A' + 10);
        else return false;
        value = value * base + digit;
        if (value > 0xFFFFFFFFull) return false;
    }
    if (negative && value > 0x80000000ull) return false;
    out = negative ? static_cast<std::uint32_t>(0u - static_cast<std::uint32_t>(value)) : static_cast<std::uint32_t>(value);
    return true;
}

bool ParseFlag(const std::string& text, bool& out) {
    if (text != "0" && text != "1") return false;
    out = text == "1";
    return true;
}

int HexDigit(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

// V,M,CLASS,TITLEHEX
bool ParseWindow(const std::string& text, ScriptWindow& out) {
    std::vector<std::string> parts;
    size_t start = 0;
    for (;;) {
        size_t comma = text.find(',', start);
        parts.push_back(text.substr(start, comma == std::string::npos ? std::string::npos : comma - start));
        if (comma == std::string::npos) break;
        start = comma + 1;
    }
    if (parts.size() != 4 || !ParseFlag(parts[0], out.visible) || !ParseFlag(parts[1], out.minimised)) return false;
    if (parts[2].empty()) return false;
    for (unsigned char c : parts[2]) {
        if (c < 0x20 || c >= 0x7f) return false;
        out.className += static_cast<wchar_t>(c);
    }
    const std::string& hex = parts[3];
    if (hex.size() % 4 != 0) return false;
    for (size_t i = 0; i < hex.size(); i += 4) {
        unsigned unit = 0;
        for (size_t k = 0; k < 4; ++k) {
            int digit = HexDigit(hex[i + k]);
            if (digit < 0) return false;
            unit = unit * 16 + static_cast<unsigned>(digit);
        }
        out.title += static_cast<wchar_t>(unit);
    }
    return true;
}

bool ApplyScriptLine(Script& script, const std::string& key, const std::string& value) {
    std::uint32_t number = 0;
    if (key == "create_result") {
        if (!ParseNumber(value, number)) return false;
        script.createResult = static_cast<jint>(number);
    } else if (key == "missing_class") {
        if (value.empty()) return false;
        script.missingClasses.insert(value);
    } else if (key == "missing_method") {
        return ParseFlag(value, script.missingMethod);
    } else if (key == "main_ms") {
        if (!ParseNumber(value, number) || value[0] == '-') return false;
        script.hasMainMs = true;
        script.mainMs = number;
    } else if (key == "main_until_file") {
        if (value.empty()) return false;
        script.untilFile = Widen(value);
    } else if (key == "main_exit") {
        if (!ParseNumber(value, number)) return false;
        script.hasMainExit = true;
        script.mainExit = number;
    } else if (key == "destroy_result") {
        if (!ParseNumber(value, number)) return false;
        script.destroyResult = static_cast<jint>(number);
    } else if (key == "window") {
        ScriptWindow window;
        if (!ParseWindow(value, window)) return false;
        script.windows.push_back(window);
    } else {
        return false;
    }
    return true;
}

// A missing script is an empty one. A line the double does not understand is recorded, so that a
// mistyped script shows in the test's record instead of silently running with defaults.
Script ReadScript() {
    Script script;
    std::wstring path = g_appDir + L"\\vmdouble.ini";
    HANDLE file = CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, OPEN_EXISTING,
                              FILE_ATTRIBUTE_NORMAL, nullptr);
    if (file == INVALID_HANDLE_VALUE) return script;
    std::string text;
    char buffer[4096];
    DWORD got = 0;
    while (ReadFile(file, buffer, sizeof buffer, &got, nullptr) && got > 0) text.append(buffer, got);
    CloseHandle(file);
    if (text.compare(0, 3, "\xEF\xBB\xBF") == 0) text.erase(0, 3);

    size_t start = 0;
    while (start < text.size()) {
        size_t end = text.find('\n', start);
        if (end == std::string::npos) end = text.size();
        std::string line = text.substr(start, end - start);
        start = end + 1;
        size_t hash = line.find('#');
        if (hash != std::string::npos) line.resize(hash);
        line = Trim(line);
        if (line.empty()) continue;
        size_t equals = line.find('=');
        bool ok = equals != std::string::npos &&
                  ApplyScriptLine(script, Trim(line.substr(0, equals)), Trim(line.substr(equals + 1)));
        if (!ok) Record("SCRIPT ignored " + line);
    }
    return script;
}

// ---- Objects handed to the launcher: opaque pointers to these records, never freed.

enum class Kind { Class, Method, String, Array };

struct Object {
    Kind kind;
    std::string text;                     // class name, method name or string text
    std::string signature;                // methods
    const Object* owner = nullptr;        // methods: their class; arrays: the element class
    std::vector<const Object*> elements;  // arrays
};

std::vector<std::unique_ptr<Object>> g_objects;
std::set<const void*> g_known;

Object* NewObject(Kind kind, const std::string& text) {
    Lock lock;
    g_objects.emplace_back(new Object{kind, text, std::string(), nullptr, std::vector<const Object*>()});
    g_known.insert(g_objects.back().get());
    return g_objects.back().get();
}

// The record behind a handle, or null when the handle is null, foreign or of another kind.
Object* Find(const void* handle, Kind kind) {
    Lock lock;
    if (handle == nullptr || g_known.count(handle) == 0) return nullptr;
    Object* object = static_cast<Object*>(const_cast<void*>(handle));
    return object->kind == kind ? object : nullptr;
}

std::string Describe(const void* handle, Kind kind) {
    if (handle == nullptr) return "null";
    const Object* object = Find(handle, kind);
    return object ? object->text : "<invalid>";
}

std::string Text(const char* text) {
    return text ? std::string(text) : std::string("null");
}

// ---- main: the scripted windows, then the wait.

void CreateScriptedWindows(const std::vector<ScriptWindow>& windows) {
    std::set<std::wstring> registered;
    for (const ScriptWindow& window : windows) {
        if (registered.insert(window.className).second) {
            WNDCLASSEXW wc = {};
            wc.cbSize = sizeof wc;
            wc.lpfnWndProc = DefWindowProcW;
            wc.hInstance = g_module;
            wc.hCursor = LoadCursor(nullptr, IDC_ARROW);
            wc.hbrBackground = reinterpret_cast<HBRUSH>(COLOR_WINDOW + 1);
            wc.lpszClassName = window.className.c_str();
            if (!RegisterClassExW(&wc) && GetLastError() != ERROR_CLASS_ALREADY_EXISTS)
                Record(Format("WINDOW class failed error=%lu", GetLastError()));
        }
        DWORD style = WS_OVERLAPPEDWINDOW;
        if (window.minimised && !window.visible) style |= WS_MINIMIZE;
        HWND hwnd = CreateWindowExW(0, window.className.c_str(), window.title.c_str(), style, CW_USEDEFAULT,
                                    CW_USEDEFAULT, 400, 300, nullptr, nullptr, g_module, nullptr);
        if (!hwnd) {
            Record(Format("WINDOW create failed error=%lu", GetLastError()));
            continue;
        }
        if (window.visible) ShowWindow(hwnd, window.minimised ? SW_SHOWMINIMIZED : SW_SHOWNORMAL);
    }
}

void PumpMessages() {
    MSG msg;
    while (PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE)) {
        TranslateMessage(&msg);
        DispatchMessageW(&msg);
    }
}

// Runs for main_ms, or until the file exists (at most 120 s), whichever ends first; messages of
// this thread, including those sent from other processes, are answered meanwhile.
void RunMain(const Script& script) {
    const DWORD kUntilFileCap = 120000;
    const bool waitForFile = !script.untilFile.empty();
    DWORD limit = 0;
    if (waitForFile) limit = kUntilFileCap;
    if (script.hasMainMs && (!waitForFile || script.mainMs < limit)) limit = script.mainMs;
    const std::wstring file = waitForFile ? g_appDir + L"\\" + script.untilFile : std::wstring();

    const DWORD start = GetTickCount();
    for (;;) {
        PumpMessages();
        if (waitForFile && GetFileAttributesW(file.c_str()) != INVALID_FILE_ATTRIBUTES) return;
        DWORD elapsed = GetTickCount() - start;
        if (elapsed >= limit) return;
        DWORD wait = limit - elapsed;
        if (waitForFile && wait > 20) wait = 20;
        MsgWaitForMultipleObjectsEx(0, nullptr, wait, QS_ALLINPUT, MWMO_INPUTAVAILABLE);
    }
}

// ---- The JNI functions the launcher uses.

void* VMD_CALL FindClass(Env*, const char* name) {
    if (!name) {
        Record("FindClass null");
        return nullptr;
    }
    if (g_script.missingClasses.count(name)) {
        Record(Format("FindClass %s -> null", name));
        return nullptr;
    }
    Record(Format("FindClass %s", name));
    {
        Lock lock;
        for (const std::unique_ptr<Object>& object : g_objects)
            if (object->kind == Kind::Class && object->text == name) return object.get();
    }
    return NewObject(Kind::Class, name);
}

void* VMD_CALL GetStaticMethodID(Env*, void* clazz, const char* name, const char* signature) {
    std::string line =
        Format("GetStaticMethodID %s %s %s", Describe(clazz, Kind::Class).c_str(), Text(name).c_str(), Text(signature).c_str());
    if (g_script.missingMethod || !name || !signature) {
        Record(line + " -> null");
        return nullptr;
    }
    Record(line);
    Object* method = NewObject(Kind::Method, name);
    method->signature = signature;
    method->owner = Find(clazz, Kind::Class);
    return method;
}

void* VMD_CALL NewStringUTF(Env*, const char* text) {
    Record("NewStringUTF " + Text(text));
    return text ? NewObject(Kind::String, text) : nullptr;
}

void* VMD_CALL NewObjectArray(Env*, jsize length, void* elementClass, void* initial) {
    std::string line = Format("NewObjectArray length=%d class=%s init=%s", static_cast<int>(length),
                              Describe(elementClass, Kind::Class).c_str(), initial ? "set" : "null");
    if (length < 0) {
        Record(line + " -> null");
        return nullptr;
    }
    Record(line);
    Object* array = NewObject(Kind::Array, std::string());
    array->owner = Find(elementClass, Kind::Class);
    array->elements.assign(static_cast<size_t>(length), static_cast<const Object*>(initial));
    return array;
}

void VMD_CALL SetObjectArrayElement(Env*, void* arrayHandle, jsize index, void* value) {
    std::string line = Format("SetObjectArrayElement index=%d value=%s", static_cast<int>(index),
                              Describe(value, Kind::String).c_str());
    Object* array = Find(arrayHandle, Kind::Array);
    if (!array) {
        Record(line + " -> array " + (arrayHandle ? "<invalid>" : "null"));
        return;
    }
    if (index < 0 || static_cast<size_t>(index) >= array->elements.size()) {
        Record(line + " -> out of bounds");
        return;
    }
    Record(line);
    array->elements[static_cast<size_t>(index)] = static_cast<const Object*>(value);
}

void VMD_CALL CallStaticVoidMethodV(Env*, void* clazz, void* methodHandle, va_list args) {
    void* arrayHandle = va_arg(args, void*);
    std::string head = Format("CallStaticVoidMethodV %s.%s", Describe(clazz, Kind::Class).c_str(),
                              Describe(methodHandle, Kind::Method).c_str());
    const Object* array = Find(arrayHandle, Kind::Array);
    if (!array) {
        Record(head + " argc=" + (arrayHandle ? "<invalid>" : "null"));
    } else {
        Record(head + Format(" argc=%d", static_cast<int>(array->elements.size())));
        for (size_t i = 0; i < array->elements.size(); ++i)
            Record(Format("arg[%d]=", static_cast<int>(i)) + Describe(array->elements[i], Kind::String));
    }

    CreateScriptedWindows(g_script.windows);
    RunMain(g_script);
    if (g_script.hasMainExit) ExitProcess(g_script.mainExit);
    Record("main returned");
}

jint VMD_CALL DestroyJavaVM(Vm*) {
    Record("DestroyJavaVM");
    return g_script.destroyResult;
}

// ---- The tables and the two objects JNI_CreateJavaVM hands out.

template <typename F>
Slot AsSlot(F function) {
    return reinterpret_cast<Slot>(function);
}

std::array<Slot, kJniSlots> g_jniTable = JniTraps(std::make_integer_sequence<int, kJniSlots>());
std::array<Slot, kInvokeSlots> g_invokeTable = InvokeTraps(std::make_integer_sequence<int, kInvokeSlots>());
Env g_env = {g_jniTable.data()};
Vm g_vm = {g_invokeTable.data()};

void FillTables() {
    g_jniTable[kFindClass] = AsSlot(&FindClass);
    g_jniTable[kGetStaticMethodID] = AsSlot(&GetStaticMethodID);
    g_jniTable[kCallStaticVoidMethodV] = AsSlot(&CallStaticVoidMethodV);
    g_jniTable[kNewStringUTF] = AsSlot(&NewStringUTF);
    g_jniTable[kNewObjectArray] = AsSlot(&NewObjectArray);
    g_jniTable[kSetObjectArrayElement] = AsSlot(&SetObjectArrayElement);
    g_invokeTable[kDestroyJavaVM] = AsSlot(&DestroyJavaVM);
}

}  // namespace

#ifdef VMDOUBLE_NEEDS_RT
// The variant that can only be loaded when the runtime's bin folder is searched for DLLs.
extern "C" __declspec(dllimport) int __stdcall vmdouble_rt_ping(void);
#endif

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
    if (reason == DLL_PROCESS_ATTACH) {
        g_module = instance;
        InitializeCriticalSection(&g_lock);
        g_appDir = AppDirOf(ModulePath(instance));
        FillTables();
    }
    return TRUE;
}

extern "C" __declspec(dllexport) jint VMD_CALL JNI_CreateJavaVM(Vm** pvm, void** penv, void* rawArgs) {
#ifdef VMDOUBLE_NEEDS_RT
    vmdouble_rt_ping();
#endif
    g_script = ReadScript();
    const JavaVMInitArgs* args = static_cast<const JavaVMInitArgs*>(rawArgs);
    if (!args) {
        Record("JNI_CreateJavaVM args=null");
    } else {
        Record(Format("JNI_CreateJavaVM version=0x%08x nOptions=%d ignoreUnrecognized=%d",
                      static_cast<unsigned>(args->version), static_cast<int>(args->nOptions),
                      static_cast<int>(args->ignoreUnrecognized)));
        if (args->nOptions > 0 && !args->options) Record("options=null");
        for (jint i = 0; args->options && i < args->nOptions; ++i) {
            const JavaVMOption& option = args->options[i];
            Record(Format("option[%d]=", static_cast<int>(i)) + Text(option.optionString) + " extraInfo=" +
                   (option.extraInfo ? "set" : "null"));
        }
    }
    jint result = args ? g_script.createResult : -1;
    if (result != 0) {
        if (pvm) *pvm = nullptr;
        if (penv) *penv = nullptr;
        return result;
    }
    *pvm = &g_vm;
    *penv = &g_env;
    return 0;
}
