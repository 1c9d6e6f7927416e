// The VM option list as the VM double receives it: the fixed options, "-noSplash" once per
// matching argument, and the two special-folder options as the prefix's folders allow, each byte
// of each option checked.
#include <gtest/gtest.h>

#include "support/expect.h"
#include "support/testbed.h"
#include "test_jvm_support.h"

namespace {

using jvmtest::FixedOptions;

struct Launch {
    std::wstring app;
    bed::RunResult run;
    jvmtest::Record record;
};

Launch RunWith(const std::wstring& args, const std::wstring& app = bed::MakeAppDir()) {
    Launch launch;
    launch.app = app;
    launch.run = bed::RunLauncher(app, args);
    launch.record = jvmtest::ReadRecord(app);
    EXPECT_FALSE(launch.run.timedOut);
    EXPECT_EQ(launch.run.exitCode, 0u);
    EXPECT_EQ(launch.record.createLine, jvmtest::CreateLine(launch.record.options.size()));
    return launch;
}

std::string AppDataOption() { return "-Duser.appdata.path=" + bed::ToUtf8(jvmtest::Folder(CSIDL_APPDATA)); }
std::string TempOption() { return "-Duser.temp.path=" + bed::ToUtf8(jvmtest::Folder(CSIDL_APPDATA)); }

std::vector<std::string> Concat(std::vector<std::string> head, const std::vector<std::string>& tail) {
    head.insert(head.end(), tail.begin(), tail.end());
    return head;
}

TEST(VmOptions, WithoutTheSwitch) {
    Launch launch = RunWith(L"file.qz57");
    EXPECT_EQ(launch.record.options, Concat(FixedOptions(bed::ToUtf8(launch.app)), {AppDataOption(), TempOption()}));
    EXPECT_EQ(launch.record.calls.back(), "DestroyJavaVM");
}

struct SwitchCase {
    const wchar_t* args;
    size_t times;
};

TEST(VmOptions, NoSplashOncePerMatchingArgumentInAnyCase) {
    const SwitchCase cases[] = {
        {L"-noSplash", 1},
        {L"file.qz57 -noSplash", 1},
        {L"-noSplash file.qz57 -noSplash", 2},
        {L"-NOSPLASH x -nOsPlAsH", 2},
        {L"-noSplashX noSplash --noSplash \"-noSplash \"", 0},
    };
    for (const SwitchCase& c : cases) {
        Launch launch = RunWith(c.args);
        std::vector<std::string> expected = FixedOptions(bed::ToUtf8(launch.app));
        expected.insert(expected.end(), c.times, jvmtest::kNoSplashOption);
        expected.push_back(AppDataOption());
        expected.push_back(TempOption());
        EXPECT_EQ(launch.record.options, expected) << bed::ToUtf8(c.args);
    }
}

TEST(VmOptions, TheExecutablesOwnArgumentIsScannedToo) {
    // argv[0] "-noSplash" names no directory: the working directory stays the application's.
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::Run(bed::AppExe(app), L"-noSplash file.qz57", app);
    EXPECT_EQ(run.exitCode, 0u);
    std::vector<std::string> expected = FixedOptions(bed::ToUtf8(app));
    expected.push_back(jvmtest::kNoSplashOption);
    expected.push_back(AppDataOption());
    expected.push_back(TempOption());
    EXPECT_EQ(jvmtest::ReadRecord(app).options, expected);
}

const wchar_t kPerUser[] = L"AppData";
const wchar_t kAllUsers[] = L"Common AppData";

TEST(VmOptions, PerUserFolderMissing) {
    // The failed query still fills its buffer; the temp-path option must not carry that text.
    jvmtest::FolderOverride gone(HKEY_CURRENT_USER, kPerUser, L"C:\\qz-no-such-appdata");
    Launch launch = RunWith(L"-noSplash");
    std::vector<std::string> expected = FixedOptions(bed::ToUtf8(launch.app));
    expected.push_back(jvmtest::kNoSplashOption);
    expected.push_back("-Duser.temp.path=");
    EXPECT_EQ(launch.record.options, expected);
}

TEST(VmOptions, AllUsersFolderMissing) {
    jvmtest::FolderOverride gone(HKEY_LOCAL_MACHINE, kAllUsers, L"C:\\qz-no-such-programdata");
    Launch launch = RunWith(L"x");
    EXPECT_EQ(launch.record.options, Concat(FixedOptions(bed::ToUtf8(launch.app)), {AppDataOption()}));
}

TEST(VmOptions, BothFoldersMissing) {
    jvmtest::FolderOverride userGone(HKEY_CURRENT_USER, kPerUser, L"C:\\qz-no-such-appdata");
    jvmtest::FolderOverride allGone(HKEY_LOCAL_MACHINE, kAllUsers, L"C:\\qz-no-such-programdata");
    Launch launch = RunWith(L"x");
    EXPECT_EQ(launch.record.options, FixedOptions(bed::ToUtf8(launch.app)));
}

TEST(VmOptions, FolderPathsKeepTheLowByteOfEachUnit) {
    // U+0416 keeps 0x16, U+00E9 0xe9, U+4E2D 0x2d ('-'); U+0100 has a zero low byte and ends the text.
    const std::wstring perUser = L"C:\\qz-\x0416\x00e9\x4e2d";
    const std::wstring allUsers = L"C:\\qz-all-\x0416";
    ASSERT_TRUE(CreateDirectoryW(perUser.c_str(), nullptr) || GetLastError() == ERROR_ALREADY_EXISTS);
    ASSERT_TRUE(CreateDirectoryW(allUsers.c_str(), nullptr) || GetLastError() == ERROR_ALREADY_EXISTS);
    {
        jvmtest::FolderOverride user(HKEY_CURRENT_USER, kPerUser, perUser);
        jvmtest::FolderOverride all(HKEY_LOCAL_MACHINE, kAllUsers, allUsers);
        Launch launch = RunWith(L"x");
        EXPECT_EQ(launch.record.options, Concat(FixedOptions(bed::ToUtf8(launch.app)),
                                                {"-Duser.appdata.path=C:\\qz-\\x16\\xe9-", "-Duser.temp.path=C:\\qz-\\x16\\xe9-"}));
    }
    const std::wstring cut = L"C:\\qz-\x00fc\x0100rest";
    ASSERT_TRUE(CreateDirectoryW(cut.c_str(), nullptr) || GetLastError() == ERROR_ALREADY_EXISTS);
    {
        jvmtest::FolderOverride user(HKEY_CURRENT_USER, kPerUser, cut);
        Launch launch = RunWith(L"x");
        EXPECT_EQ(launch.record.options, Concat(FixedOptions(bed::ToUtf8(launch.app)),
                                                {"-Duser.appdata.path=C:\\qz-\\xfc", "-Duser.temp.path=C:\\qz-\\xfc"}));
    }
    RemoveDirectoryW(perUser.c_str());
    RemoveDirectoryW(allUsers.c_str());
    RemoveDirectoryW(cut.c_str());
}

TEST(VmOptions, ApplicationDirectoryInTheAnsiCodePage) {
    // The class and library paths are converted with the code page: characters it cannot hold
    // arrive as its default character, those it can (U+00FC) as their code-page byte.
    std::wstring made = bed::MakeAppDir();
    std::wstring app = made + L"-\x00fc\x0416\x6587";
    ASSERT_TRUE(MoveFileW(made.c_str(), app.c_str()));
    Launch launch = RunWith(L"-noSplash", app);
    const std::string narrow = jvmtest::Ansi(app);
    ASSERT_EQ(GetACP(), 1252u) << "the expected bytes below are those of code page 1252";
    EXPECT_EQ(narrow.substr(narrow.size() - 4), "-\xfc??");
    ASSERT_GE(launch.record.options.size(), 7u);
    EXPECT_EQ(launch.record.options[0], "-Djava.class.path=" + jvmtest::Escaped(narrow) + "\\emu57.jar");
    EXPECT_EQ(launch.record.options[6], "-Djava.library.path=" + jvmtest::Escaped(narrow));
}

}  // namespace
