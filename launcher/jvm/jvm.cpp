// LaunchJavaApplication: the first instance's last and longest step. The application directory
// becomes the current directory for good, the private runtime's VM library is loaded relative to
// it, the VM is created with the fixed option list, the application's main class runs, the VM is
// destroyed when the Java side is finished, and the splash is closed. The platform's part is behind
// jvm_platform.h.
#include "jvm.h"
#include "jvm_platform.h"

#include "../errorbox/errorbox.h"
#include "../splash/splash.h"
#include "../text/text.h"

#include <stdlib.h>
#include <string.h>

namespace {

const char kMainClass[] = "com/qz/kpo/emu57/app/ApplicationMainForm";
const char kClassPathJar[] = "emu57.jar";

VmState gVmState;

// The option list as the VM gets it: grows by exactly one record per AddVmOption; the texts are
// private copies. Both outlive the VM and are never freed.
JavaVMOption* gOptionRecords = nullptr;
int32_t gOptionCount = 0;

const size_t kOptionTextBytes = 1024;

void AddVmOption(const char* text) {
    if (text == nullptr) return;
    size_t length = strlen(text);
    char* copy = static_cast<char*>(malloc(length + 1));
    if (copy == nullptr) return;
    memcpy(copy, text, length + 1);

    JavaVMOption* grown =
        static_cast<JavaVMOption*>(malloc((static_cast<size_t>(gOptionCount) + 1) * sizeof(JavaVMOption)));
    if (grown == nullptr) {
        free(copy);
        return;
    }
    if (gOptionCount > 0) memcpy(grown, gOptionRecords, static_cast<size_t>(gOptionCount) * sizeof(JavaVMOption));
    grown[gOptionCount].optionString = copy;
    grown[gOptionCount].extraInfo = nullptr;
    free(gOptionRecords);
    gOptionRecords = grown;
    ++gOptionCount;
}

// Formats "<name>=<value>" into a 1024-byte buffer (a longer text is cut there) and appends it.
void AddValueOption(const char* name, const char* value) {
    char text[kOptionTextBytes];
    FormatText(text, sizeof text, "%s=%s", name, value);
    AddVmOption(text);
}

// The launch options in their fixed order. Sets NoSplash once for every "-noSplash" argument, in
// any letter case, at any position.
void ComposeVmOptions(const VmOptionInputs& inputs) {
    // A failed conversion of the directory prints as the C runtimes print a null text.
    const char* appDirectory = inputs.appDirectory != nullptr ? inputs.appDirectory : "(null)";
    char classPath[kOptionTextBytes];
    FormatText(classPath, sizeof classPath, "-Djava.class.path=%s%s%s", appDirectory, kDirectorySeparator,
               kClassPathJar);
    AddVmOption(classPath);

    AddVmOption("-Xms64m");
    AddVmOption("-Xmx256m");
    AddVmOption("-Dswing.aatext=true");
    // The Java side expects every argument hex-encoded (EncodeArgument).
    AddVmOption("-DencodedFilenames=true");
    AddVmOption("-Dsun.locale.formatasdefault=true");
    AddValueOption("-Djava.library.path", appDirectory);
    AddVmOption("-DconsoleLogLevel=ALL");
    AddVmOption("-DfileLogLevel=INFO");
    AddVmOption("-DjniFileLogLevel=3");

    // Once per matching argument, the executable's own path included: twice given, twice added.
    for (int32_t i = 0; i < inputs.argc; ++i) {
        if (inputs.argv[i] != nullptr && Utf16CompareNoCase(inputs.argv[i], LAUNCHER_NO_SPLASH_SWITCH) == 0) {
            AddVmOption("-Dapp.lumiscope57.noSplash=true");
            NoSplash = true;
        }
    }

    const char* userAppData = inputs.userAppDataFound && inputs.userAppData != nullptr ? inputs.userAppData : "";
    if (inputs.userAppDataFound) AddValueOption("-Duser.appdata.path", userAppData);
    // The all-users folder only decides whether the temp path is given; its value is the per-user
    // folder, empty when that one was not found.
    if (inputs.commonAppDataFound) AddValueOption("-Duser.temp.path", userAppData);
}

// Creates the VM with the option list; -1 without calling anything when there is no entry point.
Status CreateVm() {
    if (gVmState.createJavaVm == nullptr) return kStatusNotFound;
    JavaVMInitArgs args;
    args.version = JNI_VERSION_1_6;
    args.nOptions = gOptionCount;
    args.options = gOptionRecords;
    args.ignoreUnrecognized = JNI_TRUE;
    return gVmState.createJavaVm(&gVmState.vm, reinterpret_cast<void**>(&gVmState.env), &args);
}

// DestroyJavaVM; -1 when no VM is held.
Status DestroyVm() {
    if (gVmState.vm == nullptr) return kStatusNotFound;
    return gVmState.vm->DestroyJavaVM();
}

// Calls the static main(String[]) of `className` (slash form) with argv[1..argc-1] encoded.
// 0 after main returned, -1 a class not found, -2 no static main method.
Status CallJavaMain(const char* className, char16_t** argv, int32_t argc) {
    JNIEnv* env = gVmState.env;

    // Both lookups are made before either is tested.
    jclass stringClass = env->FindClass("java/lang/String");
    jclass mainClass = env->FindClass(className);
    if (stringClass == nullptr || mainClass == nullptr) return kStatusNotFound;

    jmethodID mainMethod = env->GetStaticMethodID(mainClass, "main", "([Ljava/lang/String;)V");
    if (mainMethod == nullptr) return kStatusNoMainMethod;

    // The executable's own path is never passed. An empty argument keeps the buffer as it is, so
    // it repeats the encoding before it; one in the first place gives the empty text.
    jobjectArray arguments = env->NewObjectArray(argc - 1, stringClass, nullptr);
    EncodeBuffer encoded = {nullptr, 0};
    for (int32_t i = 1; i < argc; ++i) {
        EncodeArgument(argv[i], &encoded);
        jstring element = env->NewStringUTF(encoded.text != nullptr ? encoded.text : "");
        env->SetObjectArrayElement(arguments, i - 1, element);
    }
    free(encoded.text);

    // Runs the Java application's main thread; an exception thrown out of main is left pending, for
    // the platform to describe or not (DescribeJavaException).
    env->CallStaticVoidMethod(mainClass, mainMethod, arguments);
    return kStatusOk;
}

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

    if (LoadPrivateRuntime(&gVmState) != kStatusOk) {
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
    Status called = CallJavaMain(kMainClass, argv, argc);
    DescribeJavaException(gVmState);
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
