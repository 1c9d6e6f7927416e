// The VM host's portable pieces against the installed OpenJDK: the composed launch options create
// a real VM, CallJavaMain hands the encoded arguments to a Java main class that decodes them, and
// the failure results come from the real VM's answers. One VM per process (a VM cannot be created
// twice), made before the first test and destroyed after the last.
#include <gtest/gtest.h>

#include <stdlib.h>
#include <unistd.h>

#include <fstream>
#include <string>
#include <vector>

#include "jvm/jvm_internal.h"

namespace {

std::string workDir, appDir;
const char kUserAppData[] = "/home/qz user/.appdata";

class RealVm : public testing::Environment {
public:
    void SetUp() override {
        char dirTemplate[] = "/tmp/qz-jvm.XXXXXX";
        ASSERT_NE(mkdtemp(dirTemplate), nullptr);
        workDir = dirTemplate;
        appDir = workDir + "/app";
        // The launcher joins directory and jar with a backslash, an ordinary file-name character
        // here: the jar sits in workDir under the name "app\emu57.jar".
        std::ifstream jar(JVM_LINUX_JAR, std::ios::binary);
        std::ofstream copy(appDir + "\\emu57.jar", std::ios::binary);
        copy << jar.rdbuf();
        copy.close();
        ASSERT_TRUE(copy.good());

        ASSERT_EQ(LoadJvmLibrary(JVM_LINUX_LIBJVM), 0);
        std::u16string exe = u"/opt/qz/QZ-Lumiscope_QZ-57", first = u"-noSplash", file = u"a.qz57", again = u"-NOSPLASH";
        char16_t* argv[] = {&exe[0], &first[0], &file[0], &again[0]};
        VmOptionInputs inputs;
        inputs.appDirectory = appDir.c_str();
        inputs.argc = 4;
        inputs.argv = argv;
        inputs.userAppDataFound = true;
        inputs.userAppData = kUserAppData;
        inputs.commonAppDataFound = true;
        ComposeVmOptions(inputs);
        AddVmOption("-Xcheck:jni");  // the VM checks every JNI call the launcher makes
        ASSERT_EQ(CreateVm(), 0);
    }

