// A second start raises the running application's frame: windows opened by the VM double inside the
// first instance, looked at from here before and after the second instance ran.
#include "test_instance_support.h"

#include <gtest/gtest.h>

using handoff::FirstGuard;
using handoff::FirstInstance;
using handoff::Listener;

namespace {

LRESULT CALLBACK FrontWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    return DefWindowProcW(window, message, wParam, lParam);
}

void Pump() {
    MSG message;
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
}

bool WaitPumping(bool (*condition)(HWND), HWND window, DWORD timeoutMs) {
    DWORD start = GetTickCount();
    for (;;) {
        Pump();
        if (condition(window)) return true;
        if (GetTickCount() - start >= timeoutMs) return false;
        Sleep(10);
    }
}

bool IsForeground(HWND window) { return GetForegroundWindow() == window; }

// A window of this process in front, so that the activation has something to take the front from
// (a minimised window may be the foreground window, so the starting point must be known).
HWND TakeFront() {
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = FrontWindowProc;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.lpszClassName = L"InstanceTestFront";
    RegisterClassW(&windowClass);
    HWND window = CreateWindowExW(0, L"InstanceTestFront", L"front", WS_OVERLAPPEDWINDOW | WS_VISIBLE, 20, 20, 240,
                                  120, nullptr, nullptr, GetModuleHandleW(nullptr), nullptr);
    SetForegroundWindow(window);
    WaitPumping(IsForeground, window, 5000);
    return window;
}

struct FrontWindow {
    HWND window = TakeFront();
    ~FrontWindow() {
        DestroyWindow(window);
        Pump();
    }
};

// A scripted window: its window= line and the key under which it is found again.
struct Scripted {
    const char* visible;
    const char* minimised;
    std::string className;
    std::string title;
    std::string Line() const {
        return std::string("window=") + visible + "," + minimised + "," + className + "," + title + "\n";
    }
    std::string Key() const { return className + "|" + title; }
};

std::string ScriptOf(const std::vector<Scripted>& windows) {
    std::string script;
    for (const Scripted& w : windows) script += w.Line();
    return script;
}

// The scripted windows of the first instance (other windows the platform keeps for a process are
// ignored), in enumeration order; waits until all of them exist.
std::vector<HWND> FindScripted(DWORD processId, const std::vector<Scripted>& scripted) {
    std::vector<HWND> found;
    bed::WaitFor(
        [&] {
            found.clear();
            for (HWND window : handoff::WindowsOf(processId)) {
                std::string key = handoff::KeyOf(window);
                for (const Scripted& w : scripted)
                    if (w.Key() == key) found.push_back(window);
            }
            return found.size() == scripted.size();
        },
        15000);
    return found;
}

HWND Find(const std::vector<HWND>& windows, const Scripted& w) {
    for (HWND window : windows)
        if (handoff::KeyOf(window) == w.Key()) return window;
    return nullptr;
}

// The second instance with a listener in place, so that the hand-off does not wait for one.
void RunSecondInstance() {
    std::wstring secondDir = bed::MakeAppDir();
    Listener listener;
    ASSERT_TRUE(listener.Start());
    bed::RunResult second = handoff::RunSecond(secondDir, L"");
    listener.Finish();
    EXPECT_EQ(second.exitCode, 0u);
    EXPECT_EQ(listener.received, "002d006e");
    Pump();
}

const std::string kFrame = handoff::kFrameClass;
const std::string kLock = handoff::kLockNameHex;

