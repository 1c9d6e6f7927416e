// Every path through the VM host, with and without the string table: the exit code, the boxes in
// their order, how far the VM double got, and that the splash is still up while each box shows
// (it closes only after the last one). Also the VM library's C runtime found in the runtime's bin
// folder, and the library found through the current directory.
#include <gtest/gtest.h>

#include <stdio.h>

#include "support/expect.h"
#include "support/testbed.h"
#include "test_jvm_support.h"

namespace {

using jvmtest::kMain;

// What sits at jre\bin\client\jvm.dll (and next to it).
enum class Library {
    Double,
    None,
    NoEntryPoint,         // a loadable DLL without JNI_CreateJavaVM
    NotADll,              // a file that is no image at all
    NeedsRuntime,         // the double's variant importing from jre\bin\vmdouble_rt.dll, with that DLL
    NeedsRuntimeMissing,  // the same variant without the DLL
};

std::wstring MakeApp(Library library, bool withStrings, const std::string& script) {
    bed::AppOptions options;
    options.withStrings = withStrings;
    options.script = script;
    options.vm = library == Library::Double ? bed::Vm::Double : bed::Vm::None;
    std::wstring app = bed::MakeAppDir(options), dll = bed::VmDoubleDll();
    const std::wstring build = dll.substr(0, dll.find_last_of(L"\\/")), vm = app + L"\\jre\\bin\\client\\jvm.dll";
    if (library == Library::NoEntryPoint) EXPECT_TRUE(CopyFileW((build + L"\\vmdouble_rt.dll").c_str(), vm.c_str(), FALSE));
    if (library == Library::NeedsRuntime)
        EXPECT_TRUE(CopyFileW((build + L"\\vmdouble_rt.dll").c_str(), (app + L"\\jre\\bin\\vmdouble_rt.dll").c_str(), FALSE));
    if (library == Library::NeedsRuntime || library == Library::NeedsRuntimeMissing)
        EXPECT_TRUE(CopyFileW((build + L"\\jvm_dep\\jvm.dll").c_str(), vm.c_str(), FALSE));
    if (library == Library::NotADll) {
        FILE* file = _wfopen(vm.c_str(), L"wb");
        fputs("MZ but nothing else a loader could use", file);
        fclose(file);
    }
    return app;
}

const std::vector<std::string> kNoRecord = {"<no record>"};
const std::vector<std::string> kNormal = jvmtest::NormalCalls({"00660069006c0065002e00710037"});  // "file.q7"

struct PathCase {
    const char* name;
    Library library;
    std::string script;
    DWORD exitCode;  // with the string table
    std::vector<std::string> boxes;
    DWORD exitCodeNoStrings;
    std::vector<std::string> calls;  // after the options; kNoRecord: the double never ran
};

void PrintTo(const PathCase& c, std::ostream* out) { *out << c.name; }

class VmHostPaths : public ::testing::TestWithParam<std::tuple<PathCase, bool>> {};

TEST_P(VmHostPaths, ResultBoxesAndCalls) {
    const PathCase& c = std::get<0>(GetParam());
    const bool withStrings = std::get<1>(GetParam());
    std::wstring app = MakeApp(c.library, withStrings, c.script);
    // Without strings only the destroy box is left, shown whenever the VM was destroyed.
    std::vector<std::string> boxes = c.boxes;
    bool destroyed = !c.calls.empty() && c.calls.back() == "DestroyJavaVM";
    if (!withStrings) boxes.assign(destroyed ? boxes.end() - 1 : boxes.end(), boxes.end());

    // Not "-noSplash": the splash runs and must still be there while each box shows.
    std::vector<bool> splashDuringBox;
    bed::RunOptions options;
    options.onBox = [&splashDuringBox](const bed::MessageBoxInfo&, HWND box) {
        DWORD pid = 0;
        GetWindowThreadProcessId(box, &pid);
        splashDuringBox.push_back(bed::WaitForSplash(pid, 3000) != nullptr);
    };
    bed::RunResult run = bed::RunLauncher(app, L"file.q7", options);
    ASSERT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, withStrings ? c.exitCode : c.exitCodeNoStrings);
    std::vector<std::string> texts;
    for (const bed::MessageBoxInfo& box : run.boxes) {
        texts.push_back(box.text);
        EXPECT_EQ(box.caption, withStrings ? expect::kCaption : expect::kNoStringsCaption);
        EXPECT_TRUE(box.errorIcon);
    }
    EXPECT_EQ(texts, boxes);
    EXPECT_EQ(splashDuringBox, std::vector<bool>(boxes.size(), true));

