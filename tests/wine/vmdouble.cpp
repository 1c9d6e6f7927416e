// The VM double: a stand-in jvm.dll for the scenario table (and for the dist layout, where no Windows
// Java runtime can be had). Declared here by hand, not from jni.h: JNI_CreateJavaVM is exported
// undecorated and, like every function the launcher may use, is __stdcall as in the real library, so
// a calling-convention slip in the launcher cannot be mirrored here. Every other slot of both
// function tables traps: it records "trap jni|invoke N" and ends the process with 0xDEAD0000 + N.
//
// It reads vm-script.txt and appends to vm-record.txt, both in the application directory (four
// levels above the DLL); tests/table/conftest.py documents both formats.
//
// Built three ways from this file: jvm.dll; vmdrt.dll (VMD_NO_ENTRY: no JNI_CreateJavaVM, exports
// vmd_ping; also serves as "a library without the entry point"); dep/jvm.dll (VMD_NEEDS_RT: imports
// vmd_ping from vmdrt.dll, so it loads only when jre\bin is searched for DLLs).
#include <windows.h>

#include <stdarg.h>
#include <stdio.h>

#include <string>
#include <utility>
#include <vector>

#define VMD_CALL __stdcall

namespace {

typedef long jint;  // 32 bits on both Windows ABIs
struct Option {
    char* text;
    void* extraInfo;
};
struct InitArgs {
    jint version;
    jint count;
    Option* options;
    unsigned char ignoreUnrecognized;
};
typedef void (*Slot)();
struct Table {  // what JNIEnv* and JavaVM* point at
    const Slot* functions;
};
struct Object {  // a class, method or string (its text), or an array (its elements' texts)
    std::string text;
    std::vector<std::string> items;
};

std::wstring g_dir;
Slot g_jni[256], g_invoke[8];
Table g_env = {g_jni}, g_vm = {g_invoke};

struct Script {
    jint create = 0, destroy = 0;
    std::string missingClass, until;
    bool missingMethod = false, exits = false;
    unsigned long mainMs = 0, exitCode = 0;
} g_script;

void Record(const std::string& line) {
    HANDLE file = CreateFileW((g_dir + L"\\vm-record.txt").c_str(), FILE_APPEND_DATA, FILE_SHARE_READ | FILE_SHARE_WRITE,
                              nullptr, OPEN_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
    DWORD done = 0;
    std::string bytes = line + "\n";
    WriteFile(file, bytes.data(), static_cast<DWORD>(bytes.size()), &done, nullptr);
    CloseHandle(file);
}

std::string Number(long long value) { return std::to_string(value); }

[[noreturn]] void Trap(const char* table, int slot) {
    Record(std::string("trap ") + table + " " + Number(slot));
    ExitProcess(0xDEAD0000u + static_cast<UINT>(slot));
}
template <int N>
void JniTrap() { Trap("jni", N); }
template <int N>
void InvokeTrap() { Trap("invoke", N); }
template <int... N>
void FillTraps(Slot* jni, Slot* invoke, std::integer_sequence<int, N...>) {
    const Slot jniTraps[] = {&JniTrap<N>...}, invokeTraps[] = {&InvokeTrap<N>...};
    for (size_t i = 0; i < sizeof...(N); ++i) jni[i] = jniTraps[i];
    for (size_t i = 0; i < 8; ++i) invoke[i] = invokeTraps[i];
}

void ReadScript() {
    FILE* file = _wfopen((g_dir + L"\\vm-script.txt").c_str(), L"rb");
    char line[1024];
    while (file != nullptr && fgets(line, sizeof line, file) != nullptr) {
        std::string text(line);
        while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
        size_t equals = text.find('=');
        std::string key = text.substr(0, equals), value = equals == std::string::npos ? "" : text.substr(equals + 1);
        long number = strtol(value.c_str(), nullptr, 0);
        if (key == "create") g_script.create = number;
        else if (key == "destroy") g_script.destroy = number;
        else if (key == "missing_class") g_script.missingClass = value;
        else if (key == "missing_method") g_script.missingMethod = number != 0;
        else if (key == "main_ms") g_script.mainMs = static_cast<unsigned long>(number);
        else if (key == "until") g_script.until = value;
        else if (key == "exit") g_script.exits = true, g_script.exitCode = static_cast<unsigned long>(number);
        else if (!key.empty()) Record("script ignored " + text);
    }
    if (file != nullptr) fclose(file);
}

void* VMD_CALL FindClass(Table*, const char* name) {
    bool missing = g_script.missingClass == name;
    Record(std::string("call FindClass ") + name + (missing ? " -> null" : ""));
    return missing ? nullptr : new Object{name, {}};
}

void* VMD_CALL GetStaticMethodID(Table*, Object* owner, const char* name, const char* signature) {
    Record("call GetStaticMethodID " + owner->text + " " + name + " " + signature + (g_script.missingMethod ? " -> null" : ""));
    return g_script.missingMethod ? nullptr : new Object{name, {}};
}

void* VMD_CALL NewObjectArray(Table*, jint length, Object* elementClass, void* initial) {
    Record("call NewObjectArray " + Number(length) + " " + elementClass->text + (initial ? " set" : " null"));
    return new Object{"", std::vector<std::string>(length > 0 ? length : 0)};
}

void* VMD_CALL NewStringUTF(Table*, const char* text) {
    Record(std::string("call NewStringUTF ") + text);
    return new Object{text, {}};
}

void VMD_CALL SetObjectArrayElement(Table*, Object* array, jint index, Object* value) {
    bool inside = index >= 0 && index < static_cast<jint>(array->items.size());
    Record("call SetObjectArrayElement " + Number(index) + " " + value->text + (inside ? "" : " -> out of bounds"));
    if (inside) array->items[index] = value->text;
}

// main: records what it got, then runs for main_ms or until the file `until` appears (at most
// 120 s), then returns or ends the process as System.exit does.
void VMD_CALL CallStaticVoidMethodV(Table*, Object* owner, Object* method, va_list rest) {
    Object* array = va_arg(rest, Object*);
    Record("call CallStaticVoidMethodV " + owner->text + " " + method->text);
    Record("main " + Number(array->items.size()));
    for (const std::string& item : array->items) Record("arg " + item);
    std::wstring until = g_dir + L"\\" + std::wstring(g_script.until.begin(), g_script.until.end());
    DWORD start = GetTickCount(), limit = g_script.until.empty() ? g_script.mainMs : 120000;
    while (GetTickCount() - start < limit && (g_script.until.empty() || GetFileAttributesW(until.c_str()) == INVALID_FILE_ATTRIBUTES))
        Sleep(20);
    if (g_script.exits) ExitProcess(g_script.exitCode);
    Record("end");
}

jint VMD_CALL DestroyJavaVM(Table*) {
    Record("call DestroyJavaVM");
    return g_script.destroy;
}

template <typename F>
Slot AsSlot(F function) { return reinterpret_cast<Slot>(function); }

}  // namespace

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
    if (reason != DLL_PROCESS_ATTACH) return TRUE;
    wchar_t path[MAX_PATH];
    std::wstring dir(path, GetModuleFileNameW(instance, path, MAX_PATH));
    for (int up = 0; up < 4 && dir.find_last_of(L'\\') != std::wstring::npos; ++up) dir.resize(dir.find_last_of(L'\\'));
    g_dir = dir;
    FillTraps(g_jni, g_invoke, std::make_integer_sequence<int, 256>());
    g_jni[6] = AsSlot(&FindClass);
    g_jni[113] = AsSlot(&GetStaticMethodID);
    g_jni[142] = AsSlot(&CallStaticVoidMethodV);
    g_jni[167] = AsSlot(&NewStringUTF);
    g_jni[172] = AsSlot(&NewObjectArray);
    g_jni[174] = AsSlot(&SetObjectArrayElement);
    g_invoke[3] = AsSlot(&DestroyJavaVM);
    return TRUE;
}

#ifdef VMD_NO_ENTRY
extern "C" __declspec(dllexport) int vmd_ping() { return 57; }
#else
#ifdef VMD_NEEDS_RT
extern "C" __declspec(dllimport) int vmd_ping();
#endif

extern "C" __declspec(dllexport) jint VMD_CALL JNI_CreateJavaVM(Table** vm, void** env, InitArgs* args) {
#ifdef VMD_NEEDS_RT
    vmd_ping();
#endif
    ReadScript();
    char head[96];
    snprintf(head, sizeof head, "call JNI_CreateJavaVM 0x%08lx ignoreUnrecognized=%d", args->version, args->ignoreUnrecognized);
    Record(head);
    for (jint i = 0; i < args->count; ++i)
        Record(std::string("option ") + args->options[i].text + (args->options[i].extraInfo ? " (extraInfo set)" : ""));
    *vm = g_script.create == 0 ? &g_vm : nullptr;
    *env = g_script.create == 0 ? &g_env : nullptr;
    return g_script.create;
}
#endif
