// The launcher's log, byte for byte: UTF-16LE without a byte-order mark, four pieces per line, the
// start line's extra line feed, the end line's trailing blank.
#include <gtest/gtest.h>

#include <shlobj.h>

#include <ctime>
#include <regex>

#include "support/expect.h"
#include "support/testbed.h"

namespace {

// The start line's date is the only part that changes from run to run. It must be the C runtime's
// asctime layout with a zero-padded day ("Sat Nov 21 09:05:03 2026") and close to now.
void ExpectRecentDate(const std::string& date) {
    static const std::regex layout("(Sun|Mon|Tue|Wed|Thu|Fri|Sat) (Jan|Feb|Mar|Apr|May|Jun|Jul|Aug|Sep|Oct|Nov|Dec) "
                                   "[0-3][0-9] [0-2][0-9]:[0-5][0-9]:[0-5][0-9] [0-9]{4}");
    ASSERT_TRUE(std::regex_match(date, layout)) << date;
    std::tm parsed = {};
    static const char* months = "JanFebMarAprMayJunJulAugSepOctNovDec";
    parsed.tm_mon = static_cast<int>(std::string(months).find(date.substr(4, 3)) / 3);
    parsed.tm_mday = std::stoi(date.substr(8, 2));
    parsed.tm_hour = std::stoi(date.substr(11, 2));
    parsed.tm_min = std::stoi(date.substr(14, 2));
    parsed.tm_sec = std::stoi(date.substr(17, 2));
    parsed.tm_year = std::stoi(date.substr(20, 4)) - 1900;
    parsed.tm_isdst = -1;
    double age = std::difftime(std::time(nullptr), std::mktime(&parsed));
    EXPECT_GE(age, -5);
    EXPECT_LE(age, 300) << date;
}

// Checks the whole file against the start line followed by `rest`, exactly.
void ExpectLog(const std::string& bytes, const std::string& rest) {
    const std::string prefix = bed::Utf16Bytes(expect::kStartPrefix);
    ASSERT_GE(bytes.size(), prefix.size() + 2 * 24);
    ASSERT_EQ(bytes.substr(0, prefix.size()), prefix) << "no byte-order mark, start line first";
    std::string date;
    for (size_t i = 0; i < 24; ++i) {
        ASSERT_EQ(bytes[prefix.size() + 2 * i + 1], '\0');
        date.push_back(bytes[prefix.size() + 2 * i]);
    }
    ExpectRecentDate(date);
    const std::string expected = prefix + bed::Utf16Bytes(date) + bed::Utf16Bytes("\n\r\n" + rest);
    EXPECT_EQ(bytes.size(), expected.size());
    EXPECT_EQ(bytes, expected);
}

const std::string kProgress = expect::Line("Preliminary Definitions", 0) + expect::Line("CL interpretation", 0);
const std::string kEnd = expect::Line("Successful launch end.", 0) + expect::kEndLine;

TEST(Log, WholeSuccessfulRun) {
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::RunLauncher(app, L"-noSplash");
    ASSERT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, 0u);
    ExpectLog(bed::ReadFileBytes(bed::LogPath()), kProgress + kEnd);
}

TEST(Log, FailedVmLoadStillEndsTheLog) {
    bed::ResetLog();
    bed::AppOptions options;
    options.vm = bed::Vm::None;
    bed::RunResult run = bed::RunLauncher(bed::MakeAppDir(options), L"-noSplash");
    EXPECT_EQ(run.exitCode, 0xFFFFFFFFu);
    ExpectLog(bed::ReadFileBytes(bed::LogPath()), kProgress + kEnd);
}

