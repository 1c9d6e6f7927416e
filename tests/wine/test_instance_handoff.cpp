// A second start while the application runs: the instance lock as other programs see it, and the
// arguments the second instance hands to the running application over TCP port 6152.
#include "test_instance_support.h"

#include <gtest/gtest.h>

using handoff::FirstInstance;
using handoff::Listener;

namespace {

// Each second start connects once, sends every argument after the program path in hex with
// nothing between them, closes, and exits with 0 without a box; it neither writes to the running
// instance's log nor loads the VM. Once the first instance has ended the lock is free again.
TEST(SecondStart, HandsOffArgumentsThroughTheLock) {
    bed::ResetLog();
    FirstInstance first;
    ASSERT_TRUE(first.Start());
    // Other programs find the running application by the nine-unit name, not the readable one.
    HANDLE probe = OpenMutexW(SYNCHRONIZE, FALSE, handoff::kLockName);
    EXPECT_NE(probe, nullptr) << "error " << GetLastError();
    if (probe != nullptr) CloseHandle(probe);
    EXPECT_EQ(OpenMutexW(SYNCHRONIZE, FALSE, handoff::kReadableName), nullptr);

    const std::string logBefore = bed::ReadFileBytes(bed::LogPath());
    ASSERT_FALSE(logBefore.empty());
    std::wstring secondDir = bed::MakeAppDir(), longArgument;
    for (int i = 0; i < 5000; ++i) longArgument.push_back(static_cast<wchar_t>(0x100 + (i * 37) % 0xD000));
    const struct {
        std::wstring args;     // as typed after the program path
        std::string expected;  // bytes the running application receives
    } cases[] = {
        {L"", "002d006e"},  // no arguments: "-n"
        {L"C:\\a.dat", "0043003a005c0061002e006400610074"},
        {L"-noSplash -x C:\\a.dat", "002d006e006f00530070006c006100730068" "002d0078" "0043003a005c0061002e006400610074"},
        {L"x \"\" \"\" y", "0078" "0078" "0078" "0079"},  // an empty one repeats the one before
        {L"\"\" x", "0078"},
        {L"\"\"", ""},
        {L"\xD83D\xDE00 \x00E9\x00AB", "d83dde00" "00e9" "00ab"},
        {longArgument + L" z", handoff::Hex(longArgument) + "007a"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.expected.substr(0, 80));
        Listener listener;
        ASSERT_TRUE(listener.Start());
        bed::RunResult second = handoff::RunSecond(secondDir, c.args);
        listener.Finish();
        EXPECT_EQ(second.exitCode, 0u);
        EXPECT_TRUE(second.boxes.empty());
        EXPECT_TRUE(listener.accepted && listener.endedByClose) << "no connection, or not closed after the last byte";
        EXPECT_FALSE(listener.extraConnection);
        EXPECT_TRUE(listener.received == c.expected) << listener.received.substr(0, 200);
    }

    // The application drops the connection after the first argument: still 0, at once.
    Listener early;
    ASSERT_TRUE(early.Start(8));
    DWORD start = GetTickCount();
    bed::RunResult second = handoff::RunSecond(secondDir, L"-x " + std::wstring(5000, L'\x4E2D') + L" " + longArgument);
    EXPECT_LT(GetTickCount() - start, 10000u);
    early.Finish();
    EXPECT_EQ(second.exitCode, 0u);
    EXPECT_EQ(early.received, "002d0078");

    EXPECT_TRUE(bed::ReadFileBytes(bed::LogPath()) == logBefore) << "a second instance wrote into the log";
    EXPECT_TRUE(bed::ReadRecord(secondDir).empty()) << "a second instance loaded the VM";
    EXPECT_EQ(first.Stop().exitCode, 0u);
    EXPECT_EQ(OpenMutexW(SYNCHRONIZE, FALSE, handoff::kLockName), nullptr);
    FirstInstance again;
    EXPECT_TRUE(again.Start()) << "the next start after the first one ended is a first instance again";
}

// Nobody listens: five connects, each failure followed by a 5 s pause, then exit 0 (about 25 s).
// Under Wine a connect retried on a socket whose first attempt was refused fails even when a
// listener is up by then, so the later attempts show here only through their pauses.
TEST(SecondStart, WithoutListenerGivesUpAfterFiveAttempts) {
    FirstInstance first;
    ASSERT_TRUE(first.Start());
    std::wstring secondDir = bed::MakeAppDir();
    DWORD start = GetTickCount();
    bed::RunResult second = handoff::RunSecond(secondDir, L"C:\\a.dat");
    DWORD elapsed = GetTickCount() - start;
    EXPECT_EQ(second.exitCode, 0u);
    EXPECT_TRUE(second.boxes.empty());
    EXPECT_GE(elapsed, 24500u);  // four pauses would be 20 s, six 30 s
    EXPECT_LT(elapsed, 29500u);
    EXPECT_TRUE(bed::ReadRecord(secondDir).empty());
}

}  // namespace
