// The splash module on its own, with parameters the launcher never uses: pictures of every kind,
// short display times, a close timer that cannot be set, a centre of our choosing.
//
// The splash keeps process-wide state (one splash per process), so main runs every test in a
// process of its own. The splash is linked in; its calls to SetTimer and ShowWindow go through
// this executable's import slots, which point at the hooks below.
#include <gtest/gtest.h>

#include <windows.h>

#include <stdio.h>
#include <stdlib.h>

#include <string>
#include <vector>

#include "splash/splash.h"

namespace {

decltype(&SetTimer) gRealSetTimer;
decltype(&ShowWindow) gRealShowWindow;
bool gFailCloseTimer = false;
volatile LONG gCloseTimerCalls = 0, gShowCalls = 0, gAlphaAtShow = -1, gVisibleBeforeShow = -1;

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
    if (GetLayeredWindowAttributes(window, nullptr, &alpha, nullptr)) gAlphaAtShow = alpha;
    gVisibleBeforeShow = IsWindowVisible(window) ? 1 : 0;
    return gRealShowWindow(window, command);
}

// Points this executable's imports of dll!name at `hook`; returns the original, or null.
void* PatchImport(const char* dll, const char* name, void* hook) {
    void* target = reinterpret_cast<void*>(GetProcAddress(GetModuleHandleA(dll), name));
    BYTE* base = reinterpret_cast<BYTE*>(GetModuleHandleW(nullptr));
    IMAGE_NT_HEADERS* nt = reinterpret_cast<IMAGE_NT_HEADERS*>(base + reinterpret_cast<IMAGE_DOS_HEADER*>(base)->e_lfanew);
    DWORD imports = nt->OptionalHeader.DataDirectory[IMAGE_DIRECTORY_ENTRY_IMPORT].VirtualAddress;
    bool patched = false;
    for (auto* import = reinterpret_cast<IMAGE_IMPORT_DESCRIPTOR*>(base + imports); target && import->Name; ++import) {
        for (auto* slot = reinterpret_cast<IMAGE_THUNK_DATA*>(base + import->FirstThunk); slot->u1.Function; ++slot) {
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

BOOL CALLBACK FindOwnSplash(HWND window, LPARAM found) {
    DWORD pid = 0;
    GetWindowThreadProcessId(window, &pid);
    wchar_t name[64] = {0};
    GetClassNameW(window, name, 64);
    if (pid != GetCurrentProcessId() || lstrcmpW(name, L"SplashScreenWndClass") != 0) return TRUE;
    *reinterpret_cast<HWND*>(found) = window;
    return FALSE;
}

// Sample points of the 300 x 200 test pictures: the quadrants' middles and two corners.
const POINT kSamples[] = {{75, 50}, {225, 50}, {75, 150}, {225, 150}, {1, 1}, {298, 198}};

// What the splash drew into its window (its own surface, whatever its opacity), as 0xRRGGBB.
std::vector<DWORD> Colours(HWND window) {
    HDC source = GetDC(window);
    HDC memory = CreateCompatibleDC(source);
    HBITMAP bitmap = CreateCompatibleBitmap(source, 300, 200);
    HGDIOBJ old = SelectObject(memory, bitmap);
    BitBlt(memory, 0, 0, 300, 200, source, 0, 0, SRCCOPY);
    std::vector<DWORD> colours;
    for (const POINT& p : kSamples) {
        COLORREF c = GetPixel(memory, p.x, p.y);
        colours.push_back(GetRValue(c) << 16 | GetGValue(c) << 8 | GetBValue(c));
    }
    SelectObject(memory, old);
    DeleteObject(bitmap);
    DeleteDC(memory);
    ReleaseDC(window, source);
    return colours;
}

SplashParams Params(const char* resource) {
    SplashParams params = {};
    params.resourceName = resource;
    params.displayMs = 20000;
    params.centerOnScreen = 1;
    return params;
}

struct Seen {
    DWORD startMs = 0;  // spent in SplashStart
    bool appeared = false;
    long shownMs = -1;  // from appearing to gone by itself
    RECT rect = {};
    DWORD exStyle = 0, style = 0;
    std::vector<DWORD> colours;  // taken 250 ms after the window showed
    bool aliveAfterClose = true;
    DWORD lateCloseMs = 0;  // a second SplashClose, with no window left
};

// Starts the splash and watches its window until it goes by itself, `closeAfterMs` after it
// appeared (once the colours are taken) SplashClose closes it, or `watchMs` ran out.
Seen Watch(SplashParams params, long closeAfterMs = -1, long watchMs = 3000) {
    gRealSetTimer = reinterpret_cast<decltype(&SetTimer)>(
        PatchImport("user32.dll", "SetTimer", reinterpret_cast<void*>(HookSetTimer)));
    gRealShowWindow = reinterpret_cast<decltype(&ShowWindow)>(
        PatchImport("user32.dll", "ShowWindow", reinterpret_cast<void*>(HookShowWindow)));
    EXPECT_TRUE(gRealSetTimer && gRealShowWindow) << "the splash's imports cannot be watched";
    Seen seen;
    DWORD start = GetTickCount();
    SplashStart(&params);
    seen.startMs = GetTickCount() - start;
    HWND window = nullptr;
    DWORD appeared = 0;
    bool visible = false;
    for (DWORD now = start; static_cast<long>(now - start) < watchMs; Sleep(1), now = GetTickCount()) {
        if (window == nullptr) {
            EnumWindows(FindOwnSplash, reinterpret_cast<LPARAM>(&window));
            if (window == nullptr) continue;
            seen.appeared = true;
            appeared = now;
            GetWindowRect(window, &seen.rect);
            seen.exStyle = static_cast<DWORD>(GetWindowLongW(window, GWL_EXSTYLE));
            seen.style = static_cast<DWORD>(GetWindowLongW(window, GWL_STYLE));
        }
        if (!IsWindow(window)) {
            seen.shownMs = static_cast<long>(now - appeared);
            break;
        }
        visible = visible || IsWindowVisible(window);
        if (visible && seen.colours.empty() && now - appeared >= 250) seen.colours = Colours(window);
        if (closeAfterMs >= 0 && !seen.colours.empty() && static_cast<long>(now - appeared) >= closeAfterMs) {
            SplashClose();
            seen.aliveAfterClose = IsWindow(window) != 0;
            DWORD before = GetTickCount();
            SplashClose();
            seen.lateCloseMs = GetTickCount() - before;
            break;
        }
    }
    return seen;
}

const DWORD kRed = 0xc03030, kGreen = 0x30c030, kBlue = 0x3030c0, kYellow = 0xc0c030, kMagenta = 0xff00ff;

// Each channel within a few steps: the screen may round a little, never swap or move colours.
bool Near(DWORD actual, DWORD expected) {
    for (int shift = 0; shift < 24; shift += 8)
        if (abs(static_cast<int>((actual >> shift) & 0xFF) - static_cast<int>((expected >> shift) & 0xFF)) > 8)
            return false;
    return true;
}

// Quadrant colours: top left, top right, bottom left, bottom right. kMagenta marks the 16- and
// 32-bit pictures, which must not be drawn. Wine's DrawDib refuses top-down pictures and draws
// nothing; a platform that draws them must draw them upright.
struct Picture {
    const char* resource;
    DWORD quadrants[4];
};
class Pictures : public ::testing::TestWithParam<Picture> {};

TEST_P(Pictures, DrawnWholeAtTheOriginUnscaledUntilClosed) {
    const Picture& c = GetParam();
    SCOPED_TRACE(c.resource);
    Seen seen = Watch(Params(c.resource), 300);
    EXPECT_EQ(seen.rect.right - seen.rect.left, 300);
    EXPECT_EQ(seen.rect.bottom - seen.rect.top, 200);
    ASSERT_EQ(seen.colours.size(), 6u) << "nothing was captured";
    const int quadrantOfSample[6] = {0, 1, 2, 3, 0, 3};
    bool blank = std::string(c.resource) == "V24_TOPDOWN" && seen.colours[0] == 0 && seen.colours[2] == 0;
    for (int i = 0; i < 6 && !blank; ++i) {
        DWORD want = c.quadrants[quadrantOfSample[i]];
        EXPECT_EQ(Near(seen.colours[i], want), want != kMagenta) << "sample " << i << ": " << std::hex << seen.colours[i];
    }
    EXPECT_FALSE(seen.aliveAfterClose);
    EXPECT_LT(seen.lateCloseMs, 200u) << "a close with no window must not wait";
}

INSTANTIATE_TEST_SUITE_P(Splash, Pictures,
                         ::testing::Values(Picture{"V24", {kRed, kGreen, kBlue, kYellow}},
                                           Picture{"V8", {kRed, kGreen, kBlue, kYellow}},
                                           Picture{"V4", {kRed, kGreen, kBlue, kYellow}},
                                           Picture{"V1", {kRed, kRed, kBlue, kBlue}},
                                           Picture{"V24_TOPDOWN", {kRed, kGreen, kBlue, kYellow}},
                                           Picture{"V16", {kMagenta, kMagenta, kMagenta, kMagenta}},
                                           Picture{"V32", {kMagenta, kMagenta, kMagenta, kMagenta}}));

// Missing, not "BM", rows cut off, the standard bitmap type, no name: no window, and the thread
// ends (SplashStart waits for it).
class Unusable : public ::testing::TestWithParam<const char*> {};

TEST_P(Unusable, NoWindowAndTheThreadEnds) {
    SplashParams params = Params(GetParam());
    params.waitForClose = 1;
    EXPECT_LT(Watch(params, -1, 0).startMs, 2000u);
    EXPECT_EQ(gCloseTimerCalls, 0);
    EXPECT_EQ(gShowCalls, 0);
}

INSTANTIATE_TEST_SUITE_P(Splash, Unusable,
                         ::testing::Values("BITMAP_SPLASH_57", "NOT_BM", "TRUNCATED", "STANDARD_TYPE", nullptr));

TEST(SplashWindow, HiddenLayeredToolWindowCentredThenShownOnceAtOpacity64) {
    Seen seen = Watch(Params("V24"), 100);
    EXPECT_LT(seen.startMs, 200u) << "SplashStart waited";
    EXPECT_EQ(seen.exStyle, static_cast<DWORD>(WS_EX_LAYERED | WS_EX_TOOLWINDOW));
    EXPECT_EQ(seen.style & (WS_POPUP | WS_CAPTION | WS_THICKFRAME | WS_CHILD), static_cast<DWORD>(WS_POPUP));
    EXPECT_EQ(seen.rect.left, (GetSystemMetrics(SM_CXSCREEN) - 300) / 2);
    EXPECT_EQ(seen.rect.top, (GetSystemMetrics(SM_CYSCREEN) - 200) / 2);
    EXPECT_EQ(gShowCalls, 1);
    EXPECT_EQ(gVisibleBeforeShow, 0);
    EXPECT_EQ(gAlphaAtShow, 64);
}

TEST(SplashWindow, TopMostAroundAGivenCentre) {
    SplashParams params = Params("V24");
    params.centerOnScreen = 0;
    params.centerX = params.centerY = 100;
    params.topMost = 1;
    Seen seen = Watch(params, 100);
    EXPECT_EQ(seen.rect.left, -50);
    EXPECT_EQ(seen.rect.top, 0);
    EXPECT_EQ(seen.exStyle, static_cast<DWORD>(WS_EX_LAYERED | WS_EX_TOOLWINDOW | WS_EX_TOPMOST));
}

// 2601 x 1301, headers only: the odd negative difference is halved toward zero.
TEST(SplashWindow, PictureLargerThanTheScreenIsCentredWithDivisionTowardZero) {
    Seen seen = Watch(Params("V16_HUGE"), 100);
    int sw = GetSystemMetrics(SM_CXSCREEN), sh = GetSystemMetrics(SM_CYSCREEN);
    ASSERT_TRUE(sw < 2601 && sh < 1301);
    EXPECT_EQ(seen.rect.left, (sw - 2601) / 2);
    EXPECT_EQ(seen.rect.top, (sh - 1301) / 2);
    EXPECT_EQ(seen.rect.right - seen.rect.left, 2601);
    EXPECT_EQ(seen.rect.bottom - seen.rect.top, 1301);
}

TEST(SplashLife, DisplayTimeClosesTheSplashByItself) {
    SplashParams params = Params("V4");
    params.displayMs = 600;
    Seen seen = Watch(params, -1, 5000);
    EXPECT_GE(seen.shownMs, 450);
    EXPECT_LE(seen.shownMs, 3000);
}

TEST(SplashLife, WaitForCloseReturnsOnlyAfterTheSplashEnded) {
    SplashParams params = Params("V24");
    params.waitForClose = 1;
    params.displayMs = 500;
    Seen seen = Watch(params, -1, 300);
    EXPECT_GE(seen.startMs, 400u);
    EXPECT_EQ(gShowCalls, 1);
    EXPECT_FALSE(seen.appeared) << "a window was left after the start returned";
}

TEST(SplashLife, CloseTimerThatCannotBeSetClosesTheWindowUnshown) {
    gFailCloseTimer = true;
    SplashParams params = Params("V24");
    params.waitForClose = 1;  // returns once the window is closed and the thread ended
    Watch(params, -1, 0);
    EXPECT_EQ(gCloseTimerCalls, 1);
    EXPECT_EQ(gShowCalls, 0);
}

}  // namespace

// Without a filter: every test again in a child process, one at a time.
int main(int argc, char** argv) {
    ::testing::InitGoogleTest(&argc, argv);
    if (GTEST_FLAG_GET(filter) != "*") return RUN_ALL_TESTS();
    wchar_t self[MAX_PATH];
    GetModuleFileNameW(nullptr, self, MAX_PATH);
    int failed = 0, run = 0;
    const ::testing::UnitTest* all = ::testing::UnitTest::GetInstance();
    for (int i = 0; i < all->total_test_suite_count(); ++i) {
        const ::testing::TestSuite* suite = all->GetTestSuite(i);
        for (int j = 0; j < suite->total_test_count(); ++j, ++run) {
            std::string name = std::string(suite->name()) + "." + suite->GetTestInfo(j)->name();
            std::wstring line = L"\"" + std::wstring(self) + L"\" --gtest_filter=" + std::wstring(name.begin(), name.end());
            STARTUPINFOW startup = {};
            startup.cb = sizeof startup;
            PROCESS_INFORMATION process = {};
            DWORD code = 1;
            if (CreateProcessW(self, &line[0], nullptr, nullptr, TRUE, 0, nullptr, nullptr, &startup, &process)) {
                if (WaitForSingleObject(process.hProcess, 60000) != WAIT_OBJECT_0) TerminateProcess(process.hProcess, 1);
                GetExitCodeProcess(process.hProcess, &code);
                CloseHandle(process.hThread);
                CloseHandle(process.hProcess);
            }
            if (code != 0) printf("FAILED (exit %lu): %s\n", static_cast<unsigned long>(code), name.c_str());
            failed += code != 0;
        }
    }
    printf("%d of %d splash module tests failed\n", failed, run);
    return failed != 0 || run == 0;
}
