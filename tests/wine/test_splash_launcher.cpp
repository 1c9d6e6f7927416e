// ctest-timeout: 240
// The launcher's splash seen from another process, as a user and the window system see it: the
// picture kept in the executable, the window's class, styles, size and place, its opacity climbing
// to 252, its life through the Java application's main and its end, by the launcher or by its own
// 20-second display time. (The "-noSplash" switch is covered with the start-up sequence.)
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/expect.h"
#include "support/testbed.h"

namespace {

struct Picture {
    bool found = false;
    uint32_t size = 0;
    std::string bytes;
};

// The "SPLASH" resource named "BITMAP_SPLASH_57" of the built launcher, read as data.
Picture LauncherPicture() {
    Picture picture;
    HMODULE module = LoadLibraryExW(bed::LauncherExe().c_str(), nullptr, LOAD_LIBRARY_AS_DATAFILE);
    if (module == nullptr) return picture;
    HRSRC found = FindResourceW(module, L"BITMAP_SPLASH_57", L"SPLASH");
    if (found != nullptr) {
        picture.size = SizeofResource(module, found);
        const char* data = static_cast<const char*>(LockResource(LoadResource(module, found)));
        if (data != nullptr) {
            picture.bytes.assign(data, picture.size);
            picture.found = true;
        }
    }
    FreeLibrary(module);
    return picture;
}

uint32_t U32(const std::string& b, size_t at) {
    return static_cast<uint8_t>(b[at]) | static_cast<uint8_t>(b[at + 1]) << 8 | static_cast<uint8_t>(b[at + 2]) << 16 |
           static_cast<uint32_t>(static_cast<uint8_t>(b[at + 3])) << 24;
}

TEST(SplashPicture, IsAWholeEightBitBitmapWithItsFullColourTable) {
    Picture picture = LauncherPicture();
    ASSERT_TRUE(picture.found) << "no SPLASH resource BITMAP_SPLASH_57 in the launcher";
    const std::string& b = picture.bytes;
    ASSERT_GE(b.size(), 54u);
    EXPECT_EQ(b.substr(0, 2), "BM");
    EXPECT_EQ(U32(b, 14), 40u);                  // BITMAPINFOHEADER
    EXPECT_EQ(U32(b, 28) & 0xFFFF, 8u);          // 8 bits a pixel
    EXPECT_EQ(U32(b, 30), 0u);                   // uncompressed
    uint32_t used = U32(b, 46);
    EXPECT_TRUE(used == 0 || used == 256) << used;  // the table is complete
    int32_t width = static_cast<int32_t>(U32(b, 18)), height = static_cast<int32_t>(U32(b, 22));
    EXPECT_TRUE(width >= 320 && width <= 800 && height >= 200 && height <= 600) << width << "x" << height;
    uint32_t stride = ((static_cast<uint32_t>(width) * 8 + 31) / 32) * 4;
    EXPECT_EQ(b.size(), 14u + 40u + 1024u + stride * static_cast<uint32_t>(height < 0 ? -height : height));
}

TEST(SplashFromOutside, CentredLayeredToolWindowFadesTo252AndLastsThroughMain) {
    Picture picture = LauncherPicture();
    ASSERT_TRUE(picture.found);
    const int width = static_cast<int>(U32(picture.bytes, 18));
    const int height = static_cast<int>(U32(picture.bytes, 22));

    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    bed::WriteScript(app, "main_until_file=stop.flag\n");
    bed::Running* running = bed::Start(bed::AppExe(app), bed::Quote(bed::AppExe(app)), app);
    HWND splash = bed::WaitForSplash(bed::ProcessId(running), 10000);
    if (splash == nullptr) {
        bed::Touch(app, L"stop.flag");
        bed::Finish(running);
        FAIL() << "no splash window";
    }

    EXPECT_EQ(static_cast<DWORD>(GetWindowLongW(splash, GWL_EXSTYLE)), static_cast<DWORD>(WS_EX_LAYERED | WS_EX_TOOLWINDOW));
    DWORD style = static_cast<DWORD>(GetWindowLongW(splash, GWL_STYLE));
    EXPECT_EQ(style & (WS_POPUP | WS_CHILD | WS_CAPTION | WS_THICKFRAME), static_cast<DWORD>(WS_POPUP));
    wchar_t title[16] = {1};
    GetWindowTextW(splash, title, 16);
    EXPECT_EQ(title[0], L'\0');
    RECT rect;
    GetWindowRect(splash, &rect);
    EXPECT_EQ(rect.right - rect.left, width);
    EXPECT_EQ(rect.bottom - rect.top, height);
    EXPECT_EQ(rect.left, (GetSystemMetrics(SM_CXSCREEN) - width) / 2);
    EXPECT_EQ(rect.top, (GetSystemMetrics(SM_CYSCREEN) - height) / 2);

    // The opacity as another process reads it: up in steps of four, then 252 for good.
    std::vector<int> seen;
    DWORD flags = 0;
    DWORD settled = 0;
    bed::WaitFor(
        [&] {
            BYTE alpha = 0;
            COLORREF key = 0;
            if (GetLayeredWindowAttributes(splash, &key, &alpha, &flags) && (seen.empty() || seen.back() != alpha))
                seen.push_back(alpha);
            if (!seen.empty() && seen.back() == 252 && settled == 0) settled = GetTickCount();
            return settled != 0 && GetTickCount() - settled >= 700;
        },
        8000);
    std::string list;
    for (int a : seen) list += std::to_string(a) + " ";
    ASSERT_FALSE(seen.empty());
    EXPECT_EQ(flags, static_cast<DWORD>(LWA_ALPHA));
    for (size_t i = 0; i < seen.size(); ++i) {
        EXPECT_TRUE(seen[i] >= 64 && seen[i] <= 252 && seen[i] % 4 == 0) << list;
        if (i > 0) EXPECT_GT(seen[i], seen[i - 1]) << list;
    }
    EXPECT_EQ(seen.back(), 252) << list;
    EXPECT_TRUE(IsWindowVisible(splash));

    // The Java application's main is running and the splash is still up.
    EXPECT_TRUE(bed::WaitFor([&] { return bed::RecordHas(app, "CallStaticVoidMethodV"); }, 20000));
    EXPECT_TRUE(IsWindow(splash) && IsWindowVisible(splash));

    // main returns: the launcher destroys the VM, shows its box, closes the splash and ends.
    bed::Touch(app, L"stop.flag");
    bed::RunResult run = bed::Finish(running);
    EXPECT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, 0u);
    ASSERT_EQ(run.boxes.size(), 1u);
    EXPECT_EQ(run.boxes[0].text, expect::DestroyBox(0));
    EXPECT_FALSE(IsWindow(splash));
}

TEST(SplashFromOutside, GoesByItselfAfterTwentySecondsWhileMainRuns) {
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    bed::WriteScript(app, "main_until_file=stop.flag\n");
    bed::Running* running = bed::Start(bed::AppExe(app), bed::Quote(bed::AppExe(app)), app);
    HWND splash = bed::WaitForSplash(bed::ProcessId(running), 10000);
    DWORD appeared = GetTickCount();
    bool gone = splash != nullptr && bed::WaitFor([&] { return !IsWindow(splash); }, 25000);
    DWORD shown = GetTickCount() - appeared;
    bool launcherRunning = WaitForSingleObject(bed::ProcessHandle(running), 0) == WAIT_TIMEOUT;
    bed::Touch(app, L"stop.flag");
    bed::RunResult run = bed::Finish(running);

    ASSERT_NE(splash, nullptr);
    EXPECT_TRUE(gone);
    EXPECT_GE(shown, 19000u);
    EXPECT_LE(shown, 22000u);
    EXPECT_TRUE(launcherRunning) << "the splash went with the launcher, not by its display time";
    EXPECT_TRUE(bed::RecordHas(app, "CallStaticVoidMethodV"));
    EXPECT_EQ(run.exitCode, 0u);
}

}  // namespace
