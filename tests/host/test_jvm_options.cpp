// What the VM option list makes of inputs the Windows tests cannot easily produce: a drive-root
// directory, a directory whose conversion failed, overlong values, a folder buffer without end.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "jvm/jvm_internal.h"

namespace {

// The list only grows: returns what this composition appended.
std::vector<std::string> Compose(const char* appDirectory) {
    char16_t exe[] = u"D:\\QZ-Lumiscope_QZ-57.exe";
    char16_t* argv[] = {exe};
    VmOptionInputs in;
    in.appDirectory = appDirectory;
    in.argc = 1;
    in.argv = argv;
    in.userAppDataFound = false;
    in.userAppData = "ignored";
    in.commonAppDataFound = false;
    int32_t before = VmOptionCount();
    ComposeVmOptions(in);
    std::vector<std::string> added;
    for (int32_t i = before; i < VmOptionCount(); ++i) added.push_back(VmOptionRecords()[i].optionString);
    return added;
}

TEST(ComposeVmOptions, DirectoryForms) {
    // A directory that ends in its separator (a drive root) keeps it: the separator doubles.
    const std::string sep = kDirectorySeparator, root = "D:" + sep;
    std::vector<std::string> options = Compose(root.c_str());
    ASSERT_EQ(options.size(), 10u);
    EXPECT_EQ(options[0], "-Djava.class.path=" + root + sep + "emu57.jar");
    EXPECT_EQ(options[6], "-Djava.library.path=" + root);

    options = Compose(nullptr);
    EXPECT_EQ(options[0], "-Djava.class.path=(null)" + sep + "emu57.jar");
    EXPECT_EQ(options[6], "-Djava.library.path=(null)");

    // Each option is formatted into 1024 bytes: longer ones are cut at 1023.
    std::string longDirectory(2000, 'd');
    options = Compose(longDirectory.c_str());
    EXPECT_EQ(options[0], "-Djava.class.path=" + longDirectory.substr(0, 1023 - 18));
    EXPECT_EQ(options[6].size(), 1023u);
}

// (The low-byte narrowing itself is checked under Wine through the prefix's folders.)
TEST(NarrowLowBytes, FullBufferWithoutTerminatorIsCutAfter260Bytes) {
    char16_t folder[kFolderPathUnits];
    for (char16_t& u : folder) u = u'\u017a';  // low byte 'z'
    char out[kFolderPathUnits + 1];
    NarrowLowBytes(folder, out);
    EXPECT_EQ(std::string(out), std::string(kFolderPathUnits, 'z'));
}

}  // namespace
