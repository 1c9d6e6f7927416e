// WinMain: the launcher's fixed start-up order. One straight line with a single fork: the first
// instance goes on to the splash, the self-protection checks and the Java application; a second
// instance raises the running one, hands over its arguments and ends with 0.
#include <windows.h>
#include <shellapi.h>
#include <shlobj.h>
#include <shlwapi.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <wchar.h>
#include <direct.h>

#include "startup.h"
#include "../core/core.h"
#include "../instance/instance.h"
#include "../jvm/jvm.h"
#include "../log/log.h"
#include "../protection/protection.h"
#include "../splash/splash.h"

namespace {

const char kPreliminary[] = "Preliminary Definitions";
const char kCommandLine[] = "CL interpretation";
const char kLoadError[] = "Unexpected Error. Error loading files.";
const char kLaunchEnd[] = "Successful launch end.";
const int32_t kLoadErrorCode = 1012;
const int32_t kDebuggerErrorCode = -767;

// Each log line of the start-up sequence is written from the narrow stage text and ModuleName,
// both widened afresh for the call: count n with the terminator, n + 1 units, n + 1 bytes converted
// (both sources are zero-filled past their text). The copies are not released.
const char16_t* WidenForLog(const char* text) {
    int n = WideSize(text);
    if (n <= 0) return u"";
    char16_t* wide = new char16_t[static_cast<size_t>(n) + 1];
    if (ToWide(text, n + 1, wide, n + 1) == 0) return u"";
    return wide;
}

void LogStage(int32_t level, const char* stageText, int32_t code) {
    LogWrite(level, WidenForLog(ModuleName), WidenForLog(stageText), code);
}

void SetStage(char* stageText, const char* text) { FormatText(stageText, 1024, "%s", text); }

}  // namespace

int WINAPI WinMain(HINSTANCE instance, HINSTANCE, LPSTR, int) {
    WCHAR logPath[MAX_PATH] = {0};
    char stageText[1025] = {0};

    // 1. The log lives in the user's documents folder (created when missing). Without it there is
    // no log path and no tag, and the log simply stays closed.
    if (SUCCEEDED(SHGetFolderPathW(nullptr, CSIDL_PERSONAL | CSIDL_FLAG_CREATE, nullptr, SHGFP_TYPE_CURRENT, logPath))) {
        PathAppendW(logPath, reinterpret_cast<LPCWSTR>(LAUNCHER_LOG_RELATIVE_PATH));
        FormatText(ModuleName, sizeof ModuleName, "%s", LAUNCHER_EXE_NAME);
    }
    // 2. Always opened, with an empty path when the folder is unknown (that open fails quietly).
    LogOpen(reinterpret_cast<const char16_t*>(logPath));

    // 3-4. Both labels are written before the work they name.
    int argc = 0;
    SetStage(stageText, kPreliminary);
    LogStage(kLogLevelProgress, stageText, 0);
    SetStage(stageText, kCommandLine);
    LogStage(kLogLevelProgress, stageText, 0);

    // 5. The command line as UTF-16, kept for the life of the process.
    LPWSTR* argv = CommandLineToArgvW(GetCommandLineW(), &argc);

    // 6. The application directory becomes the current directory in every instance. A program
    // path without a directory leaves the current directory as it is.
    WCHAR drive[_MAX_DRIVE], directory[_MAX_DIR], name[_MAX_FNAME], extension[_MAX_EXT];
    WCHAR appDirectory[MAX_PATH];
    _wsplitpath(argv[0], drive, directory, name, extension);
    wsprintfW(appDirectory, L"%s%s", drive, directory);
    _wchdir(appDirectory);

    // 7. The lock's name is the 8-bit instance name read as UTF-16, the name every instance and
    // every outside probe meets on.
    if (AcquireInstanceLock(reinterpret_cast<const char16_t*>(InstanceName)) == nullptr) {
        // Second instance: raise the running frame, hand over the arguments (or "-n"), end.
        ActivateRunningInstances();
        if (argc > 1) {
            ForwardArguments(reinterpret_cast<char16_t**>(argv), argc);
        } else {
            // Slot 0 is never read; slot 2 stays null so that its release below releases nothing.
            char16_t** handOff = new char16_t*[3];
            handOff[1] = const_cast<char16_t*>(u"-n");
            handOff[2] = nullptr;
            argc = 2;
            ForwardArguments(handOff, argc);
            delete handOff[2];
        }
        return 0;
    }

    // F1. "-noSplash" is looked for in the first argument only, in any letter case.
    if (argc > 1 && Utf16CompareNoCase(reinterpret_cast<const char16_t*>(argv[1]), LAUNCHER_NO_SPLASH_SWITCH) == 0) {
        NoSplash = true;
    } else if (!NoSplash) {
        SplashParams splash;
        splash.hwndParent = nullptr;
        splash.hInstance = instance;
        splash.hResourceModule = instance;
        splash.resourceName = LAUNCHER_SPLASH_RESOURCE;
        splash.displayMs = 20000;
        splash.centerOnScreen = 1;
        splash.topMost = 0;
        splash.waitForClose = 0;
        splash.centerX = 0;
        splash.centerY = 0;
        SplashStart(&splash);
    }

    // F2. Integrity of our own image.
    Status protection = ProtectionCheckImage();
    if (protection != 0) {
        SplashClose();
        SetStage(stageText, kLoadError);
        LogStage(kLogLevelError, stageText, kLoadErrorCode);
        ShowErrorBox(stageText);
        return protection;
    }
    // F3. No debugger. The line is logged while the stage text still reads "CL interpretation";
    // only the box gets the load-error text.
    protection = ProtectionCheckDebugger();
    if (protection != 0) {
        SplashClose();
        LogStage(kLogLevelError, stageText, kDebuggerErrorCode);
        SetStage(stageText, kLoadError);
        ShowErrorBox(stageText);
        return protection;
    }

    // F4-F6. A failed launch ends its log with the same closing line.
    Status result = LaunchJavaApplication(instance, argc, reinterpret_cast<char16_t**>(argv));
    SetStage(stageText, kLaunchEnd);
    LogStage(kLogLevelLaunchEnd, stageText, 0);
    LogClose();
    return result;
}
