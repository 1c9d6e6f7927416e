// The main-class call as the VM double records it, for arguments from a real command line: both
// class lookups, the method, an array of argc - 1 elements filled in order with the hex-encoded
// arguments (an empty one repeats the one before), the call, then DestroyJavaVM.
#include <gtest/gtest.h>

#include "support/testbed.h"
#include "test_jvm_support.h"

namespace {

using jvmtest::Hex;

TEST(MainCall, ArgumentsInOrderEncoded) {
    const std::wstring outsideAnsi = L"C:\\Users\\\x0418\x0432\x0430\x043d\\\x6587\x6863\\\x05e9\x05dc\x05d5\x05dd.qz57";
    // 5,000 units, past a fixed 1023-unit buffer, with a surrogate pair across that limit.
    std::wstring longArgument;
    for (int i = 0; i < 5000; ++i) longArgument.push_back(static_cast<wchar_t>(i % 7 == 0 ? 0x4E00 + i : 0x41 + i % 26));
    longArgument.replace(1022, 2, L"\xD83D\xDE00");
    const std::wstring args[] = {L"-noSplash", L"C:\\M\x00fcll", L"a b", L"\xD83D\xDE00", L"ABC Xyz",
                                 outsideAnsi, L"", longArgument, L"", L"x"};
    std::wstring line;
    for (const std::wstring& a : args) line += (line.empty() ? L"" : L" ") + bed::Quote(a);
    std::wstring app = bed::MakeAppDir();
    bed::RunResult run = bed::RunLauncher(app, line);
    EXPECT_FALSE(run.timedOut);
    EXPECT_EQ(run.exitCode, 0u);
    EXPECT_EQ(jvmtest::ReadRecord(app).calls,
              jvmtest::NormalCalls({"002d006e006f00530070006c006100730068", "0043003a005c004d00fc006c006c",
                                    "006100200062", "d83dde00", "004100420043002000580079007a", Hex(outsideAnsi),
                                    Hex(outsideAnsi), Hex(longArgument), Hex(longArgument), "0078"}));
}

}  // namespace