TEST(Log, SecondRunTruncatesTheLog) {
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    // A long earlier log: a run that only truncated part of it would leave a tail behind.
    {
        HANDLE h = CreateFileW(bed::LogPath().c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
        ASSERT_NE(h, INVALID_HANDLE_VALUE);
        std::string old(64 * 1024, 'x');
        DWORD done = 0;
        WriteFile(h, old.data(), static_cast<DWORD>(old.size()), &done, nullptr);
        CloseHandle(h);
    }
    ASSERT_EQ(bed::RunLauncher(app, L"-noSplash").exitCode, 0u);
    ASSERT_EQ(bed::RunLauncher(app, L"-noSplash").exitCode, 0u);
    ExpectLog(bed::ReadFileBytes(bed::LogPath()), kProgress + kEnd);
}

TEST(Log, MissingLogsFolderLeavesNoFileAndLaunchCompletes) {
    bed::ResetLog(false);
    ASSERT_FALSE(bed::FileExists(bed::LogDir()));
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::RunLauncher(app, L"-noSplash");
    EXPECT_EQ(run.exitCode, 0u);
    EXPECT_FALSE(bed::FileExists(bed::LogPath()));
    EXPECT_FALSE(bed::FileExists(bed::LogDir())) << "the log never creates its folder";
    // The launch itself went all the way: main ran and the VM was destroyed.
    std::vector<std::string> record = bed::ReadRecord(app);
    ASSERT_FALSE(record.empty());
    EXPECT_EQ(record.back(), "DestroyJavaVM");
    bed::ResetLog();
}

TEST(Log, LogHeldOpenByAnotherProcessIsLeftAlone) {
    bed::ResetLog();
    HANDLE held = CreateFileW(bed::LogPath().c_str(), GENERIC_WRITE, FILE_SHARE_READ, nullptr, CREATE_ALWAYS,
                              FILE_ATTRIBUTE_NORMAL, nullptr);
    ASSERT_NE(held, INVALID_HANDLE_VALUE);
    DWORD done = 0;
    WriteFile(held, "held", 4, &done, nullptr);
    std::wstring app = bed::MakeAppDir();
    bed::RunOptions options;
    options.captureOutput = true;
    bed::RunResult run = bed::RunLauncher(app, L"-noSplash", options);
    CloseHandle(held);
    EXPECT_EQ(run.exitCode, 0u);
    EXPECT_EQ(bed::ReadFileBytes(bed::LogPath()), "held");
    // Every piece of the three lines and the end line is attempted on the failed handle, and each
    // failure is reported on standard output (which a windowed launcher normally has not). The
    // C runtime's text-mode stream writes the line feed as CR LF.
    std::string failed = "WriteFile failed with error 6.\r\n";
    std::string expected;
    for (int i = 0; i < 4 * 4; ++i) expected += failed;
    EXPECT_EQ(run.output, expected);
    std::vector<std::string> record = bed::ReadRecord(app);
    ASSERT_FALSE(record.empty());
    EXPECT_EQ(record.back(), "DestroyJavaVM");
}

TEST(Log, ProcessEndedFromInsideMainWritesNoClosingLines) {
    // System.exit from the Java side ends the process inside main: the log keeps what was written.
    bed::ResetLog();
    bed::AppOptions options;
    options.script = "main_exit=1012\n";
    bed::RunResult run = bed::RunLauncher(bed::MakeAppDir(options), L"-noSplash");
    EXPECT_EQ(run.exitCode, 1012u);
    EXPECT_TRUE(run.boxes.empty());
    ExpectLog(bed::ReadFileBytes(bed::LogPath()), kProgress);
}

}  // namespace

namespace {

TEST(Log, UnknownDocumentsFolderMeansNoLogAndTheLaunchCompletes) {
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run;
    {
        // Below a file: the folder can neither exist nor be created.
        bed::FolderOverride documents(HKEY_CURRENT_USER, L"Personal", L"C:\\windows\\system32\\kernel32.dll\\Documents");
        wchar_t path[MAX_PATH] = {0};
        ASSERT_LT(SHGetFolderPathW(nullptr, CSIDL_PERSONAL | CSIDL_FLAG_CREATE, nullptr, 0, path), 0)
            << "the prefix still resolves the documents folder: " << bed::ToUtf8(path);
        bed::RunOptions options;
        options.captureOutput = true;
        run = bed::RunLauncher(app, L"-noSplash", options);
    }
    EXPECT_EQ(run.exitCode, 0u);
    EXPECT_FALSE(bed::FileExists(bed::LogPath()));
    // The open with an empty path failed, so every line was attempted on the failed handle.
    EXPECT_NE(run.output.find("WriteFile failed with error 6."), std::string::npos) << run.output;
    std::vector<std::string> record = bed::ReadRecord(app);
    ASSERT_FALSE(record.empty());
    EXPECT_EQ(record.back(), "DestroyJavaVM");
}

}  // namespace
