// A second start while the application runs: the instance lock as other programs see it, and the
// arguments the second instance hands to the running application over TCP port 6152.
#include "test_instance_support.h"

#include <gtest/gtest.h>

using handoff::FirstGuard;
using handoff::FirstInstance;
using handoff::Listener;

namespace {

struct OwnedHandle {
    HANDLE handle;
    ~OwnedHandle() {
        if (handle != nullptr) CloseHandle(handle);
    }
};

// Other programs probe for the running application by the nine-unit name; the readable name is
// not the lock. The lock lasts while any process holds a handle to it, and is free once none does.
TEST(InstanceLock, NamedByNineUnitsAndHeldWhileAnyHandleIsOpen) {
    FirstInstance first;
    FirstGuard guard{&first};
    ASSERT_TRUE(handoff::StartFirst(&first));

    OwnedHandle probe = {OpenMutexW(SYNCHRONIZE, FALSE, handoff::kLockName)};
    ASSERT_NE(probe.handle, nullptr) << "error " << GetLastError();
    SetLastError(0);
    OwnedHandle readable = {OpenMutexW(SYNCHRONIZE, FALSE, handoff::kReadableName)};
    EXPECT_EQ(readable.handle, nullptr);
    EXPECT_EQ(GetLastError(), static_cast<DWORD>(ERROR_FILE_NOT_FOUND));

    bed::RunResult stopped = handoff::StopFirst(&first);
    EXPECT_FALSE(stopped.timedOut);
    EXPECT_EQ(stopped.exitCode, 0u);

    // The first instance is gone but our handle keeps the name alive: a new start still hands off.
    std::wstring later = bed::MakeAppDir();
    {
        Listener listener;
        ASSERT_TRUE(listener.Start());
        bed::RunResult second = handoff::RunSecond(later, L"");
        listener.Finish();
        EXPECT_EQ(second.exitCode, 0u);
        EXPECT_EQ(listener.received, "002d006e");
        EXPECT_TRUE(bed::ReadRecord(later).empty()) << "the VM was loaded by a second instance";
    }

    // No handle left: the name is gone and the next start is a first instance again.
    CloseHandle(probe.handle);
    probe.handle = nullptr;
    OwnedHandle gone = {OpenMutexW(SYNCHRONIZE, FALSE, handoff::kLockName)};
    EXPECT_EQ(gone.handle, nullptr);
    FirstInstance again;
    FirstGuard againGuard{&again};
    ASSERT_TRUE(handoff::StartFirst(&again));
    OwnedHandle retaken = {OpenMutexW(SYNCHRONIZE, FALSE, handoff::kLockName)};
    EXPECT_NE(retaken.handle, nullptr);
    EXPECT_EQ(handoff::StopFirst(&again).exitCode, 0u);
}

struct WireCase {
    const char* what;
    std::wstring args;     // as typed after the program path
    std::string expected;  // bytes the running application receives
};

// Each second start connects once, sends every argument after the program path in the VM host's
// hex form with nothing between them, closes, and exits with 0 without a box; the running
// instance's log is not touched and the second instance never loads the VM.
TEST(ArgumentForwarding, ListenerReceivesExactBytes) {
    bed::ResetLog();
    FirstInstance first;
    FirstGuard guard{&first};
    ASSERT_TRUE(handoff::StartFirst(&first));
    std::string logBefore = bed::ReadFileBytes(bed::LogPath());
    ASSERT_FALSE(logBefore.empty());
    std::wstring secondDir = bed::MakeAppDir();

    std::wstring longArgument;
    for (int i = 0; i < 5000; ++i) longArgument.push_back(static_cast<wchar_t>(0x100 + (i * 37) % 0xD000));

    const WireCase cases[] = {
        {"no arguments: -n", L"", "002d006e"},
        {"one path", L"C:\\a.dat", "0043003a005c0061002e006400610074"},
        {"two, no separator", L"-x C:\\a.dat", "002d0078" "0043003a005c0061002e006400610074"},
        {"a space inside", L"\"a b\"", "006100200062"},
        {"the splash switch is only forwarded", L"-noSplash", "002d006e006f00530070006c006100730068"},
        {"empty ones repeat the one before", L"x \"\" \"\" y", "0078" "0078" "0078" "0079"},
        {"empty first sends nothing", L"\"\" x", "0078"},
        {"only an empty one", L"\"\"", ""},
        {"non-BMP and Latin-1, lower-case digits", L"\xD83D\xDE00 \x00E9\x00AB", "d83dde00" "00e9" "00ab"},
        {"5,000 units, then a short one", longArgument + L" z", handoff::Hex(longArgument) + "007a"},
    };
    for (const WireCase& c : cases) {
        SCOPED_TRACE(c.what);
        Listener listener;
        ASSERT_TRUE(listener.Start());
        bed::RunResult second = handoff::RunSecond(secondDir, c.args);
        listener.Finish();
        EXPECT_FALSE(second.timedOut);
        EXPECT_EQ(second.exitCode, 0u);
        EXPECT_TRUE(second.boxes.empty());
        EXPECT_TRUE(listener.accepted);
        EXPECT_TRUE(listener.endedByClose) << "connection not closed after the last byte";
        EXPECT_FALSE(listener.extraConnection);
        EXPECT_EQ(listener.received.size(), c.expected.size());
        EXPECT_TRUE(listener.received == c.expected) << listener.received.substr(0, 200);
    }

    EXPECT_TRUE(bed::ReadFileBytes(bed::LogPath()) == logBefore) << "a second instance wrote into the log";
    EXPECT_TRUE(bed::ReadRecord(secondDir).empty()) << "a second instance loaded the VM";
    EXPECT_EQ(handoff::StopFirst(&first).exitCode, 0u);
}

// The application drops the connection after the first argument: the second instance neither
// hangs nor fails; it exits with 0 at once. The later sends go into a reset connection and cannot be
// seen from here, so what this proves is that their failures end nothing.
TEST(ArgumentForwarding, ListenerClosingEarlyStillEndsWithZero) {
    FirstInstance first;
    FirstGuard guard{&first};
    ASSERT_TRUE(handoff::StartFirst(&first));
    std::wstring secondDir = bed::MakeAppDir();

    std::wstring big(5000, L'\x4E2D');
    std::wstring args = L"-x";
    for (int i = 0; i < 4; ++i) args += L" " + big;
    Listener listener;
    ASSERT_TRUE(listener.Start(8));
    DWORD start = GetTickCount();
    bed::RunResult second = handoff::RunSecond(secondDir, args);
    DWORD elapsed = GetTickCount() - start;
    listener.Finish();

    EXPECT_FALSE(second.timedOut);
    EXPECT_EQ(second.exitCode, 0u);
    EXPECT_TRUE(second.boxes.empty());
    EXPECT_EQ(listener.received, "002d0078");
    EXPECT_LT(elapsed, 10000u);
    EXPECT_EQ(handoff::StopFirst(&first).exitCode, 0u);
}

// Nobody listens: five connects, each failure followed by a 5 s pause, then exit 0 (about 25 s).
// Not tested: a listener that appears between two attempts. Under Wine a second connect on a socket
// whose first attempt was refused fails even when a listener is up by then (Windows accepts it), so
// the attempts after the first can only be seen here through their pauses.
TEST(ArgumentForwarding, WithoutListenerGivesUpAfterFiveAttempts) {
    FirstInstance first;
    FirstGuard guard{&first};
    ASSERT_TRUE(handoff::StartFirst(&first));
    std::wstring secondDir = bed::MakeAppDir();

    DWORD start = GetTickCount();
    bed::RunResult second = handoff::RunSecond(secondDir, L"C:\\a.dat");
    DWORD elapsed = GetTickCount() - start;

    EXPECT_FALSE(second.timedOut);
    EXPECT_EQ(second.exitCode, 0u);
    EXPECT_TRUE(second.boxes.empty());
    EXPECT_GE(elapsed, 24500u);  // four pauses would be 20 s, six 30 s
    EXPECT_LT(elapsed, 29500u);
    EXPECT_TRUE(bed::ReadRecord(secondDir).empty());
    EXPECT_EQ(handoff::StopFirst(&first).exitCode, 0u);
}

}  // namespace
