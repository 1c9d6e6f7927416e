// The VM option list as the VM double receives it, byte for byte: the fixed options, "-noSplash"
// once per matching argument, and the two special-folder options as the prefix's folders allow.
#include <gtest/gtest.h>
#include <shlobj.h>

#include "support/testbed.h"
#include "test_jvm_support.h"

namespace {

const char kNoSplash[] = "-Dapp.lumiscope57.noSplash=true";

std::vector<std::string> OptionsOf(const std::wstring& app, const std::wstring& commandLine) {
    bed::RunResult run = bed::Run(bed::AppExe(app), commandLine, app);
    EXPECT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, 0u);
    return jvmtest::ReadRecord(app).options;
}

std::wstring LauncherLine(const std::wstring& app, const std::wstring& args) {
    return bed::Quote(bed::AppExe(app)) + L" " + args;
}

std::vector<std::string> Expected(const std::string& app, const std::vector<std::string>& tail) {
    std::vector<std::string> options = jvmtest::FixedOptions(app);
    options.insert(options.end(), tail.begin(), tail.end());
    return options;
}

// Both folder options as the prefix's own folders give them (the temp path is the per-user one).
std::vector<std::string> DefaultFolders() {
    wchar_t path[MAX_PATH] = {0};
    SHGetFolderPathW(nullptr, CSIDL_APPDATA, nullptr, SHGFP_TYPE_CURRENT, path);
    return {"-Duser.appdata.path=" + bed::ToUtf8(path), "-Duser.temp.path=" + bed::ToUtf8(path)};
}

TEST(VmOptions, NoSplashOncePerMatchingArgumentInAnyCase) {
    const struct {
        const wchar_t* args;
        size_t times;
        bool wholeLine;  // args is the whole command line, argv[0] included
    } cases[] = {
        {L"file.qz57", 0},
        {L"-noSplash", 1},
        {L"file.qz57 -noSplash", 1},
        {L"-noSplash file.qz57 -noSplash", 2},
        {L"-NOSPLASH x -nOsPlAsH", 2},
        {L"-noSplashX noSplash --noSplash \"-noSplash \"", 0},
        // argv[0] is scanned too; naming no directory, it leaves the working directory alone.
        {L"-noSplash file.qz57", 1, true},
    };
    for (const auto& c : cases) {
        std::wstring app = bed::MakeAppDir();
        std::vector<std::string> tail(c.times, kNoSplash), folders = DefaultFolders();
        tail.insert(tail.end(), folders.begin(), folders.end());
        std::wstring line = c.wholeLine ? c.args : LauncherLine(app, c.args);
        EXPECT_EQ(OptionsOf(app, line), Expected(bed::ToUtf8(app), tail)) << bed::ToUtf8(line);
    }
}

// Each folder query failing through the prefix's registry, and the per-user path narrowed to the
// low byte of each unit up to a zero one (U+0416 -> 0x16, U+00E9 -> 0xe9, U+4E2D -> '-', U+0100 ends
// it). A failed query still fills its buffer: the temp path must then be empty.
TEST(VmOptions, SpecialFolders) {
    const std::wstring missing = L"C:\\qz-no-such-folder", user = L"C:\\qz-\x0416\x00e9\x4e2d\x0100rest";
    const std::wstring all = L"C:\\qz-all";
    const std::string narrowed = "C:\\qz-\\x16\\xe9-";
    const struct {
        const wchar_t* args;
        std::wstring user, all;
        std::vector<std::string> tail;
    } cases[] = {
        {L"-noSplash", missing, all, {kNoSplash, "-Duser.temp.path="}},
        {L"x", user, missing, {"-Duser.appdata.path=" + narrowed}},
        {L"x", missing, missing, {}},
        {L"x", user, all, {"-Duser.appdata.path=" + narrowed, "-Duser.temp.path=" + narrowed}},
    };
    ASSERT_TRUE(CreateDirectoryW(user.c_str(), nullptr) || GetLastError() == ERROR_ALREADY_EXISTS);
    ASSERT_TRUE(CreateDirectoryW(all.c_str(), nullptr) || GetLastError() == ERROR_ALREADY_EXISTS);
    for (const auto& c : cases) {
        bed::FolderOverride userFolder(HKEY_CURRENT_USER, L"AppData", c.user);
        bed::FolderOverride allFolder(HKEY_LOCAL_MACHINE, L"Common AppData", c.all);
        std::wstring app = bed::MakeAppDir();
        EXPECT_EQ(OptionsOf(app, LauncherLine(app, c.args)), Expected(bed::ToUtf8(app), c.tail));
    }
    RemoveDirectoryW(user.c_str());
    RemoveDirectoryW(all.c_str());
}

TEST(VmOptions, ApplicationDirectoryInTheAnsiCodePage) {
    // Class and library paths go through code page 1252: U+00FC is its byte 0xfc, U+0416 and
    // U+6587 its default character.
    ASSERT_EQ(GetACP(), 1252u);
    std::wstring made = bed::MakeAppDir(), app = made + L"-\x00fc\x0416\x6587";
    ASSERT_TRUE(MoveFileW(made.c_str(), app.c_str()));
    std::vector<std::string> tail = DefaultFolders();
    tail.insert(tail.begin(), kNoSplash);
    EXPECT_EQ(OptionsOf(app, LauncherLine(app, L"-noSplash")), Expected(bed::ToUtf8(made) + "-\\xfc??", tail));
}

}  // namespace
