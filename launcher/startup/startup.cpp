// The launcher's fixed start-up order. One straight line with a single fork: the first instance
// goes on to the splash, the self-protection checks and the Java application; a second instance
// raises the running one, hands over its arguments and ends with 0. The platform file around it
// (startup_win32.cpp, startup_posix.cpp) provides the entry point, the documents folder, the
// command line and the application directory.
#include "startup.h"
#include "startup_platform.h"

#include "../errorbox/errorbox.h"
#include "../instance/instance.h"
#include "../jvm/jvm.h"
#include "../log/log.h"
#include "../protection/protection.h"
#include "../splash/splash.h"
#include "../text/text.h"

#include <stdlib.h>

namespace {

const char kPreliminary[] = "Preliminary Definitions";
const char kCommandLine[] = "CL interpretation";
const char kLoadError[] = "Unexpected Error. Error loading files.";
const char kLaunchEnd[] = "Successful launch end.";

const char kExeName[] = "QZ-Lumiscope_QZ-57.exe";
const char kSplashResource[] = "BITMAP_SPLASH_57";

// Each log line of the start-up sequence is written from the narrow stage text and ModuleName,
// both widened afresh for the call (the copies are not released).
void LogStage(int32_t level, const char* stageText, int32_t code) {
    LogWrite(level, WidenForLog(ModuleName), WidenForLog(stageText), code);
}

void SetStage(char* stageText, const char* text) { FormatText(stageText, 1024, "%s", text); }

}  // namespace

Status RunLauncher() {
    char16_t logPath[kMaxPathUnits] = {0};
    char stageText[1025] = {0};

    // 1-2. The log lives in the user's documents folder. Without it there is no log path and no
    // tag; the log is still opened, with the empty path, and simply stays closed.
    if (FindLogPath(logPath)) FormatText(ModuleName, sizeof ModuleName, "%s", kExeName);
    LogOpen(logPath);

    // 3-4. Both labels are written before the work they name.
    int32_t argc = 0;
    SetStage(stageText, kPreliminary);
    LogStage(kLogLevelProgress, stageText, 0);
    SetStage(stageText, kCommandLine);
    LogStage(kLogLevelProgress, stageText, 0);

    // 5-6. The command line, kept for the life of the process; the application directory becomes
    // the current directory in every instance.
    char16_t** argv = SplitCommandLine(&argc);
    EnterApplicationDirectory(argv[0]);

    // 7. The lock's name is the 8-bit instance name read as UTF-16, the name every instance and
    // every outside probe meets on.
    char16_t lockName[kInstanceLockNameUnits];
    FormInstanceLockName(lockName);
    if (!AcquireInstanceLock(lockName)) {
        // Second instance: raise the running frame, hand over the arguments (or "-n"), end.
        ActivateRunningInstances();
        if (argc > 1) {
            ForwardArguments(argv, argc);
        } else {
            // Slot 0 is never read; slot 2 stays null so that its release below releases nothing.
            char16_t** handOff = static_cast<char16_t**>(malloc(3 * sizeof(char16_t*)));
            if (handOff != nullptr) {
                handOff[1] = const_cast<char16_t*>(u"-n");
                handOff[2] = nullptr;
                argc = 2;
                ForwardArguments(handOff, argc);
                free(handOff[2]);
            }
        }
        return 0;
    }

    // F1. "-noSplash" is looked for in the first argument only, in any letter case.
    if (argc > 1 && Utf16CompareNoCase(argv[1], LAUNCHER_NO_SPLASH_SWITCH) == 0) {
        NoSplash = true;
    } else if (!NoSplash) {
        SplashParams splash;
        splash.resourceName = kSplashResource;
        splash.displayMs = 20000;
        splash.centerOnScreen = 1;
        splash.topMost = 0;
        splash.waitForClose = 0;
        splash.centerX = 0;
        splash.centerY = 0;
        SplashStart(&splash);
    }

    // F2. Integrity of our own file.
    Status protection = ProtectionCheckImage();
    if (protection != 0) {
        SplashClose();
        SetStage(stageText, kLoadError);
        LogStage(kLogLevelError, stageText, kLogCodeLoadError);
        ShowErrorBox(stageText);
        return protection;
    }
    // F3. No debugger. The line is logged while the stage text still reads "CL interpretation";
    // only the box gets the load-error text.
    protection = ProtectionCheckDebugger();
    if (protection != 0) {
        SplashClose();
        LogStage(kLogLevelError, stageText, kLogCodeDebugger);
        SetStage(stageText, kLoadError);
        ShowErrorBox(stageText);
        return protection;
    }

    // F4-F6. A failed launch ends its log with the same closing line.
    Status result = LaunchJavaApplication(argc, argv);
    SetStage(stageText, kLaunchEnd);
    LogStage(kLogLevelLaunchEnd, stageText, 0);
    LogClose();
    return result;
}
