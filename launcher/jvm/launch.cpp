// LaunchJavaApplication: the first instance's last and longest step. The application directory
// becomes the current directory for good, the private runtime's VM library is loaded relative to
// it, the VM is created with the fixed option list, the application's main class runs, the VM is
// destroyed when the Java side is finished, and the splash is closed.
#include "jvm_internal.h"

#include "../core/messages.h"
#include "../splash/splash.h"

#include <stdlib.h>

namespace {

// Shows string `id` of the string table; false when there is no such string (nothing is shown).
bool ShowMessageBox(int32_t id) {
    char* text = LoadMessageText(id);
    if (text == nullptr) return false;
    ShowErrorBox(text);
    return true;
}

}  // namespace

Status LaunchJavaApplication(int32_t argc, char16_t** argv) {
    char* appDirectory = EnterVmDirectory(argv[0]);

    if (LoadPrivateRuntime() != kStatusOk) {
        ShowMessageBox(kMessageVmLibraryNotLoaded);
        return kStatusNotFound;
    }

    VmOptionInputs inputs;
    inputs.appDirectory = appDirectory;
    inputs.argc = argc;
    inputs.argv = argv;
    FindSettingsFolders(&inputs);
    ComposeVmOptions(inputs);
    free(appDirectory);

    Status created = CreateVm();
    if (created != kStatusOk) {
        // Without a message text the result is -3 whatever the VM said.
        return ShowMessageBox(kMessageVmNotCreated) ? created : kStatusNoVmSilent;
    }

    // Returns when the Java main method has returned.
    Status called = CallJavaMain(LAUNCHER_MAIN_CLASS, argv, argc);
    DescribeJavaException();
    if (called != kStatusOk) ShowMessageBox(kMessageMainClassNotCalled);

    // Waits for the Java application's last non-daemon thread. The box is shown on every return
    // through here, success included; it is how the launcher reports the VM's end.
    Status destroyed = DestroyVm();
    char destroyText[64];
    FormatText(destroyText, sizeof destroyText, "jvm destroy res=%d", static_cast<int>(destroyed));
    ShowErrorBox(destroyText);
    SplashClose();
    return destroyed;
}