    jvmtest::Record record = jvmtest::ReadRecord(app);
    if (c.calls == kNoRecord) {
        EXPECT_TRUE(record.lines.empty());
    } else {
        EXPECT_EQ(record.options.size(), 12u);  // whenever the double ran, the whole list reached it
        EXPECT_EQ(record.calls, c.calls);
    }
}

const std::string kMainMissing = "missing_class=" + kMain + "\n";
const DWORD kFail = 0xFFFFFFFFu, kSilent = 0xFFFFFFFDu;

INSTANTIATE_TEST_SUITE_P(
    Launcher, VmHostPaths,
    ::testing::Combine(
        ::testing::Values(
            // main runs long enough for the splash to be up before the boxes.
            PathCase{"Normal", Library::Double, "main_ms=300\ndestroy_result=12\n", 12, {expect::DestroyBox(12)}, 12, kNormal},
            PathCase{"LibraryMissing", Library::None, "", kFail, {expect::kVmNotLoaded}, kFail, kNoRecord},
            PathCase{"LibraryNotAnImage", Library::NotADll, "", kFail, {expect::kVmNotLoaded}, kFail, kNoRecord},
            PathCase{"EntryPointMissing", Library::NoEntryPoint, "", kFail, {expect::kVmNotCreated}, kSilent, kNoRecord},
            PathCase{"CreationFails", Library::Double, "create_result=-6\n", 0xFFFFFFFAu, {expect::kVmNotCreated}, kSilent, {}},
            PathCase{"CreationFailsPositive", Library::Double, "create_result=1\n", 1, {expect::kVmNotCreated}, kSilent, {}},
            PathCase{"MainClassMissing", Library::Double, kMainMissing + "destroy_result=3\n", 3,
                     {expect::kMainNotCalled, expect::DestroyBox(3)}, 3,
                     {"FindClass java/lang/String", "FindClass " + kMain + " -> null", "DestroyJavaVM"}},
            // Both lookups are made before either result is tested.
            PathCase{"StringClassMissing", Library::Double, "missing_class=java/lang/String\n", 0,
                     {expect::kMainNotCalled, expect::DestroyBox(0)}, 0,
                     {"FindClass java/lang/String -> null", "FindClass " + kMain, "DestroyJavaVM"}},
            PathCase{"MainMethodMissing", Library::Double, "missing_method=1\ndestroy_result=-9\n", 0xFFFFFFF7u,
                     {expect::kMainNotCalled, expect::DestroyBox(-9)}, 0xFFFFFFF7u,
                     {"FindClass java/lang/String", "FindClass " + kMain, jvmtest::kMainMethod + " -> null",
                      "DestroyJavaVM"}},
            // The VM library's own C runtime sits in jre\bin, outside the standard search.
            PathCase{"NeedsRuntimeBin", Library::NeedsRuntime, "", 0, {expect::DestroyBox(0)}, 0, kNormal},
            PathCase{"NeedsRuntimeBinMissing", Library::NeedsRuntimeMissing, "", kFail, {expect::kVmNotLoaded}, kFail,
                     kNoRecord}),
        ::testing::Bool()),
    [](const ::testing::TestParamInfo<std::tuple<PathCase, bool>>& info) {
        return std::string(std::get<0>(info.param).name) + (std::get<1>(info.param) ? "" : "NoStrings");
    });

TEST(VmLibrary, FoundThroughTheCurrentDirectoryWhenTheExecutableLivesElsewhere) {
    // The program file comes from a directory without a runtime; argv[0] names another one, which
    // becomes the current directory and holds jre\bin\client\jvm.dll.
    std::wstring bare = MakeApp(Library::None, true, ""), app = MakeApp(Library::Double, true, "");
    bed::RunResult run = bed::Run(bed::AppExe(bare), bed::Quote(bed::AppExe(app)) + L" -noSplash", bare);
    EXPECT_EQ(run.exitCode, 0u);
    jvmtest::Record record = jvmtest::ReadRecord(app);
    ASSERT_EQ(record.options.size(), 13u);
    EXPECT_EQ(record.options[0], "-Djava.class.path=" + bed::ToUtf8(app) + "\\emu57.jar");
    EXPECT_EQ(record.calls.back(), "DestroyJavaVM");
}

}  // namespace
