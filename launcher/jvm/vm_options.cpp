// The VM option list, its composition, and creating and destroying the VM.
#include "jvm_internal.h"

#include <stdlib.h>
#include <string.h>

VmState JvmState;

namespace {

// Grows by exactly one record per AddVmOption; the texts are private copies. Both outlive the VM.
JavaVMOption* optionRecords = nullptr;
int32_t optionCount = 0;

const size_t kOptionTextBytes = 1024;

// Formats "<name>=<value>" into a 1024-byte buffer (a longer text is cut there) and appends it.
void AddValueOption(const char* name, const char* value) {
    char text[kOptionTextBytes];
    FormatText(text, sizeof text, "%s=%s", name, value);
    AddVmOption(text);
}

}  // namespace

void AddVmOption(const char* text) {
    if (text == nullptr) return;
    size_t length = strlen(text);
    char* copy = static_cast<char*>(malloc(length + 1));
    if (copy == nullptr) return;
    memcpy(copy, text, length + 1);

    JavaVMOption* grown =
        static_cast<JavaVMOption*>(malloc((static_cast<size_t>(optionCount) + 1) * sizeof(JavaVMOption)));
    if (grown == nullptr) {
        free(copy);
        return;
    }
    if (optionCount > 0) memcpy(grown, optionRecords, static_cast<size_t>(optionCount) * sizeof(JavaVMOption));
    grown[optionCount].optionString = copy;
    grown[optionCount].extraInfo = nullptr;
    free(optionRecords);
    optionRecords = grown;
    ++optionCount;
}

int32_t VmOptionCount() { return optionCount; }
const JavaVMOption* VmOptionRecords() { return optionRecords; }

void NarrowLowBytes(const char16_t* folder, char* out) {
    for (int i = 0; i < kFolderPathUnits; ++i) out[i] = static_cast<char>(folder[i] & 0xFF);
    out[kFolderPathUnits] = 0;
}

void ComposeVmOptions(const VmOptionInputs& inputs) {
    // A failed conversion of the directory prints as the C runtimes print a null text.
    const char* appDirectory = inputs.appDirectory != nullptr ? inputs.appDirectory : "(null)";
    char classPath[kOptionTextBytes];
    FormatText(classPath, sizeof classPath, "-Djava.class.path=%s%s%s", appDirectory, kDirectorySeparator,
               LAUNCHER_CLASS_PATH_JAR);
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

Status CreateVm() {
    if (JvmState.createJavaVm == nullptr) return kStatusNotFound;
    JavaVMInitArgs args;
    args.version = JNI_VERSION_1_6;
    args.nOptions = optionCount;
    args.options = optionRecords;
    args.ignoreUnrecognized = JNI_TRUE;
    return JvmState.createJavaVm(&JvmState.vm, reinterpret_cast<void**>(&JvmState.env), &args);
}

Status DestroyVm() {
    if (JvmState.vm == nullptr) return kStatusNotFound;
    return JvmState.vm->DestroyJavaVM();
}
