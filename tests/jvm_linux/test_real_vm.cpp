// The VM host's portable pieces against the installed OpenJDK: the composed launch options create
// a real VM, CallJavaMain hands the encoded arguments to a Java main class that decodes them, and
// the failure results come from the real VM's answers. One VM per process (a VM cannot be created
// twice), made before the first test and destroyed after the last.
#include <gtest/gtest.h>

#include <stdio.h>
#include <stdlib.h>
#include <unistd.h>

#include <fstream>
#include <string>
#include <vector>

#include "jvm/jvm_internal.h"

namespace {

std::string workDir;
std::string appDir;

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
        ASSERT_NE(JvmState.createJavaVm, nullptr);

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
        // Makes the VM check every JNI call the launcher makes.
        AddVmOption("-Xcheck:jni");
        ASSERT_EQ(CreateVm(), 0);
        ASSERT_NE(JvmState.env, nullptr);
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

jclass Class(const char* name) {
    jclass found = Env()->FindClass(name);
    EXPECT_NE(found, nullptr) << name;
    return found;
}

std::vector<std::u16string> StaticStrings(const char* field) {
    jclass main = Class(LAUNCHER_MAIN_CLASS);
    jobject array = Env()->GetStaticObjectField(main, Env()->GetStaticFieldID(main, field, "[Ljava/lang/String;"));
    std::vector<std::u16string> values;
    if (array == nullptr) return values;
    jsize length = Env()->GetArrayLength(static_cast<jobjectArray>(array));
    for (jsize i = 0; i < length; ++i) values.push_back(FromJava(Env()->GetObjectArrayElement(static_cast<jobjectArray>(array), i)));
    return values;
}

jint StaticInt(const char* className, const char* field) {
    jclass c = Class(className);
    return Env()->GetStaticIntField(c, Env()->GetStaticFieldID(c, field, "I"));
}

std::u16string Ascii(const std::string& text) { return std::u16string(text.begin(), text.end()); }

// Calls CallJavaMain with argv[0] and `args`.
Status RunMain(const char* className, std::vector<std::u16string> args) {
    std::u16string exe = u"/opt/qz/QZ-Lumiscope_QZ-57";
    std::vector<char16_t*> argv = {&exe[0]};
    for (auto& a : args) argv.push_back(&a[0]);
    return CallJavaMain(className, argv.data(), static_cast<int32_t>(argv.size()));
}

std::string Encoded(const std::u16string& text) {
    std::string out(4 * text.size() + 1, '\0');
    EncodeArgument(text.c_str(), &out[0]);
    out.pop_back();
    return out;
}

// Checks (as JNI requires after a call into Java) whether an exception is pending.
bool Threw() { return Env()->ExceptionCheck() == JNI_TRUE; }

// Takes the pending exception, checks its class and clears it.
void ExpectPendingException(const char* className) {
    jthrowable pending = Env()->ExceptionOccurred();
    ASSERT_NE(pending, nullptr);
    Env()->ExceptionClear();
    EXPECT_TRUE(Env()->IsInstanceOf(pending, Class(className))) << className;
}

TEST(RealVm, ArgumentsArriveEncodedAndDecodeToTheOriginals) {
    std::u16string longArgument;
    for (int i = 0; i < 5000; ++i) longArgument.push_back(static_cast<char16_t>(i % 3 == 0 ? 0x0410 + i % 32 : 0x61 + i % 26));
    std::u16string pairs = u"\U0001F600 \U00010437";
    longArgument.replace(100, pairs.size(), pairs);
    const std::vector<std::u16string> args = {
        u"-noSplash",
        u"C:\\M\u00fcll",
        u"a b",
        u"\U0001F600",
        u"ABC xyz \u00C4\u00D6",
        u"C:\\Users\\\u0418\u0432\u0430\u043d\\\u6587\u6863\\\u05e9\u05dc\u05d5\u05dd.qz57",
        longArgument,
        u"\xD800",  // an unpaired surrogate travels as any unit does
    };
    int callsBefore = StaticInt(LAUNCHER_MAIN_CLASS, "calls");
    ASSERT_EQ(RunMain(LAUNCHER_MAIN_CLASS, args), 0);
    ASSERT_FALSE(Threw());
    EXPECT_EQ(StaticInt(LAUNCHER_MAIN_CLASS, "calls"), callsBefore + 1);

    std::vector<std::u16string> received = StaticStrings("received");
    std::vector<std::u16string> decoded = StaticStrings("decoded");
    ASSERT_EQ(received.size(), args.size());
    EXPECT_EQ(received[0], u"002d006e006f00530070006c006100730068");
    EXPECT_EQ(received[1], u"0043003a005c004d00fc006c006c");
    EXPECT_EQ(received[2], u"006100200062");
    EXPECT_EQ(received[3], u"d83dde00");
    EXPECT_EQ(received[4], u"004100420043002000780079007a002000c400d6");
    EXPECT_EQ(received[6].size(), 20000u);
    for (size_t i = 0; i < args.size(); ++i) {
        EXPECT_EQ(received[i], Ascii(Encoded(args[i]))) << "argument " << i;
        EXPECT_EQ(decoded[i], args[i]) << "argument " << i;
    }
}

TEST(RealVm, EmptyArgumentsRepeatThePreviousOneExceptInFirstPlace) {
    ASSERT_EQ(RunMain(LAUNCHER_MAIN_CLASS, {u"", u"x", u"", u"", u"yz"}), 0);
    ASSERT_FALSE(Threw());
    EXPECT_EQ(StaticStrings("received"), (std::vector<std::u16string>{u"", u"0078", u"0078", u"0078", u"0079007a"}));
    EXPECT_EQ(StaticStrings("decoded"), (std::vector<std::u16string>{u"", u"x", u"x", u"x", u"yz"}));
}

TEST(RealVm, OnlyTheExecutableGivesAnEmptyArray) {
    int callsBefore = StaticInt(LAUNCHER_MAIN_CLASS, "calls");
    ASSERT_EQ(RunMain(LAUNCHER_MAIN_CLASS, {}), 0);
    ASSERT_FALSE(Threw());
    EXPECT_EQ(StaticInt(LAUNCHER_MAIN_CLASS, "calls"), callsBefore + 1);
    EXPECT_TRUE(StaticStrings("received").empty());
}

TEST(RealVm, MissingClassAndMissingStaticMain) {
    EXPECT_EQ(RunMain("com/qz/kpo/emu57/app/NoSuchForm", {u"x"}), -1);
    ExpectPendingException("java/lang/NoClassDefFoundError");

    EXPECT_EQ(RunMain("probe/InstanceMain", {u"x"}), -2);
    ExpectPendingException("java/lang/NoSuchMethodError");
}

TEST(RealVm, ExceptionThrownOutOfMainStillGivesZero) {
    EXPECT_EQ(RunMain("probe/ThrowingMain", {u"x"}), 0);
    ExpectPendingException("java/lang/IllegalStateException");
    EXPECT_EQ(StaticInt("probe/ThrowingMain", "calls"), 1);
}

// Calls a static method of probe/VmFacts that takes one text and returns one.
std::u16string AskVm(const char* method, const char* argument) {
    jclass facts = Class("probe/VmFacts");
    jmethodID id = Env()->GetStaticMethodID(facts, method, "(Ljava/lang/String;)Ljava/lang/String;");
    jobject answer = Env()->CallStaticObjectMethod(facts, id, Env()->NewStringUTF(argument));
    EXPECT_FALSE(Threw()) << method;
    return FromJava(answer);
}

std::u16string Property(const char* name) { return AskVm("property", name); }

TEST(RealVm, LaunchOptionsReachTheVm) {
    const std::u16string app = Ascii(appDir);
    EXPECT_EQ(Property("java.class.path"), app + u"\\emu57.jar");
    EXPECT_EQ(Property("java.library.path"), app);
    EXPECT_EQ(Property("swing.aatext"), u"true");
    EXPECT_EQ(Property("encodedFilenames"), u"true");
    EXPECT_EQ(Property("sun.locale.formatasdefault"), u"true");
    EXPECT_EQ(Property("consoleLogLevel"), u"ALL");
    EXPECT_EQ(Property("fileLogLevel"), u"INFO");
    EXPECT_EQ(Property("jniFileLogLevel"), u"3");
    EXPECT_EQ(Property("app.lumiscope57.noSplash"), u"true");
    EXPECT_EQ(Property("user.appdata.path"), Ascii(kUserAppData));
    EXPECT_EQ(Property("user.temp.path"), Ascii(kUserAppData));
    EXPECT_TRUE(NoSplash);

    // The main class came from the jar of the class-path option.
    EXPECT_EQ(AskVm("classSource", "com.qz.kpo.emu57.app.ApplicationMainForm"), app + u"\\emu57.jar");

    // -Xmx256m: the VM reports a little less than the reserved maximum.
    jclass facts = Class("probe/VmFacts");
    jlong bytes = Env()->CallStaticLongMethod(facts, Env()->GetStaticMethodID(facts, "maxHeapBytes", "()J"));
    ASSERT_FALSE(Threw());
    EXPECT_LE(bytes, 256LL << 20);
    EXPECT_GT(bytes, 200LL << 20);
}

TEST(RealVm, LibraryLoadingFailures) {
    VmState running = JvmState;
    EXPECT_EQ(LoadJvmLibrary("/nonexistent/libjvm.so"), -1);
    EXPECT_EQ(JvmState.vm, nullptr);  // the state is zeroed first
    EXPECT_EQ(LoadJvmLibrary(nullptr), -1);
    // A library without the entry point loads; creation then reports -1.
    EXPECT_EQ(LoadJvmLibrary("libm.so.6"), 0);
    EXPECT_EQ(JvmState.createJavaVm, nullptr);
    EXPECT_EQ(CreateVm(), -1);
    JvmState = running;
}

}  // namespace
