// ctest-timeout: 240
// The launcher's splash seen from another process, as a user and the window system see it: the
// window's class, styles, size and place, its opacity climbing to 252, its life through the Java
// application's main and its end, by the launcher or by its own 20-second display time. (The
// "-noSplash" switch is covered with the start-up sequence.)
#include <gtest/gtest.h>

#include <string.h>

#include <string>
#include <vector>

#include "support/expect.h"
#include "support/testbed.h"

namespace {

// Size of the picture kept in the built launcher ("SPLASH" resource "BITMAP_SPLASH_57").
SIZE PictureSize() {
    SIZE size = {0, 0};
    HMODULE module = LoadLibraryExW(bed::LauncherExe().c_str(), nullptr, LOAD_LIBRARY_AS_DATAFILE);
    HRSRC found = module != nullptr ? FindResourceW(module, L"BITMAP_SPLASH_57", L"SPLASH") : nullptr;
    const BYTE* bytes = found != nullptr ? static_cast<const BYTE*>(LockResource(LoadResource(module, found))) : nullptr;
    if (bytes != nullptr && SizeofResource(module, found) >= 54) {
        memcpy(&size.cx, bytes + 18, 4);
        memcpy(&size.cy, bytes + 22, 4);
    }
    if (module != nullptr) FreeLibrary(module);
    return size;
}

// The launcher with the VM double waiting in main until stop.flag exists, and its splash window.
struct Launch {
    std::wstring app;
    bed::Running* running;
    HWND splash;
    Launch() {
        bed::ResetLog();
        app = bed::MakeAppDir();
        bed::WriteScript(app, "main_until_file=stop.flag\n");
        running = bed::Start(bed::AppExe(app), bed::Quote(bed::AppExe(app)), app);
        splash = bed::WaitForSplash(bed::ProcessId(running), 10000);
    }
    bed::RunResult Stop() {
        bed::Touch(app, L"stop.flag");
        bed::Running* finishing = running;
        running = nullptr;
        return bed::Finish(finishing);
    }
    ~Launch() {
        if (running != nullptr) Stop();
    }
};

TEST(SplashFromOutside, CentredLayeredToolWindowFadesTo252AndLastsThroughMain) {
    SIZE picture = PictureSize();
    ASSERT_GT(picture.cx, 0) << "no SPLASH resource BITMAP_SPLASH_57 in the launcher";
    Launch launch;
    HWND splash = launch.splash;
    ASSERT_NE(splash, nullptr) << "no splash window";

    EXPECT_EQ(static_cast<DWORD>(GetWindowLongW(splash, GWL_EXSTYLE)), static_cast<DWORD>(WS_EX_LAYERED | WS_EX_TOOLWINDOW));
    DWORD style = static_cast<DWORD>(GetWindowLongW(splash, GWL_STYLE));
    EXPECT_EQ(style & (WS_POPUP | WS_CHILD | WS_CAPTION | WS_THICKFRAME), static_cast<DWORD>(WS_POPUP));
    RECT rect;
    GetWindowRect(splash, &rect);
    EXPECT_EQ(rect.right - rect.left, picture.cx);
    EXPECT_EQ(rect.bottom - rect.top, picture.cy);
    EXPECT_EQ(rect.left, (GetSystemMetrics(SM_CXSCREEN) - picture.cx) / 2);
    EXPECT_EQ(rect.top, (GetSystemMetrics(SM_CYSCREEN) - picture.cy) / 2);

    // The opacity: up in steps of four, then 252 for good.
    std::vector<int> seen;
    std::string list;
    DWORD flags = 0, settled = 0;
    bed::WaitFor(
        [&] {
            BYTE alpha = 0;
            if (GetLayeredWindowAttributes(splash, nullptr, &alpha, &flags) && (seen.empty() || seen.back() != alpha)) {
                seen.push_back(alpha);
                list += std::to_string(alpha) + " ";
            }
            if (settled == 0 && !seen.empty() && seen.back() == 252) settled = GetTickCount();
            return settled != 0 && GetTickCount() - settled >= 700;
        },
        8000);
    ASSERT_FALSE(seen.empty());
    EXPECT_EQ(flags, static_cast<DWORD>(LWA_ALPHA));
    for (size_t i = 0; i < seen.size(); ++i) {
        EXPECT_TRUE(seen[i] >= 64 && seen[i] % 4 == 0 && (i == 0 || seen[i] > seen[i - 1])) << list;
    }
    EXPECT_EQ(seen.back(), 252) << list;

    // The Java application's main runs and the splash is still up.
    EXPECT_TRUE(bed::WaitFor([&] { return bed::RecordHas(launch.app, "CallStaticVoidMethodV"); }, 20000));
    EXPECT_TRUE(IsWindowVisible(splash));

    // main returns: the launcher destroys the VM, shows its box, closes the splash and ends.
    bed::RunResult run = launch.Stop();
    EXPECT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, 0u);
    ASSERT_EQ(run.boxes.size(), 1u);
    EXPECT_EQ(run.boxes[0].text, expect::DestroyBox(0));
    EXPECT_FALSE(IsWindow(splash));
}

TEST(SplashFromOutside, GoesByItselfAfterTwentySecondsWhileMainRuns) {
    Launch launch;
    ASSERT_NE(launch.splash, nullptr);
    DWORD appeared = GetTickCount();
    EXPECT_TRUE(bed::WaitFor([&] { return !IsWindow(launch.splash); }, 25000));
    DWORD shown = GetTickCount() - appeared;
    EXPECT_GE(shown, 19000u);
    EXPECT_LE(shown, 22000u);
    EXPECT_EQ(WaitForSingleObject(bed::ProcessHandle(launch.running), 0), static_cast<DWORD>(WAIT_TIMEOUT))
        << "the splash went with the launcher, not by its display time";
    EXPECT_TRUE(bed::RecordHas(launch.app, "CallStaticVoidMethodV"));
    EXPECT_EQ(launch.Stop().exitCode, 0u);
}

}  // namespace
