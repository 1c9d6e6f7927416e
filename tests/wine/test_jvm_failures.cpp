// Every path through the VM host with and without the string table: the exit code, the boxes in
// their order, how far the VM double got (creation, main, destroy), and that the splash is still
// up while each box shows (it is closed only after the last box). Also the VM library's C runtime
// found in the runtime's bin folder, and the library found through the current directory.
#include <gtest/gtest.h>

#include "support/expect.h"
#include "support/testbed.h"
#include "test_jvm_support.h"

namespace {

// What sits at jre\bin\client\jvm.dll (and next to it).
enum class Library {
    Double,
    None,
    NoEntryPoint,  // a loadable DLL without JNI_CreateJavaVM
    NotADll,       // a file that is no image at all
    NeedsRuntime,  // the double's variant that imports from jre\bin\vmdouble_rt.dll, with that DLL
    NeedsRuntimeMissing,  // the same variant without the DLL
};

std::wstring BuildFolder() {
    std::wstring dll = bed::VmDoubleDll();
    return dll.substr(0, dll.find_last_of(L"\\/"));
}

void WriteBytes(const std::wstring& path, const std::string& bytes) {
    HANDLE file = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
    ASSERT_NE(file, INVALID_HANDLE_VALUE);
    DWORD written = 0;
    WriteFile(file, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
    CloseHandle(file);
}

std::wstring MakeApp(Library library, bool withStrings, const std::string& script) {
    bed::AppOptions options;
    options.withStrings = withStrings;
    options.script = script;
    options.vm = library == Library::Double ? bed::Vm::Double : bed::Vm::None;
    std::wstring app = bed::MakeAppDir(options);
    const std::wstring vm = app + L"\\jre\\bin\\client\\jvm.dll";
    switch (library) {
    case Library::Double:
    case Library::None:
        break;
    case Library::NoEntryPoint:
        EXPECT_TRUE(CopyFileW((BuildFolder() + L"\\vmdouble_rt.dll").c_str(), vm.c_str(), FALSE));
        break;
    case Library::NotADll:
        WriteBytes(vm, "MZ but nothing else a loader could use");
        break;
    case Library::NeedsRuntime:
        EXPECT_TRUE(CopyFileW((BuildFolder() + L"\\vmdouble_rt.dll").c_str(), (app + L"\\jre\\bin\\vmdouble_rt.dll").c_str(), FALSE));
        EXPECT_TRUE(CopyFileW((BuildFolder() + L"\\jvm_dep\\jvm.dll").c_str(), vm.c_str(), FALSE));
        break;
    case Library::NeedsRuntimeMissing:
        EXPECT_TRUE(CopyFileW((BuildFolder() + L"\\jvm_dep\\jvm.dll").c_str(), vm.c_str(), FALSE));
        break;
    }
    return app;
}

const char kArgumentHex[] = "00660069006c0065002e00710037";  // "file.q7"

const std::vector<std::string> kNormalCalls = {
    "FindClass java/lang/String",
    std::string("FindClass ") + jvmtest::kMainClass,
    std::string("GetStaticMethodID ") + jvmtest::kMainClass + " main ([Ljava/lang/String;)V",
    "NewObjectArray length=1 class=java/lang/String init=null",
    std::string("NewStringUTF ") + kArgumentHex,
    std::string("SetObjectArrayElement index=0 value=") + kArgumentHex,
    std::string("CallStaticVoidMethodV ") + jvmtest::kMainClass + ".main argc=1",
    std::string("arg[0]=") + kArgumentHex,
    "main returned",
    "DestroyJavaVM",
};
const std::vector<std::string> kNoRecord = {"<no record>"};

struct PathCase {
    const char* name;
    Library library;
    std::string script;
    bool withStrings;
    DWORD exitCode;
    std::vector<std::string> boxes;
    std::vector<std::string> calls;  // after the options; kNoRecord: the double never ran
};

void PrintTo(const PathCase& c, std::ostream* out) { *out << c.name; }

class VmHostPaths : public ::testing::TestWithParam<PathCase> {};

TEST_P(VmHostPaths, ResultBoxesAndCalls) {
    const PathCase& c = GetParam();
    std::wstring app = MakeApp(c.library, c.withStrings, c.script);

    // Not "-noSplash": the splash runs and must still be there while each box shows.
    std::vector<bool> splashDuringBox;
    bed::RunOptions options;
    options.onBox = [&splashDuringBox](const bed::MessageBoxInfo&, HWND box) {
        DWORD pid = 0;
        GetWindowThreadProcessId(box, &pid);
        splashDuringBox.push_back(jvmtest::SplashUp(pid, 3000));
    };
    bed::RunResult run = bed::RunLauncher(app, L"file.q7", options);
    ASSERT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, c.exitCode);

    std::vector<std::string> texts;
    for (const bed::MessageBoxInfo& box : run.boxes) {
        texts.push_back(box.text);
        EXPECT_EQ(box.caption, c.withStrings ? expect::kCaption : expect::kNoStringsCaption);
        EXPECT_TRUE(box.errorIcon);
    }
    EXPECT_EQ(texts, c.boxes);
    EXPECT_EQ(splashDuringBox, std::vector<bool>(c.boxes.size(), true));

    jvmtest::Record record = jvmtest::ReadRecord(app);
    if (c.calls == kNoRecord) {
        EXPECT_TRUE(record.lines.empty());
        return;
    }
    // Whenever the double ran, the whole option list reached it.
    EXPECT_EQ(record.createLine, jvmtest::CreateLine(12));
    EXPECT_EQ(record.options.size(), 12u);
    EXPECT_EQ(record.calls, c.calls);
}

const std::string kMainMissing = std::string("missing_class=") + jvmtest::kMainClass + "\n";

INSTANTIATE_TEST_SUITE_P(
    Launcher, VmHostPaths,
    ::testing::Values(
        // main runs long enough for the splash to be up before the boxes.
        PathCase{"Normal", Library::Double, "main_ms=300\n", true, 0, {expect::DestroyBox(0)}, kNormalCalls},
        PathCase{"NormalNoStrings", Library::Double, "main_ms=300\ndestroy_result=12\n", false, 12, {expect::DestroyBox(12)},
                 kNormalCalls},
        PathCase{"LibraryMissing", Library::None, "", true, 0xFFFFFFFFu, {expect::kVmNotLoaded}, kNoRecord},
        PathCase{"LibraryMissingNoStrings", Library::None, "", false, 0xFFFFFFFFu, {}, kNoRecord},
        PathCase{"LibraryNotAnImage", Library::NotADll, "", true, 0xFFFFFFFFu, {expect::kVmNotLoaded}, kNoRecord},
        PathCase{"LibraryNotAnImageNoStrings", Library::NotADll, "", false, 0xFFFFFFFFu, {}, kNoRecord},
        PathCase{"EntryPointMissing", Library::NoEntryPoint, "", true, 0xFFFFFFFFu, {expect::kVmNotCreated}, kNoRecord},
        PathCase{"EntryPointMissingNoStrings", Library::NoEntryPoint, "", false, 0xFFFFFFFDu, {}, kNoRecord},
        PathCase{"CreationFails", Library::Double, "create_result=-6\n", true, 0xFFFFFFFAu, {expect::kVmNotCreated}, {}},
        PathCase{"CreationFailsNoStrings", Library::Double, "create_result=-6\n", false, 0xFFFFFFFDu, {}, {}},
        PathCase{"CreationFailsWithPositiveCode", Library::Double, "create_result=1\n", true, 1, {expect::kVmNotCreated},
                 {}},
        PathCase{"MainClassMissing", Library::Double, kMainMissing + "destroy_result=3\n", true, 3,
                 {expect::kMainNotCalled, expect::DestroyBox(3)},
                 {"FindClass java/lang/String", std::string("FindClass ") + jvmtest::kMainClass + " -> null",
                  "DestroyJavaVM"}},
        PathCase{"MainClassMissingNoStrings", Library::Double, kMainMissing + "destroy_result=3\n", false, 3,
                 {expect::DestroyBox(3)},
                 {"FindClass java/lang/String", std::string("FindClass ") + jvmtest::kMainClass + " -> null",
                  "DestroyJavaVM"}},
        // Both lookups are made before either result is tested.
        PathCase{"StringClassMissing", Library::Double, "missing_class=java/lang/String\n", true, 0,
                 {expect::kMainNotCalled, expect::DestroyBox(0)},
                 {"FindClass java/lang/String -> null", std::string("FindClass ") + jvmtest::kMainClass,
                  "DestroyJavaVM"}},
        PathCase{"MainMethodMissing", Library::Double, "missing_method=1\ndestroy_result=-9\n", true, 0xFFFFFFF7u,
                 {expect::kMainNotCalled, expect::DestroyBox(-9)},
                 {"FindClass java/lang/String", std::string("FindClass ") + jvmtest::kMainClass,
                  std::string("GetStaticMethodID ") + jvmtest::kMainClass + " main ([Ljava/lang/String;)V -> null",
                  "DestroyJavaVM"}},
        PathCase{"MainMethodMissingNoStrings", Library::Double, "missing_method=1\ndestroy_result=-9\n", false,
                 0xFFFFFFF7u, {expect::DestroyBox(-9)},
                 {"FindClass java/lang/String", std::string("FindClass ") + jvmtest::kMainClass,
                  std::string("GetStaticMethodID ") + jvmtest::kMainClass + " main ([Ljava/lang/String;)V -> null",
                  "DestroyJavaVM"}},
        // The VM library's own C runtime sits in jre\bin, outside the standard search.
        PathCase{"LibraryNeedsTheRuntimesBinFolder", Library::NeedsRuntime, "", true, 0, {expect::DestroyBox(0)},
                 kNormalCalls},
        PathCase{"LibraryNeedsTheRuntimesBinFolderWithoutIt", Library::NeedsRuntimeMissing, "", true, 0xFFFFFFFFu,
                 {expect::kVmNotLoaded}, kNoRecord}),
    [](const ::testing::TestParamInfo<PathCase>& info) { return std::string(info.param.name); });

TEST(VmLibrary, FoundThroughTheCurrentDirectoryWhenTheExecutableLivesElsewhere) {
    // The program file comes from a directory without a runtime; argv[0] names another one, which
    // becomes the current directory and holds jre\bin\client\jvm.dll.
    std::wstring bare = MakeApp(Library::None, true, "");
    std::wstring app = MakeApp(Library::Double, true, "");
    bed::RunResult run = bed::Run(bed::AppExe(bare), bed::Quote(bed::AppExe(app)) + L" -noSplash", bare);
    EXPECT_EQ(run.exitCode, 0u);
    jvmtest::Record record = jvmtest::ReadRecord(app);
    ASSERT_EQ(record.options.size(), 13u);
    EXPECT_EQ(record.options[0], "-Djava.class.path=" + bed::ToUtf8(app) + "\\emu57.jar");
    EXPECT_EQ(record.calls.back(), "DestroyJavaVM");
}

}  // namespace
