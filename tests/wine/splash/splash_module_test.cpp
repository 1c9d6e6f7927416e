// The splash module on its own, with parameters the launcher never uses: pictures of every kind,
// short display times, a close timer that cannot be set, a centre of our choosing.
//
// The splash keeps process-wide state that is never reset (one splash per process), so every case
// runs in a child process: this program started again with "--scenario key=value...". The child
// links the splash directly, redirects a few of its own imports (SetTimer, ShowWindow,
// CreateThread, GlobalFree) to watch what the splash does with them, shows one splash, watches its
// window from its main thread and writes what it saw to a report file. The test side reads the
// report and judges.
#include <gtest/gtest.h>

#include <windows.h>

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include <map>
#include <string>
#include <vector>

#include "splash/splash.h"

namespace {

// ============================================================================================
// Child side: one splash, watched.
// ============================================================================================

typedef UINT_PTR(WINAPI* SetTimerFn)(HWND, UINT_PTR, UINT, TIMERPROC);
typedef BOOL(WINAPI* ShowWindowFn)(HWND, int);
typedef HANDLE(WINAPI* CreateThreadFn)(LPSECURITY_ATTRIBUTES, SIZE_T, LPTHREAD_START_ROUTINE, LPVOID, DWORD, LPDWORD);
typedef HGLOBAL(WINAPI* GlobalFreeFn)(HGLOBAL);

SetTimerFn gRealSetTimer;
ShowWindowFn gRealShowWindow;
CreateThreadFn gRealCreateThread;
GlobalFreeFn gRealGlobalFree;

bool gFailCloseTimer = false;
volatile LONG gCloseTimerCalls = 0;
volatile LONG gShowCalls = 0;
volatile LONG gAlphaAtShow = -1;
volatile LONG gVisibleBeforeShow = -1;
volatile LONG gInSplashStart = 0;
HANDLE gSplashThread = nullptr;
void* volatile gParamCopy = nullptr;
volatile LONG gCopyFreed = 0;

UINT_PTR WINAPI HookSetTimer(HWND window, UINT_PTR id, UINT ms, TIMERPROC proc) {
    if (id == 1) {
        InterlockedIncrement(&gCloseTimerCalls);
        if (gFailCloseTimer) return 0;
    }
    return gRealSetTimer(window, id, ms, proc);
}

BOOL WINAPI HookShowWindow(HWND window, int command) {
    InterlockedIncrement(&gShowCalls);
    BYTE alpha = 0;
    DWORD flags = 0;
    COLORREF key = 0;
    if (GetLayeredWindowAttributes(window, &key, &alpha, &flags)) gAlphaAtShow = alpha;
    gVisibleBeforeShow = IsWindowVisible(window) ? 1 : 0;
    return gRealShowWindow(window, command);
}

HANDLE WINAPI HookCreateThread(LPSECURITY_ATTRIBUTES security, SIZE_T stack, LPTHREAD_START_ROUTINE body,
                               LPVOID parameter, DWORD flags, LPDWORD id) {
    HANDLE thread = gRealCreateThread(security, stack, body, parameter, flags, id);
    if (gInSplashStart && thread != nullptr) {
        gParamCopy = parameter;
        DuplicateHandle(GetCurrentProcess(), thread, GetCurrentProcess(), &gSplashThread, 0, FALSE,
                        DUPLICATE_SAME_ACCESS);
    }
    return thread;
}

HGLOBAL WINAPI HookGlobalFree(HGLOBAL memory) {
    if (memory != nullptr && memory == gParamCopy) gCopyFreed = 1;
    return gRealGlobalFree(memory);
}

// Points this executable's import of dll!name at `hook`; the splash is linked in, so its calls go
// through these slots. Returns the original entry, or null when there is no such import.
void* PatchImport(const char* dll, const char* name, void* hook) {
    void* target = reinterpret_cast<void*>(GetProcAddress(GetModuleHandleA(dll), name));
    if (target == nullptr) return nullptr;
    BYTE* base = reinterpret_cast<BYTE*>(GetModuleHandleW(nullptr));
    IMAGE_NT_HEADERS* nt = reinterpret_cast<IMAGE_NT_HEADERS*>(base + reinterpret_cast<IMAGE_DOS_HEADER*>(base)->e_lfanew);
    const IMAGE_DATA_DIRECTORY& directory = nt->OptionalHeader.DataDirectory[IMAGE_DIRECTORY_ENTRY_IMPORT];
    bool patched = false;
    for (IMAGE_IMPORT_DESCRIPTOR* import = reinterpret_cast<IMAGE_IMPORT_DESCRIPTOR*>(base + directory.VirtualAddress);
         import->Name != 0; ++import) {
        for (IMAGE_THUNK_DATA* slot = reinterpret_cast<IMAGE_THUNK_DATA*>(base + import->FirstThunk);
             slot->u1.Function != 0; ++slot) {
            if (reinterpret_cast<void*>(slot->u1.Function) != target) continue;
            DWORD old = 0;
            VirtualProtect(&slot->u1.Function, sizeof slot->u1.Function, PAGE_READWRITE, &old);
            slot->u1.Function = reinterpret_cast<ULONG_PTR>(hook);
            VirtualProtect(&slot->u1.Function, sizeof slot->u1.Function, old, &old);
            patched = true;
        }
    }
    return patched ? target : nullptr;
}

struct Report {
    std::string text;
    void Add(const char* key, long long value) { text += std::string(key) + "=" + std::to_string(value) + "\n"; }
    void Add(const char* key, const std::string& value) { text += std::string(key) + "=" + value + "\n"; }
};

BOOL CALLBACK FindOwnSplash(HWND window, LPARAM param) {
    DWORD pid = 0;
    GetWindowThreadProcessId(window, &pid);
    wchar_t name[64] = {0};
    GetClassNameW(window, name, 64);
    if (pid == GetCurrentProcessId() && lstrcmpW(name, L"SplashScreenWndClass") == 0) {
        *reinterpret_cast<HWND*>(param) = window;
        return FALSE;
    }
    return TRUE;
}

HWND OwnSplash() {
    HWND found = nullptr;
    EnumWindows(FindOwnSplash, reinterpret_cast<LPARAM>(&found));
    return found;
}

// Sample points of the 300 x 200 test pictures: the quadrants' middles and two corners.
const POINT kSamples[] = {{75, 50}, {225, 50}, {75, 150}, {225, 150}, {1, 1}, {298, 198}};

// What the splash drew into its window (the window's own surface, independent of its opacity).
void CaptureColours(HWND window, Report* report) {
    RECT rect;
    GetClientRect(window, &rect);
    int width = rect.right, height = rect.bottom;
    if (width <= 0 || height <= 0) return;
    HDC source = GetDC(window);
    HDC memory = CreateCompatibleDC(source);
    BITMAPINFO info = {};
    info.bmiHeader.biSize = sizeof info.bmiHeader;
    info.bmiHeader.biWidth = width;
    info.bmiHeader.biHeight = -height;
    info.bmiHeader.biPlanes = 1;
    info.bmiHeader.biBitCount = 32;
    void* bits = nullptr;
    HBITMAP bitmap = CreateDIBSection(memory, &info, DIB_RGB_COLORS, &bits, nullptr, 0);
    HGDIOBJ old = SelectObject(memory, bitmap);
    BitBlt(memory, 0, 0, width, height, source, 0, 0, SRCCOPY);
    for (const POINT& p : kSamples) {
        if (p.x >= width || p.y >= height) continue;
        char key[32], value[16];
        snprintf(key, sizeof key, "px_%ld_%ld", p.x, p.y);
        snprintf(value, sizeof value, "%06lx",
                 static_cast<unsigned long>(static_cast<DWORD*>(bits)[p.y * width + p.x] & 0xFFFFFF));
        report->Add(key, value);
    }
    SelectObject(memory, old);
    DeleteObject(bitmap);
    DeleteDC(memory);
    ReleaseDC(window, source);
}

long Option(const std::map<std::string, std::string>& options, const char* key, long fallback) {
    auto it = options.find(key);
    return it == options.end() ? fallback : strtol(it->second.c_str(), nullptr, 10);
}

int RunScenario(int argc, char** argv) {
    std::map<std::string, std::string> options;
    for (int i = 2; i < argc; ++i) {
        const char* eq = strchr(argv[i], '=');
        if (eq != nullptr) options[std::string(argv[i], static_cast<size_t>(eq - argv[i]))] = eq + 1;
    }
    gFailCloseTimer = Option(options, "failclose", 0) != 0;
    gRealSetTimer = reinterpret_cast<SetTimerFn>(PatchImport("user32.dll", "SetTimer", reinterpret_cast<void*>(HookSetTimer)));
    gRealShowWindow =
        reinterpret_cast<ShowWindowFn>(PatchImport("user32.dll", "ShowWindow", reinterpret_cast<void*>(HookShowWindow)));
    gRealCreateThread = reinterpret_cast<CreateThreadFn>(
        PatchImport("kernel32.dll", "CreateThread", reinterpret_cast<void*>(HookCreateThread)));
    gRealGlobalFree =
        reinterpret_cast<GlobalFreeFn>(PatchImport("kernel32.dll", "GlobalFree", reinterpret_cast<void*>(HookGlobalFree)));
    Report report;
    report.Add("hooks", gRealSetTimer && gRealShowWindow && gRealCreateThread && gRealGlobalFree ? 1 : 0);
    report.Add("screen_w", GetSystemMetrics(SM_CXSCREEN));
    report.Add("screen_h", GetSystemMetrics(SM_CYSCREEN));

    std::string resource = options.count("res") ? options["res"] : "V24";
    SplashParams params;
    params.hwndParent = nullptr;
    params.hInstance = GetModuleHandleW(nullptr);
    params.hResourceModule = params.hInstance;
    params.resourceName = resource == "null" ? nullptr : resource.c_str();
    params.displayMs = static_cast<uint16_t>(Option(options, "display", 20000));
    params.centerOnScreen = Option(options, "center", 1);
    params.topMost = Option(options, "topmost", 0);
    params.waitForClose = Option(options, "wait", 0);
    params.centerX = Option(options, "cx", 0);
    params.centerY = Option(options, "cy", 0);
    const long closeAfterMs = Option(options, "close", -1);  // SplashClose this long after it appeared
    const long watchMs = Option(options, "watch", 3000);

    DWORD start = GetTickCount();
    gInSplashStart = 1;
    SplashStart(&params);
    gInSplashStart = 0;
    memset(&params, 0, sizeof params);  // the splash works on its own copy
    report.Add("start_ms", GetTickCount() - start);
    report.Add("thread_started", gSplashThread != nullptr ? 1 : 0);
    report.Add("ended_at_start", gSplashThread != nullptr && WaitForSingleObject(gSplashThread, 0) == WAIT_OBJECT_0);

    // Watch: when the window appears, how it looks, how its opacity climbs, when it goes.
    HWND seen = nullptr;
    DWORD appeared = 0;
    bool everVisible = false;
    bool captured = false;
    std::string alphas;
    int lastAlpha = -1;
    DWORD lastAlphaChange = 0;
    long long alphaFlags = -1;
    for (;;) {
        DWORD now = GetTickCount();
        HWND window = OwnSplash();
        if (seen == nullptr && window != nullptr) {
            seen = window;
            appeared = now;
            report.Add("appeared_ms", now - start);
            RECT r;
            GetWindowRect(window, &r);
            report.Add("left", r.left);
            report.Add("top", r.top);
            report.Add("width", r.right - r.left);
            report.Add("height", r.bottom - r.top);
            report.Add("exstyle", static_cast<long long>(GetWindowLongW(window, GWL_EXSTYLE)));
            report.Add("style", static_cast<long long>(static_cast<DWORD>(GetWindowLongW(window, GWL_STYLE))));
        }
        if (seen != nullptr && !IsWindow(seen)) {
            report.Add("gone_ms", now - start);
            break;
        }
        if (seen != nullptr) {
            if (IsWindowVisible(seen)) everVisible = true;
            BYTE alpha = 0;
            DWORD flags = 0;
            COLORREF key = 0;
            if (GetLayeredWindowAttributes(seen, &key, &alpha, &flags) && alpha != lastAlpha) {
                alphas += (alphas.empty() ? "" : ",") + std::to_string(alpha);
                lastAlpha = alpha;
                lastAlphaChange = now;
                alphaFlags = flags;
            }
            if (!captured && everVisible && now - appeared >= 250) {
                CaptureColours(seen, &report);
                captured = true;
            }
            if (closeAfterMs >= 0 && static_cast<long>(now - appeared) >= closeAfterMs && captured) {
                DWORD before = GetTickCount();
                SplashClose();
                report.Add("close_ms", GetTickCount() - before);
                report.Add("alive_after_close", IsWindow(seen) ? 1 : 0);
                break;
            }
        }
        if (static_cast<long>(now - start) >= watchMs) break;
        Sleep(1);
    }
    report.Add("appeared", seen != nullptr ? 1 : 0);
    report.Add("ever_visible", everVisible ? 1 : 0);
    report.Add("alphas", alphas.empty() ? "-" : alphas);
    report.Add("alpha_flags", alphaFlags);
    report.Add("alpha_stable_ms", lastAlphaChange != 0 ? static_cast<long long>(GetTickCount() - lastAlphaChange) : -1);

    // A close now finds no window (never made, closed by itself or closed above) and returns at once.
    DWORD before = GetTickCount();
    SplashClose();
    report.Add("late_close_ms", GetTickCount() - before);

    report.Add("thread_ended",
               gSplashThread != nullptr && WaitForSingleObject(gSplashThread, 3000) == WAIT_OBJECT_0 ? 1 : 0);
    report.Add("copy_freed", gCopyFreed);
    report.Add("close_timer_calls", gCloseTimerCalls);
    report.Add("show_calls", gShowCalls);
    report.Add("alpha_at_show", gAlphaAtShow);
    report.Add("visible_before_show", gVisibleBeforeShow);

    FILE* out = fopen(options["report"].c_str(), "wb");
    if (out == nullptr) return 2;
    fwrite(report.text.data(), 1, report.text.size(), out);
    fclose(out);
    return 0;
}

// ============================================================================================
// Test side.
// ============================================================================================

typedef std::map<std::string, std::string> Facts;

std::wstring Widen(const std::string& text) { return std::wstring(text.begin(), text.end()); }

// Runs one scenario in a fresh process and returns its report (empty when it failed to run).
Facts Scenario(const std::string& args) {
    static int counter = 0;
    wchar_t self[MAX_PATH];
    GetModuleFileNameW(nullptr, self, MAX_PATH);
    char temp[MAX_PATH], reportPath[MAX_PATH];
    GetTempPathA(MAX_PATH, temp);
    snprintf(reportPath, sizeof reportPath, "%ssplash-scenario-%lu-%d.txt", temp,
             static_cast<unsigned long>(GetCurrentProcessId()), counter++);
    std::wstring line = L"\"" + std::wstring(self) + L"\" --scenario report=" + Widen(reportPath) + L" " + Widen(args);
    STARTUPINFOW startup = {};
    startup.cb = sizeof startup;
    PROCESS_INFORMATION process = {};
    Facts facts;
    if (!CreateProcessW(self, &line[0], nullptr, nullptr, FALSE, 0, nullptr, nullptr, &startup, &process)) {
        ADD_FAILURE() << "cannot start the scenario: " << GetLastError();
        return facts;
    }
    if (WaitForSingleObject(process.hProcess, 60000) != WAIT_OBJECT_0) {
        TerminateProcess(process.hProcess, 1);
        ADD_FAILURE() << "scenario hung: " << args;
    }
    DWORD code = 0;
    GetExitCodeProcess(process.hProcess, &code);
    EXPECT_EQ(code, 0u) << args;
    CloseHandle(process.hThread);
    CloseHandle(process.hProcess);

    FILE* in = fopen(reportPath, "rb");
    if (in == nullptr) {
        ADD_FAILURE() << "no report: " << args;
        return facts;
    }
    char buffer[512];
    while (fgets(buffer, sizeof buffer, in) != nullptr) {
        std::string entry(buffer);
        while (!entry.empty() && (entry.back() == '\n' || entry.back() == '\r')) entry.pop_back();
        size_t eq = entry.find('=');
        if (eq != std::string::npos) facts[entry.substr(0, eq)] = entry.substr(eq + 1);
    }
    fclose(in);
    DeleteFileA(reportPath);
    EXPECT_EQ(facts["hooks"], "1") << "the splash's imports could not be watched";
    return facts;
}

long long Num(const Facts& facts, const char* key) {
    auto it = facts.find(key);
    return it == facts.end() ? -999999 : strtoll(it->second.c_str(), nullptr, 10);
}

const char kRed[] = "c03030", kGreen[] = "30c030", kBlue[] = "3030c0", kYellow[] = "c0c030";

// Each channel within a few steps: the screen may round a little, never swap or move colours.
bool Near(const std::string& actual, const char* expected) {
    if (actual.size() != 6) return false;
    long a = strtol(actual.c_str(), nullptr, 16), e = strtol(expected, nullptr, 16);
    for (int shift = 0; shift < 24; shift += 8)
        if (labs(((a >> shift) & 0xFF) - ((e >> shift) & 0xFF)) > 8) return false;
    return true;
}

// A splash that went through its whole life: the thread ended and gave its copy back.
void ExpectCleanEnd(const Facts& f) {
    EXPECT_EQ(Num(f, "thread_started"), 1);
    EXPECT_EQ(Num(f, "thread_ended"), 1);
    EXPECT_EQ(Num(f, "copy_freed"), 1);
    EXPECT_LT(Num(f, "late_close_ms"), 200) << "a close with no window must not wait";
}

void ExpectQuadrants(const Facts& f, const char* const colours[4]) {
    const std::string& tl = f.at("px_75_50");
    EXPECT_TRUE(Near(tl, colours[0])) << tl;
    EXPECT_TRUE(Near(f.at("px_225_50"), colours[1])) << f.at("px_225_50");
    EXPECT_TRUE(Near(f.at("px_75_150"), colours[2])) << f.at("px_75_150");
    EXPECT_TRUE(Near(f.at("px_225_150"), colours[3])) << f.at("px_225_150");
    EXPECT_TRUE(Near(f.at("px_1_1"), colours[0])) << f.at("px_1_1");
    EXPECT_TRUE(Near(f.at("px_298_198"), colours[3])) << f.at("px_298_198");
}

TEST(SplashPictures, DrawnWholeAtTheOriginUnscaled) {
    const char* const quadrants[4] = {kRed, kGreen, kBlue, kYellow};
    const char* const halves[4] = {kRed, kRed, kBlue, kBlue};
    struct Case {
        const char* resource;
        const char* const* colours;  // top left, top right, bottom left, bottom right
    } cases[] = {{"V24", quadrants}, {"V8", quadrants}, {"V4", quadrants}, {"V1", halves}};
    for (const Case& c : cases) {
        SCOPED_TRACE(c.resource);
        Facts f = Scenario(std::string("res=") + c.resource + " close=300");
        EXPECT_EQ(Num(f, "width"), 300);
        EXPECT_EQ(Num(f, "height"), 200);
        ASSERT_EQ(f.count("px_298_198"), 1u) << "nothing was captured";
        ExpectQuadrants(f, c.colours);
        EXPECT_EQ(Num(f, "alive_after_close"), 0);
        ExpectCleanEnd(f);
    }
}

// The window takes the positive height. The picture goes to DrawDib as stored; Wine's DrawDib
// refuses top-down pictures and draws nothing, a platform that draws them must draw them upright.
TEST(SplashPictures, TopDownPictureGivesAWindowOfPositiveHeight) {
    Facts f = Scenario("res=V24_TOPDOWN close=300");
    EXPECT_EQ(Num(f, "ever_visible"), 1);
    EXPECT_EQ(Num(f, "width"), 300);
    EXPECT_EQ(Num(f, "height"), 200);
    ASSERT_EQ(f.count("px_298_198"), 1u) << "nothing was captured";
    if (f["px_75_50"] != "000000" || f["px_75_150"] != "000000") {
        const char* const quadrants[4] = {kRed, kGreen, kBlue, kYellow};
        ExpectQuadrants(f, quadrants);
    }
    ExpectCleanEnd(f);
}

TEST(SplashPictures, SixteenAndThirtyTwoBitsGiveAnEmptyWindowOfTheirSize) {
    for (const char* resource : {"V16", "V32"}) {
        SCOPED_TRACE(resource);
        Facts f = Scenario(std::string("res=") + resource + " close=300");
        EXPECT_EQ(Num(f, "ever_visible"), 1);
        EXPECT_EQ(Num(f, "width"), 300);
        EXPECT_EQ(Num(f, "height"), 200);
        for (const char* key : {"px_75_50", "px_225_150", "px_1_1", "px_298_198"}) {
            ASSERT_EQ(f[key].size(), 6u) << key;
            EXPECT_FALSE(Near(f[key], "ff00ff")) << key << ": the picture was drawn";
        }
        ExpectCleanEnd(f);
    }
}

TEST(SplashPictures, MissingOrBrokenPictureGivesNoWindowAndTheThreadEnds) {
    // Not there, not a bitmap file, cut short, empty, of the standard bitmap type, or no name at all.
    for (const char* resource : {"BITMAP_SPLASH_57", "NOT_BM", "TRUNCATED", "HEADERS_CUT", "EMPTY", "STANDARD_TYPE",
                                 "null"}) {
        SCOPED_TRACE(resource);
        Facts f = Scenario(std::string("res=") + resource + " watch=800");
        EXPECT_EQ(Num(f, "appeared"), 0);
        EXPECT_EQ(Num(f, "show_calls"), 0);
        EXPECT_EQ(Num(f, "close_timer_calls"), 0);
        ExpectCleanEnd(f);
    }
}

TEST(SplashWindow, LayeredToolWindowOfThePictureSizeCentredOnTheScreen) {
    Facts f = Scenario("res=V24 close=100");
    EXPECT_EQ(Num(f, "exstyle"), WS_EX_LAYERED | WS_EX_TOOLWINDOW);
    EXPECT_EQ(static_cast<DWORD>(Num(f, "style")) & (WS_POPUP | WS_CAPTION | WS_THICKFRAME | WS_CHILD),
              static_cast<DWORD>(WS_POPUP));
    EXPECT_EQ(Num(f, "left"), (Num(f, "screen_w") - 300) / 2);
    EXPECT_EQ(Num(f, "top"), (Num(f, "screen_h") - 200) / 2);
    EXPECT_EQ(Num(f, "width"), 300);
    EXPECT_EQ(Num(f, "height"), 200);
    // Created hidden and shown once, already at the first opacity.
    EXPECT_EQ(Num(f, "show_calls"), 1);
    EXPECT_EQ(Num(f, "visible_before_show"), 0);
    EXPECT_EQ(Num(f, "alpha_at_show"), 64);
    ExpectCleanEnd(f);

    Facts top = Scenario("res=V24 close=100 topmost=1");
    EXPECT_EQ(Num(top, "exstyle"), WS_EX_LAYERED | WS_EX_TOOLWINDOW | WS_EX_TOPMOST);
}

TEST(SplashWindow, PlacedAroundAGivenCentre) {
    Facts f = Scenario("res=V24 center=0 cx=100 cy=100 close=100");
    EXPECT_EQ(Num(f, "left"), -50);
    EXPECT_EQ(Num(f, "top"), 0);
    Facts g = Scenario("res=V24 center=0 cx=-7 cy=5000 close=100");
    EXPECT_EQ(Num(g, "left"), -157);
    EXPECT_EQ(Num(g, "top"), 4900);
}

TEST(SplashWindow, PictureLargerThanTheScreenIsCentredWithDivisionTowardZero) {
    Facts f = Scenario("res=V16_HUGE close=100");
    long sw = Num(f, "screen_w"), sh = Num(f, "screen_h");
    ASSERT_LT(sw, 2601);
    ASSERT_LT(sh, 1301);
    EXPECT_EQ(Num(f, "width"), 2601);
    EXPECT_EQ(Num(f, "height"), 1301);
    EXPECT_EQ(Num(f, "left"), (sw - 2601) / 2);  // C++ division truncates, as the splash must
    EXPECT_EQ(Num(f, "top"), (sh - 1301) / 2);
}

TEST(SplashWindow, FadesInStepsOfFourAndStaysAt252) {
    Facts f = Scenario("res=V8 watch=2500");
    EXPECT_EQ(Num(f, "alpha_flags"), LWA_ALPHA);
    std::vector<long> seen;
    const std::string& list = f["alphas"];
    for (size_t at = 0; at < list.size();) {
        size_t comma = list.find(',', at);
        if (comma == std::string::npos) comma = list.size();
        seen.push_back(strtol(list.substr(at, comma - at).c_str(), nullptr, 10));
        at = comma + 1;
    }
    ASSERT_FALSE(seen.empty()) << list;
    for (size_t i = 0; i < seen.size(); ++i) {
        EXPECT_TRUE(seen[i] >= 64 && seen[i] <= 252 && seen[i] % 4 == 0) << list;
        if (i > 0) EXPECT_GT(seen[i], seen[i - 1]) << list;
    }
    EXPECT_EQ(seen.back(), 252) << list;
    EXPECT_GE(Num(f, "alpha_stable_ms"), 500) << "the opacity kept changing after 252";
    EXPECT_GT(seen.size(), 3u) << "the opacity did not climb visibly: " << list;
}

TEST(SplashLife, DisplayTimeClosesTheSplashByItself) {
    Facts f = Scenario("res=V4 display=600 watch=5000");
    ASSERT_EQ(Num(f, "appeared"), 1);
    long shown = Num(f, "gone_ms") - Num(f, "appeared_ms");
    EXPECT_GE(shown, 450);
    EXPECT_LE(shown, 3000);
    ExpectCleanEnd(f);

    // Zero: the shortest timer the system has.
    Facts zero = Scenario("res=V4 display=0 watch=3000");
    EXPECT_GE(Num(zero, "gone_ms"), 0);
    EXPECT_LE(Num(zero, "gone_ms"), 1000);
    ExpectCleanEnd(zero);
}

TEST(SplashLife, CloseTimerThatCannotBeSetClosesTheWindowUnshown) {
    Facts f = Scenario("res=V24 failclose=1 watch=1500");
    EXPECT_EQ(Num(f, "close_timer_calls"), 1);
    EXPECT_EQ(Num(f, "show_calls"), 0);
    EXPECT_EQ(Num(f, "ever_visible"), 0);
    EXPECT_EQ(Num(f, "thread_ended"), 1);
    EXPECT_EQ(Num(f, "copy_freed"), 1);
}

TEST(SplashLife, CloseReturnsWithTheWindowGone) {
    Facts f = Scenario("res=V24 close=200");
    EXPECT_EQ(Num(f, "alive_after_close"), 0);
    EXPECT_LT(Num(f, "close_ms"), 2000);
    ExpectCleanEnd(f);  // also: the second close, with no window left, returns at once
}

TEST(SplashLife, WaitForCloseReturnsOnlyAfterTheSplashEnded) {
    Facts f = Scenario("res=V24 wait=1 display=500 watch=300");
    EXPECT_GE(Num(f, "start_ms"), 400);
    EXPECT_EQ(Num(f, "ended_at_start"), 1);
    EXPECT_EQ(Num(f, "appeared"), 0) << "a window was left after the start returned";
    EXPECT_EQ(Num(f, "copy_freed"), 1);

    Facts plain = Scenario("res=V24 display=500 close=100");
    EXPECT_LT(Num(plain, "start_ms"), 200);
    EXPECT_EQ(Num(plain, "ended_at_start"), 0);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc >= 2 && strcmp(argv[1], "--scenario") == 0) return RunScenario(argc, argv);
    ::testing::InitGoogleTest(&argc, argv);
    return RUN_ALL_TESTS();
}
