// A second start raises the running application's frame: windows opened by the VM double inside
// the first instance, looked at from here before and after the second instance ran.
#include "test_instance_support.h"

#include <gtest/gtest.h>

#include <map>

using handoff::Pump;

namespace {

bool WaitForeground(HWND window, DWORD timeoutMs) {
    for (DWORD start = GetTickCount();; Sleep(10)) {
        Pump();
        if (GetForegroundWindow() == window) return true;
        if (GetTickCount() - start >= timeoutMs) return false;
    }
}

// A window of this process in front, so that the activation has something to take the front from
// (a minimised window may be the foreground window, so the starting point must be known).
struct FrontWindow {
    HWND window;
    FrontWindow() {
        WNDCLASSW windowClass = {};
        windowClass.lpfnWndProc = DefWindowProcW;
        windowClass.hInstance = GetModuleHandleW(nullptr);
        windowClass.lpszClassName = L"InstanceTestFront";
        RegisterClassW(&windowClass);
        window = CreateWindowExW(0, L"InstanceTestFront", L"front", WS_OVERLAPPEDWINDOW | WS_VISIBLE, 20, 20, 240, 120,
                                 nullptr, nullptr, GetModuleHandleW(nullptr), nullptr);
        SetForegroundWindow(window);
        WaitForeground(window, 5000);
    }
    ~FrontWindow() {
        DestroyWindow(window);
        Pump();
    }
};

// A window the VM double opens minimised: "CLASS|TITLEHEX" is also the key it is found by.
struct Scripted {
    bool visible;
    std::string key;
    std::string Line() const {
        std::string line = key;
        line[line.find('|')] = ',';
        return std::string("window=") + (visible ? "1" : "0") + ",1," + line + "\n";
    }
};

std::string KeyOf(HWND window) {
    wchar_t className[256] = {0}, title[1024] = {0};
    GetClassNameW(window, className, 256);
    GetWindowTextW(window, title, 1024);
    return bed::ToUtf8(className) + "|" + handoff::Hex(title);
}

struct Scan {
    DWORD processId;
    std::vector<HWND> windows;
};
BOOL CALLBACK Collect(HWND window, LPARAM param) {
    Scan* scan = reinterpret_cast<Scan*>(param);
    DWORD owner = 0;
    GetWindowThreadProcessId(window, &owner);
    if (owner == scan->processId) scan->windows.push_back(window);
    return TRUE;
}

// The scripted windows of process `pid` by key, and their keys in enumeration order (other
// windows the platform keeps for a process are ignored); waits until all of them exist.
std::map<std::string, HWND> FindScripted(DWORD pid, const std::vector<Scripted>& scripted, std::vector<std::string>* order) {
    std::map<std::string, HWND> found;
    bed::WaitFor(
        [&] {
            Scan scan = {pid, {}};
            EnumWindows(Collect, reinterpret_cast<LPARAM>(&scan));
            found.clear();
            order->clear();
            for (HWND window : scan.windows)
                for (const Scripted& w : scripted)
                    if (w.key == KeyOf(window)) {
                        found[w.key] = window;
                        order->push_back(w.key);
                    }
            return found.size() == scripted.size();
        },
        15000);
    return found;
}

// Only visible windows whose title bytes hold the instance name before their first zero byte and
// whose class is the frame class in any letter case are restored and raised, every one of them,
// so the one enumerated later ends in front; every near miss is left as it was.
TEST(Activation, RaisesQualifyingFramesAndLeavesNearMissesAlone) {
    // The frame class in another letter case (one process cannot have both spellings: the first
    // registration wins).
    const std::string frame = "COM.QZ.KPO.EMU57.APP.EMULATORFRAME", lock = handoff::Hex(handoff::kLockName);
    const std::vector<Scripted> qualifying = {{true, frame + "|" + lock}, {true, frame + "|5858" + lock}};
    const std::vector<Scripted> nearMisses = {
        {false, frame + "|" + lock + "3141"},                               // hidden
        {true, frame + "|7a71" + lock.substr(4)},                           // "qz-Lumiscope_QZ-57"
        {true, frame + "|" + handoff::Hex(handoff::kReadableName)},         // one byte per unit
        {true, frame + "|0041" + lock},                                     // the search stops at 'A''s 00
        {true, frame + "|"},                                                // untitled
        {true, frame + "X|" + lock + "3241"},                               // right title, longer class
        {true, frame.substr(0, frame.size() - 1) + "|" + lock + "3341"},    // right title, shorter class
    };
    std::vector<Scripted> all = qualifying;
    all.insert(all.end(), nearMisses.begin(), nearMisses.end());
    std::string script;
    for (const Scripted& w : all) script += w.Line();

    handoff::FirstInstance first;
    ASSERT_TRUE(first.Start(script));
    std::vector<std::string> order;
    std::map<std::string, HWND> windows = FindScripted(bed::ProcessId(first.running), all, &order);
    ASSERT_EQ(windows.size(), all.size());
    for (const auto& w : windows) ASSERT_TRUE(IsIconic(w.second)) << w.first;
    FrontWindow front;
    ASSERT_EQ(GetForegroundWindow(), front.window);

    handoff::Listener listener;  // so that the hand-off does not wait for one
    ASSERT_TRUE(listener.Start());
    EXPECT_EQ(handoff::RunSecond(bed::MakeAppDir(), L"").exitCode, 0u);
    listener.Finish();

    std::string later;
    for (const std::string& key : order)
        if (key == qualifying[0].key || key == qualifying[1].key) later = key;
    EXPECT_TRUE(WaitForeground(windows[later], 5000)) << KeyOf(GetForegroundWindow());
    for (const Scripted& w : qualifying) {
        EXPECT_FALSE(IsIconic(windows[w.key])) << w.key;
        EXPECT_FALSE(IsZoomed(windows[w.key])) << w.key;
    }
    for (const Scripted& w : nearMisses) {
        EXPECT_TRUE(IsIconic(windows[w.key])) << w.key;
        EXPECT_EQ(IsWindowVisible(windows[w.key]) != FALSE, w.visible) << w.key;
    }
}

}  // namespace
