// Shared pieces of the VM host tests: reading the VM double's record in parts, the special folders
// of the prefix redirected through its registry, the splash window of a running launcher, and the
// expected forms of texts (hex encoding, the record's byte escapes, the ANSI code page).
#ifndef TESTS_WINE_TEST_JVM_SUPPORT_H
#define TESTS_WINE_TEST_JVM_SUPPORT_H

#include <gtest/gtest.h>
#include <windows.h>
#include <shlobj.h>

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

const char kMainClass[] = "com/qz/kpo/emu57/app/ApplicationMainForm";
const char kNoSplashOption[] = "-Dapp.lumiscope57.noSplash=true";

// Options 1-10, which every launch carries, for application directory `app` (narrow form).
inline std::vector<std::string> FixedOptions(const std::string& app) {
    return {"-Djava.class.path=" + app + "\\emu57.jar",
            "-Xms64m",
            "-Xmx256m",
            "-Dswing.aatext=true",
            "-DencodedFilenames=true",
            "-Dsun.locale.formatasdefault=true",
            "-Djava.library.path=" + app,
            "-DconsoleLogLevel=ALL",
            "-DfileLogLevel=INFO",
            "-DjniFileLogLevel=3"};
}

// The record split at its first FindClass line: creation (create line + options) and the rest.
struct Record {
    std::vector<std::string> lines;
    std::string createLine;
    std::vector<std::string> options;  // option texts; "<BAD>..." for a line of another form
    std::vector<std::string> calls;    // every line after the options
};

inline Record ReadRecord(const std::wstring& appDir) {
    Record r;
    r.lines = bed::ReadRecord(appDir);
    size_t i = 0;
    if (i < r.lines.size()) r.createLine = r.lines[i++];
    for (; i < r.lines.size() && r.lines[i].compare(0, 7, "option[") == 0; ++i) {
        const std::string& line = r.lines[i];
        std::string head = "option[" + std::to_string(r.options.size()) + "]=";
        const std::string tail = " extraInfo=null";
        bool wellFormed = line.size() >= head.size() + tail.size() && line.compare(0, head.size(), head) == 0 &&
                          line.compare(line.size() - tail.size(), tail.size(), tail) == 0;
        r.options.push_back(wellFormed ? line.substr(head.size(), line.size() - head.size() - tail.size())
                                       : "<BAD>" + line);
    }
    r.calls.assign(r.lines.begin() + static_cast<std::ptrdiff_t>(i), r.lines.end());
    return r;
}

inline std::string CreateLine(size_t options) {
    return "JNI_CreateJavaVM version=0x00010006 nOptions=" + std::to_string(options) + " ignoreUnrecognized=1";
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

// Bytes as the double records them: below 0x20 and from 0x7f up as \xHH.
inline std::string Escaped(const std::string& bytes) {
    std::string out;
    char escape[8];
    for (unsigned char b : bytes) {
        if (b < 0x20 || b >= 0x7f) {
            snprintf(escape, sizeof escape, "\\x%02x", b);
            out += escape;
        } else {
            out.push_back(static_cast<char>(b));
        }
    }
    return out;
}

// `text` in the ANSI code page of this prefix (unmappable characters become the default one).
inline std::string Ansi(const std::wstring& text) {
    int n = WideCharToMultiByte(CP_ACP, 0, text.c_str(), -1, nullptr, 0, nullptr, nullptr);
    std::string out(static_cast<size_t>(n > 0 ? n : 1), '\0');
    WideCharToMultiByte(CP_ACP, 0, text.c_str(), -1, &out[0], n, nullptr, nullptr);
    out.resize(out.size() - 1);
    return out;
}

inline std::wstring Folder(int csidl) {
    wchar_t path[MAX_PATH] = {0};
    SHGetFolderPathW(nullptr, csidl, nullptr, SHGFP_TYPE_CURRENT, path);
    return path;
}

using bed::FolderOverride;

// True once the process `pid` has its splash window, waiting up to `timeoutMs`.
inline bool SplashUp(DWORD pid, DWORD timeoutMs) { return bed::WaitForSplash(pid, timeoutMs) != nullptr; }

}  // namespace jvmtest

#endif
