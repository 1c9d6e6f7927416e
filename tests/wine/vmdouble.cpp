// The VM double: a stand-in jvm.dll for the scenario table (and for the Windows dist layout, where no
// Windows Java runtime can be had). Declared by hand, not from jni.h: every function is __stdcall as
// in the real library, so a calling-convention slip in the launcher cannot be mirrored here. Every
// other slot of both function tables traps: it records "trap" and ends the process with 0xDEAD.
//
// Reads vm-script.txt and appends to vm-record.txt in the application directory (four levels above
// the DLL); tests/table/conftest.py documents both. Built three ways: jvm.dll; vmdrt.dll (NO_ENTRY:
// exports only vmd_ping, so it is also "a library without the entry point"); dep/jvm.dll
// (NEEDS_RT: imports vmd_ping, so it loads only when jre\bin is searched for DLLs).
#include <windows.h>

#include <stdarg.h>
#include <stdio.h>

#include <map>
#include <string>
#include <vector>

#define VMD_CALL __stdcall

namespace {

typedef long jint;  // 32 bits on both Windows ABIs
struct Option { char* text; void* extraInfo; };
struct InitArgs { jint version, count; Option* options; unsigned char ignoreUnrecognized; };
typedef void (*Slot)();
struct Table { const Slot* functions; };  // what JNIEnv* and JavaVM* point at
struct Object { std::string text; std::vector<std::string> items; };  // a class, method or string; an array

std::wstring g_dir;
Slot g_jni[256], g_invoke[8];
Table g_env = {g_jni}, g_vm = {g_invoke};
std::map<std::string, std::string> g_script;  // vm-script.txt
jint Number(const char* key) { return strtol(g_script[key].c_str(), nullptr, 0); }
std::string Failed(bool failed) { return failed ? " -> null" : ""; }

void Record(const std::string& line) {
    FILE* file = _wfopen((g_dir + L"\\vm-record.txt").c_str(), L"ab");
    fprintf(file, "%s\n", line.c_str());
    fclose(file);
}
void VMD_CALL Trap() { Record("trap"), ExitProcess(0xDEAD); }

void* VMD_CALL FindClass(Table*, const char* name) {
    bool missing = g_script["missing_class"] == name;
    Record(std::string("call FindClass ") + name + Failed(missing));
    return missing ? nullptr : new Object{name, {}};
}
void* VMD_CALL GetStaticMethodID(Table*, Object* owner, const char* name, const char* signature) {
    bool missing = g_script.count("missing_method") != 0;
    Record("call GetStaticMethodID " + owner->text + " " + name + " " + signature + Failed(missing));
    return missing ? nullptr : new Object{name, {}};
}
void* VMD_CALL NewObjectArray(Table*, jint length, Object* elementClass, void* initial) {
    Record("call NewObjectArray " + std::to_string(length) + " " + elementClass->text + (initial ? " set" : " null"));
    return new Object{"", std::vector<std::string>(length > 0 ? length : 0)};
}
void* VMD_CALL NewStringUTF(Table*, const char* text) {
    Record(std::string("call NewStringUTF ") + text);
    return new Object{text, {}};
}
void VMD_CALL SetObjectArrayElement(Table*, Object* array, jint index, Object* value) {
    bool inside = index >= 0 && index < static_cast<jint>(array->items.size());
    Record("call SetObjectArrayElement " + std::to_string(index) + " " + value->text + (inside ? "" : " -> out of bounds"));
    if (inside) array->items[index] = value->text;
}
// main: records what it got, runs for main_ms or until the file `until` appears (at most 120 s),
// then returns, or ends the process as System.exit does.
void VMD_CALL CallStaticVoidMethodV(Table*, Object* owner, Object* method, va_list rest) {
    Object* array = va_arg(rest, Object*);
    Record("call CallStaticVoidMethodV " + owner->text + " " + method->text);
    Record("main " + std::to_string(array->items.size()));
    for (const std::string& item : array->items) Record("arg " + item);
    std::string until = g_script["until"];
    std::wstring file = g_dir + L"\\" + std::wstring(until.begin(), until.end());
    for (DWORD start = GetTickCount(), limit = until.empty() ? Number("main_ms") : 120000; GetTickCount() - start < limit &&
         (until.empty() || GetFileAttributesW(file.c_str()) == INVALID_FILE_ATTRIBUTES);) Sleep(20);
    if (g_script.count("exit")) ExitProcess(Number("exit"));
    Record("end");
}
jint VMD_CALL DestroyJavaVM(Table*) { return Record("call DestroyJavaVM"), Number("destroy"); }

template <typename F>
Slot AsSlot(F function) { return reinterpret_cast<Slot>(function); }

}  // namespace

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
    if (reason != DLL_PROCESS_ATTACH) return TRUE;
    wchar_t path[MAX_PATH];
    g_dir.assign(path, GetModuleFileNameW(instance, path, MAX_PATH));
    for (int up = 0; up < 4; ++up) g_dir.resize(g_dir.find_last_of(L'\\'));
    for (Slot& slot : g_jni) slot = AsSlot(&Trap);
    for (Slot& slot : g_invoke) slot = AsSlot(&Trap);
    g_jni[6] = AsSlot(&FindClass), g_jni[113] = AsSlot(&GetStaticMethodID), g_jni[142] = AsSlot(&CallStaticVoidMethodV);
    g_jni[167] = AsSlot(&NewStringUTF), g_jni[172] = AsSlot(&NewObjectArray), g_jni[174] = AsSlot(&SetObjectArrayElement);
    g_invoke[3] = AsSlot(&DestroyJavaVM);
    return TRUE;
}

#ifdef NO_ENTRY
extern "C" __declspec(dllexport) int vmd_ping() { return 57; }
#else
#ifdef NEEDS_RT
extern "C" __declspec(dllimport) int vmd_ping();
#else
int vmd_ping() { return 57; }
#endif
extern "C" __declspec(dllexport) jint VMD_CALL JNI_CreateJavaVM(Table** vm, void** env, InitArgs* args) {
    vmd_ping();
    FILE* script = _wfopen((g_dir + L"\\vm-script.txt").c_str(), L"rb");
    for (char line[1024], key[64], value[960]; script != nullptr && fgets(line, sizeof line, script) != nullptr;)
        if (sscanf(line, "%63[^=]=%959[^\r\n]", key, value) == 2) g_script[key] = value;
    if (script != nullptr) fclose(script);
    char head[96];
    snprintf(head, sizeof head, "call JNI_CreateJavaVM 0x%08lx ignoreUnrecognized=%d", args->version, args->ignoreUnrecognized);
    Record(head);
    for (jint i = 0; i < args->count; ++i) Record(std::string("option ") + args->options[i].text + (args->options[i].extraInfo ? " (extraInfo set)" : ""));
    *vm = Number("create") == 0 ? &g_vm : nullptr;
    *env = Number("create") == 0 ? &g_env : nullptr;
    return Number("create");
}
#endif
