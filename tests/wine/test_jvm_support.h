// Shared pieces of the VM host tests: the VM double's record split up, the calls of a normal run
// and the hex form of a text (also used by the instance tests).
#ifndef TESTS_WINE_TEST_JVM_SUPPORT_H
#define TESTS_WINE_TEST_JVM_SUPPORT_H

#include <gtest/gtest.h>

#include <stdio.h>

#include <string>
#include <vector>

#include "support/testbed.h"

namespace jvmtest {

// The launcher's log needs its folder; without it every run prints complaints.
struct LogFolder : ::testing::Environment {
    void SetUp() override { bed::ResetLog(); }
};
inline ::testing::Environment* const kLogFolder = ::testing::AddGlobalTestEnvironment(new LogFolder);

const std::string kMain = "com/qz/kpo/emu57/app/ApplicationMainForm";
const std::string kMainMethod = "GetStaticMethodID " + kMain + " main ([Ljava/lang/String;)V";

// Options 1-10, which every launch carries, for application directory `app` (as recorded).
inline std::vector<std::string> FixedOptions(const std::string& app) {
    return {"-Djava.class.path=" + app + "\\emu57.jar", "-Xms64m", "-Xmx256m", "-Dswing.aatext=true",
            "-DencodedFilenames=true", "-Dsun.locale.formatasdefault=true", "-Djava.library.path=" + app,
            "-DconsoleLogLevel=ALL", "-DfileLogLevel=INFO", "-DjniFileLogLevel=3"};
}

// The record: its creation line, the option texts ("<BAD>..." for a malformed line) and the calls.
struct Record {
    std::vector<std::string> lines, options, calls;
};

inline Record ReadRecord(const std::wstring& appDir) {
    Record r;
    r.lines = bed::ReadRecord(appDir);
    size_t i = r.lines.empty() ? 0 : 1;
    for (; i < r.lines.size() && r.lines[i].compare(0, 7, "option[") == 0; ++i) {
        const std::string& line = r.lines[i];
        const std::string head = "option[" + std::to_string(r.options.size()) + "]=", tail = " extraInfo=null";
        bool good = line.size() >= head.size() + tail.size() && line.compare(0, head.size(), head) == 0 &&
                    line.compare(line.size() - tail.size(), tail.size(), tail) == 0;
        r.options.push_back(good ? line.substr(head.size(), line.size() - head.size() - tail.size()) : "<BAD>" + line);
    }
    r.calls.assign(r.lines.begin() + static_cast<std::ptrdiff_t>(i), r.lines.end());
    if (!r.lines.empty())
        EXPECT_EQ(r.lines[0], "JNI_CreateJavaVM version=0x00010006 nOptions=" + std::to_string(r.options.size()) +
                                  " ignoreUnrecognized=1");
    return r;
}

// The calls after the options of a run whose arguments encode to `encoded`.
inline std::vector<std::string> NormalCalls(const std::vector<std::string>& encoded) {
    const std::string n = std::to_string(encoded.size());
    std::vector<std::string> calls = {"FindClass java/lang/String", "FindClass " + kMain, kMainMethod,
                                      "NewObjectArray length=" + n + " class=java/lang/String init=null"};
    for (size_t i = 0; i < encoded.size(); ++i) {
        calls.push_back("NewStringUTF " + encoded[i]);
        calls.push_back("SetObjectArrayElement index=" + std::to_string(i) + " value=" + encoded[i]);
    }
    calls.push_back("CallStaticVoidMethodV " + kMain + ".main argc=" + n);
    for (size_t i = 0; i < encoded.size(); ++i) calls.push_back("arg[" + std::to_string(i) + "]=" + encoded[i]);
    calls.push_back("main returned");
    calls.push_back("DestroyJavaVM");
    return calls;
}

// Four lower-case hex digits per UTF-16 unit, written out independently of the launcher.
inline std::string Hex(const std::wstring& text) {
    std::string out;
    char unit[8];
    for (wchar_t c : text) {
        snprintf(unit, sizeof unit, "%04x", static_cast<unsigned>(c) & 0xFFFFu);
        out += unit;
    }
    return out;
}

}  // namespace jvmtest

#endif
