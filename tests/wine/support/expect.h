// Expected texts shared by the Wine tests: what the launcher writes and shows.
#ifndef TESTS_WINE_SUPPORT_EXPECT_H
#define TESTS_WINE_SUPPORT_EXPECT_H

#include <string>

namespace expect {

const char kCaption[] = "QZ-Lumiscope QZ-57";  // string 7
const char kNoStringsCaption[] = "Error";
const char kVmNotLoaded[] =
    "The Java runtime could not be loaded from jre\\bin\\client\\jvm.dll in the application folder. Please "
    "reinstall QZ-Lumiscope QZ-57.";
const char kMainNotCalled[] =
    "The application could not be started: its main class com.qz.kpo.emu57.app.ApplicationMainForm was not "
    "found in emu57.jar. Please reinstall QZ-Lumiscope QZ-57.";
const char kVmNotCreated[] =
    "The Java virtual machine could not be created. Please check that enough memory is free and reinstall "
    "QZ-Lumiscope QZ-57 if the problem persists.";
const char kLoadError[] = "Unexpected Error. Error loading files.";

inline std::string DestroyBox(int result) { return "jvm destroy res=" + std::to_string(result); }

// Log lines (UTF-8 here; the file holds UTF-16LE).
const char kTag[] = "QZ-Lumiscope_QZ-57.exe";
inline std::string Line(const std::string& message, int code) {
    return std::string(kTag) + " : " + message + " : " + std::to_string(code) + "\r\n";
}
const char kStartPrefix[] = "QZ_CW_startLOG : Started logging...";
const char kEndLine[] = "Ended logging... : \r\n";

}  // namespace expect

#endif
