// The main-class call as the VM double records it: both class lookups, the method, an array of
// argc - 1 elements filled in order with the hex-encoded arguments, the call through
// CallStaticVoidMethodV, then DestroyJavaVM. Arguments come from a real command line.
#include <gtest/gtest.h>

#include "support/expect.h"
#include "support/testbed.h"
#include "test_jvm_support.h"

namespace {

using jvmtest::Hex;

// Runs the launcher with each of `args` quoted on its command line; returns the calls after the
// options, checking that the run ended normally.
std::vector<std::string> CallsFor(const std::vector<std::wstring>& args) {
    std::wstring line;
    for (const std::wstring& a : args) line += (line.empty() ? L"" : L" ") + bed::Quote(a);
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::RunLauncher(app, L"-noSplash" + (line.empty() ? L"" : L" " + line));
    EXPECT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, 0u);
    std::vector<std::string> calls = jvmtest::ReadRecord(app).calls;
    return calls;
}

// The calls a normal run makes for arguments whose encodings are `encoded` ("-noSplash" first).
std::vector<std::string> ExpectedCalls(const std::vector<std::string>& encoded) {
    const std::string main = jvmtest::kMainClass;
    std::vector<std::string> calls = {
        "FindClass java/lang/String",
        "FindClass " + main,
        "GetStaticMethodID " + main + " main ([Ljava/lang/String;)V",
        "NewObjectArray length=" + std::to_string(encoded.size()) + " class=java/lang/String init=null",
    };
    for (size_t i = 0; i < encoded.size(); ++i) {
        calls.push_back("NewStringUTF " + encoded[i]);
        calls.push_back("SetObjectArrayElement index=" + std::to_string(i) + " value=" + encoded[i]);
    }
    calls.push_back("CallStaticVoidMethodV " + main + ".main argc=" + std::to_string(encoded.size()));
    for (size_t i = 0; i < encoded.size(); ++i) calls.push_back("arg[" + std::to_string(i) + "]=" + encoded[i]);
    calls.push_back("main returned");
    calls.push_back("DestroyJavaVM");
    return calls;
}

const char kNoSplashHex[] = "002d006e006f00530070006c006100730068";

TEST(MainCall, ArgumentsInOrderEncodedWithTheProductsExamples) {
    const std::wstring outsideAnsi = L"C:\\Users\\\x0418\x0432\x0430\x043d\\\x6587\x6863\\\x05e9\x05dc\x05d5\x05dd.qz57";
    std::vector<std::string> calls = CallsFor({L"C:\\M\x00fcll", L"a b", L"\xD83D\xDE00", L"ABC Xyz", outsideAnsi});
    EXPECT_EQ(calls, ExpectedCalls({kNoSplashHex, "0043003a005c004d00fc006c006c", "006100200062", "d83dde00",
                                    "004100420043002000580079007a", Hex(outsideAnsi)}));
}

TEST(MainCall, EmptyArgumentRepeatsThePreviousEncodingButIsEmptyInFirstPlace) {
    EXPECT_EQ(CallsFor({L"a b", L"", L"", L"x"}),
              ExpectedCalls({kNoSplashHex, "006100200062", "006100200062", "006100200062", "0078"}));

    // Without "-noSplash" in front, the empty argument is the first one.
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::RunLauncher(app, L"\"\" x");
    EXPECT_EQ(run.exitCode, 0u);
    std::vector<std::string> calls = jvmtest::ReadRecord(app).calls;
    EXPECT_EQ(calls, ExpectedCalls({"", "0078"}));
}

TEST(MainCall, OnlyTheExecutableGivesAnEmptyArray) {
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::RunLauncher(app);
    EXPECT_EQ(run.exitCode, 0u);
    EXPECT_EQ(jvmtest::ReadRecord(app).calls, ExpectedCalls({}));
}

TEST(MainCall, LongArgumentsAreEncodedWhole) {
    // Beyond the 1023 units a fixed 4096-byte buffer would hold; the second one fills most of
    // the 32,767 units a command line can take. Surrogate pairs straddle the old limit.
    std::wstring mixed;
    for (int i = 0; i < 5000; ++i) mixed.push_back(static_cast<wchar_t>(i % 7 == 0 ? 0x4E00 + i : 0x41 + i % 26));
    mixed.replace(1022, 2, L"\xD83D\xDE00");
    std::wstring big(27000, L'\x00e9');
    big[26999] = L'Z';
    EXPECT_EQ(CallsFor({mixed, big}), ExpectedCalls({kNoSplashHex, Hex(mixed), Hex(big)}));
}

}  // namespace
