// The call of the application's main class: String[] of the encoded arguments, static main.
#include "jvm_internal.h"

#include <stdlib.h>

Status CallJavaMain(const char* className, char16_t** argv, int32_t argc) {
    JNIEnv* env = JvmState.env;

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
        EncodeArgumentInto(argv[i], &encoded);
        jstring element = env->NewStringUTF(encoded.text != nullptr ? encoded.text : "");
        env->SetObjectArrayElement(arguments, i - 1, element);
    }
    free(encoded.text);

    // Runs the Java application's main thread; an exception thrown out of main is left pending, for
    // the platform to describe or not (DescribeJavaException).
    env->CallStaticVoidMethod(mainClass, mainMethod, arguments);
    return kStatusOk;
}