    void TearDown() override {
        EXPECT_EQ(DestroyVm(), 0);
        unlink((appDir + "\\emu57.jar").c_str());
        rmdir(workDir.c_str());
    }
};

testing::Environment* const realVm = testing::AddGlobalTestEnvironment(new RealVm);

JNIEnv* Env() { return JvmState.env; }

// A Java string as UTF-16 units; "<null>" for a null reference.
std::u16string FromJava(jobject value) {
    if (value == nullptr) return u"<null>";
    jstring text = static_cast<jstring>(value);
    const jchar* units = Env()->GetStringChars(text, nullptr);
    std::u16string copy(reinterpret_cast<const char16_t*>(units), static_cast<size_t>(Env()->GetStringLength(text)));
    Env()->ReleaseStringChars(text, units);
    return copy;
}

// Calls CallJavaMain with argv[0] and `args`; returns what the main class decoded from them.
std::vector<std::u16string> RunMain(std::vector<std::u16string> args) {
    std::u16string exe = u"/opt/qz/QZ-Lumiscope_QZ-57";
    std::vector<char16_t*> argv = {&exe[0]};
    for (auto& a : args) argv.push_back(&a[0]);
    EXPECT_EQ(CallJavaMain(LAUNCHER_MAIN_CLASS, argv.data(), static_cast<int32_t>(argv.size())), 0);
    EXPECT_FALSE(Env()->ExceptionCheck());
    jclass main = Env()->FindClass(LAUNCHER_MAIN_CLASS);
    jobjectArray array = static_cast<jobjectArray>(
        Env()->GetStaticObjectField(main, Env()->GetStaticFieldID(main, "decoded", "[Ljava/lang/String;")));
    std::vector<std::u16string> values;
    for (jsize i = 0; i < Env()->GetArrayLength(array); ++i) values.push_back(FromJava(Env()->GetObjectArrayElement(array, i)));
    return values;
}

// Takes the pending exception, checks its class and clears it.
void ExpectPendingException(const char* className) {
    jthrowable pending = Env()->ExceptionOccurred();
    ASSERT_NE(pending, nullptr);
    Env()->ExceptionClear();
    EXPECT_TRUE(Env()->IsInstanceOf(pending, Env()->FindClass(className))) << className;
}

// The decoder accepts only groups of four lower-case digits, so every argument coming back whole
// proves its encoding; an empty argument repeats the one before, or is empty in first place.
TEST(RealVm, ArgumentsArriveEncodedAndDecodeToTheOriginals) {
    std::u16string longArgument;
    for (int i = 0; i < 5000; ++i) longArgument.push_back(static_cast<char16_t>(i % 3 == 0 ? 0x0410 + i % 32 : 0x61 + i % 26));
    longArgument.replace(100, 5, u"\U0001F600 \U00010437");
    const std::u16string outsideAnsi = u"C:\\Users\\\u0418\u0432\u0430\u043d\\\u6587\u6863\\\u05e9\u05dc\u05d5\u05dd.qz57";
    EXPECT_EQ(RunMain({u"", u"-noSplash", u"C:\\M\u00fcll", u"a b", u"ABC \u00C4\u00D6", outsideAnsi, longArgument,
                       u"\xD800", u"", u"x"}),
              (std::vector<std::u16string>{u"", u"-noSplash", u"C:\\M\u00fcll", u"a b", u"ABC \u00C4\u00D6", outsideAnsi,
                                           longArgument, u"\xD800", u"\xD800", u"x"}));
    EXPECT_TRUE(RunMain({}).empty());
}

TEST(RealVm, FailureResults) {
    std::u16string exe = u"/opt/qz/QZ-Lumiscope_QZ-57", arg = u"x";
    char16_t* argv[] = {&exe[0], &arg[0]};
    EXPECT_EQ(CallJavaMain("com/qz/kpo/emu57/app/NoSuchForm", argv, 2), -1);
    ExpectPendingException("java/lang/NoClassDefFoundError");
    EXPECT_EQ(CallJavaMain("java/lang/Object", argv, 2), -2);  // no static main(String[])
    ExpectPendingException("java/lang/NoSuchMethodError");
    EXPECT_EQ(CallJavaMain("probe/ThrowingMain", argv, 2), 0);  // an exception out of main goes unnoticed
    ExpectPendingException("java/lang/IllegalStateException");
}

TEST(RealVm, LaunchOptionsReachTheVm) {
    jclass system = Env()->FindClass("java/lang/System");
    jmethodID getProperty = Env()->GetStaticMethodID(system, "getProperty", "(Ljava/lang/String;)Ljava/lang/String;");
    const std::string app = appDir, user = kUserAppData;
    const std::pair<const char*, std::string> expected[] = {
        {"java.class.path", app + "\\emu57.jar"}, {"java.library.path", app}, {"swing.aatext", "true"},
        {"encodedFilenames", "true"}, {"sun.locale.formatasdefault", "true"}, {"consoleLogLevel", "ALL"},
        {"fileLogLevel", "INFO"}, {"jniFileLogLevel", "3"}, {"app.lumiscope57.noSplash", "true"},
        {"user.appdata.path", user}, {"user.temp.path", user}};
    for (const auto& p : expected) {
        jobject value = Env()->CallStaticObjectMethod(system, getProperty, Env()->NewStringUTF(p.first));
        EXPECT_EQ(FromJava(value), std::u16string(p.second.begin(), p.second.end())) << p.first;
    }
    EXPECT_FALSE(Env()->ExceptionCheck());
    EXPECT_TRUE(NoSplash);
}

}  // namespace