// Only a visible window whose title bytes hold the instance name before their first zero byte and
// whose class is the frame class is restored and raised; every near miss is left as it was.
TEST(Activation, RaisesTheFrameAndLeavesNearMissesAlone) {
    const Scripted frame = {"1", "1", kFrame, kLock};
    const Scripted hidden = {"0", "1", kFrame, kLock + "3141"};
    const std::vector<Scripted> nearMisses = {
        {"1", "1", kFrame, "7a71" + kLock.substr(4)},                  // "qz-Lumiscope_QZ-57"
        {"1", "1", kFrame, handoff::Hex(handoff::kReadableName)},      // readable name, one byte per unit
        {"1", "1", kFrame, "0041" + kLock},                            // 'A' first: the search stops at its 00
        {"1", "1", kFrame, ""},                                        // untitled
        {"1", "1", kFrame + "X", kLock + "3241"},                      // right title, longer class
        {"1", "1", kFrame.substr(0, kFrame.size() - 1), kLock + "3341"},  // right title, shorter class
    };
    std::vector<Scripted> all = {frame, hidden};
    all.insert(all.end(), nearMisses.begin(), nearMisses.end());

    FirstInstance first;
    FirstGuard guard{&first};
    ASSERT_TRUE(handoff::StartFirst(&first, ScriptOf(all)));
    std::vector<HWND> windows = FindScripted(bed::ProcessId(first.running), all);
    ASSERT_EQ(windows.size(), all.size());
    for (HWND window : windows) ASSERT_TRUE(IsIconic(window)) << handoff::KeyOf(window);
    ASSERT_FALSE(IsWindowVisible(Find(windows, hidden)));

    FrontWindow front;
    ASSERT_TRUE(IsForeground(front.window));
    RunSecondInstance();

    HWND frameWindow = Find(windows, frame);
    EXPECT_TRUE(WaitPumping(IsForeground, frameWindow, 5000));
    EXPECT_FALSE(IsIconic(frameWindow));
    EXPECT_FALSE(IsWindowVisible(Find(windows, hidden)));
    EXPECT_TRUE(IsIconic(Find(windows, hidden)));
    for (const Scripted& w : nearMisses) {
        SCOPED_TRACE(w.Key());
        EXPECT_TRUE(IsIconic(Find(windows, w)));
        EXPECT_NE(GetForegroundWindow(), Find(windows, w));
    }
    EXPECT_EQ(handoff::StopFirst(&first).exitCode, 0u);
}

// The class name is compared without regard to letter case, the name may sit anywhere before the
// first zero byte of the title, and every qualifying window is treated: both are restored and the
// one enumerated later ends in front.
TEST(Activation, TwoQualifyingWindowsBothRestoredLaterInFront) {
    const std::string upperClass = "COM.QZ.KPO.EMU57.APP.EMULATORFRAME";
    const std::vector<Scripted> both = {{"1", "1", upperClass, "5858" + kLock}, {"1", "1", upperClass, kLock + "3141"}};
    FirstInstance first;
    FirstGuard guard{&first};
    ASSERT_TRUE(handoff::StartFirst(&first, ScriptOf(both)));
    DWORD pid = bed::ProcessId(first.running);
    ASSERT_EQ(FindScripted(pid, both).size(), 2u);

    FrontWindow front;
    ASSERT_TRUE(IsForeground(front.window));
    std::vector<HWND> order = FindScripted(pid, both);
    ASSERT_EQ(order.size(), 2u);
    ASSERT_TRUE(IsIconic(order[0]));
    ASSERT_TRUE(IsIconic(order[1]));

    RunSecondInstance();

    EXPECT_TRUE(WaitPumping(IsForeground, order[1], 5000)) << handoff::KeyOf(GetForegroundWindow());
    EXPECT_FALSE(IsIconic(order[0]));
    EXPECT_FALSE(IsIconic(order[1]));
    EXPECT_EQ(handoff::StopFirst(&first).exitCode, 0u);
}

// A frame that is not minimised is only brought to the front.
TEST(Activation, FrameNotMinimisedIsBroughtToFront) {
    const std::vector<Scripted> one = {{"1", "0", kFrame, kLock}};
    FirstInstance first;
    FirstGuard guard{&first};
    ASSERT_TRUE(handoff::StartFirst(&first, ScriptOf(one)));
    std::vector<HWND> windows = FindScripted(bed::ProcessId(first.running), one);
    ASSERT_EQ(windows.size(), 1u);
    HWND frame = windows[0];
    RECT before;
    GetWindowRect(frame, &before);

    FrontWindow front;
    ASSERT_TRUE(IsForeground(front.window));
    RunSecondInstance();

    EXPECT_TRUE(WaitPumping(IsForeground, frame, 5000));
    EXPECT_TRUE(IsWindowVisible(frame));
    EXPECT_FALSE(IsIconic(frame));
    RECT after;
    GetWindowRect(frame, &after);
    EXPECT_TRUE(EqualRect(&before, &after));
    EXPECT_EQ(handoff::StopFirst(&first).exitCode, 0u);
}

}  // namespace
