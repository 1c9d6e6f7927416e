// The start-up sequence seen from outside: exit codes of each path (full 32 bits, read by the
// runner), the error box's caption with and without the string table, the application directory
// made current, "-noSplash" in any letter case.
#include <gtest/gtest.h>

#include "support/expect.h"
#include "support/testbed.h"

namespace {

struct PathCase {
    const char* name;
    std::string script;
    bed::Vm vm;
    bool withStrings;
    DWORD exitCode;
    std::vector<std::string> boxes;  // texts, in order
};

class ExitCodes : public ::testing::TestWithParam<PathCase> {};

TEST_P(ExitCodes, OfEachPath) {
    const PathCase& c = GetParam();
    bed::ResetLog();
    bed::AppOptions options;
    options.vm = c.vm;
    options.withStrings = c.withStrings;
    options.script = c.script;
    bed::RunResult run = bed::RunLauncher(bed::MakeAppDir(options), L"-noSplash");
    ASSERT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, c.exitCode);
    std::vector<std::string> texts;
    for (const auto& box : run.boxes) {
        texts.push_back(box.text);
        EXPECT_EQ(box.caption, c.withStrings ? expect::kCaption : expect::kNoStringsCaption);
        EXPECT_TRUE(box.errorIcon);
    }
    EXPECT_EQ(texts, c.boxes);
}

INSTANTIATE_TEST_SUITE_P(
    Launcher, ExitCodes,
    ::testing::Values(
        PathCase{"Success", "", bed::Vm::Double, true, 0, {expect::DestroyBox(0)}},
        PathCase{"DestroyResultIsTheExitCode", "destroy_result=7\n", bed::Vm::Double, true, 7, {expect::DestroyBox(7)}},
        PathCase{"NegativeDestroyResultKeepsAll32Bits", "destroy_result=-5\n", bed::Vm::Double, false, 0xFFFFFFFBu,
                 {expect::DestroyBox(-5)}},
        PathCase{"VmLibraryMissing", "", bed::Vm::None, true, 0xFFFFFFFFu, {expect::kVmNotLoaded}},
        PathCase{"VmLibraryMissingNoStrings", "", bed::Vm::None, false, 0xFFFFFFFFu, {}},
        PathCase{"VmNotCreated", "create_result=-6\n", bed::Vm::Double, true, 0xFFFFFFFAu, {expect::kVmNotCreated}},
        PathCase{"VmNotCreatedNoStrings", "create_result=-6\n", bed::Vm::Double, false, 0xFFFFFFFDu, {}},
        PathCase{"SystemExitFromMain", "main_exit=42\n", bed::Vm::Double, true, 42, {}}),
    [](const ::testing::TestParamInfo<PathCase>& info) { return std::string(info.param.name); });

TEST(Startup, ProgramPathWithoutDirectoryKeepsTheWorkingDirectory) {
    // Started through the search path: argv[0] has no directory, the current directory stays the
    // one the launcher was started in, and the VM library is still found relative to it.
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::Run(bed::AppExe(app), L"QZ-Lumiscope_QZ-57.exe -noSplash", app);
    EXPECT_EQ(run.exitCode, 0u);
    std::vector<std::string> record = bed::ReadRecord(app);
    ASSERT_GE(record.size(), 2u);
    EXPECT_EQ(record[1], "option[0]=-Djava.class.path=" + bed::ToUtf8(app) + "\\emu57.jar extraInfo=null");
}

TEST(Startup, ApplicationDirectoryBecomesCurrentFromAnyWorkingDirectory) {
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    wchar_t windows[MAX_PATH];
    GetWindowsDirectoryW(windows, MAX_PATH);
    bed::RunResult run = bed::Run(bed::AppExe(app), bed::Quote(bed::AppExe(app)) + L" -noSplash", windows);
    EXPECT_EQ(run.exitCode, 0u);
    std::vector<std::string> record = bed::ReadRecord(app);
    ASSERT_FALSE(record.empty()) << "the VM library was not found from the application directory";
    EXPECT_EQ(record.back(), "DestroyJavaVM");
}

bool SplashShownWith(const std::wstring& args) {
    bed::ResetLog();
    std::wstring app = bed::MakeAppDir();
    bed::WriteScript(app, "main_until_file=stop.flag\n");
    std::wstring line = bed::Quote(bed::AppExe(app)) + L" " + args;
    bed::Running* running = bed::Start(bed::AppExe(app), line, app);
    // main is running once the double has recorded the call; the splash is up long before that.
    bool inMain = bed::WaitFor([&] { return bed::RecordHas(app, "CallStaticVoidMethodV"); }, 20000);
    bool shown = inMain && bed::WaitForSplash(bed::ProcessId(running), 1000) != nullptr;
    bed::Touch(app, L"stop.flag");
    bed::RunResult run = bed::Finish(running);
    EXPECT_TRUE(inMain);
    EXPECT_EQ(run.exitCode, 0u);
    return shown;
}

TEST(Startup, NoSplashFirstInAnyLetterCaseSuppressesTheSplash) {
    EXPECT_FALSE(SplashShownWith(L"-noSplash"));
    EXPECT_FALSE(SplashShownWith(L"-NOSPLASH"));
    EXPECT_FALSE(SplashShownWith(L"-nosplash x"));
}

TEST(Startup, SplashShowsWithoutTheSwitchOrWithItLater) {
    EXPECT_TRUE(SplashShownWith(L""));
    EXPECT_TRUE(SplashShownWith(L"file.dat -noSplash"));
}

}  // namespace
