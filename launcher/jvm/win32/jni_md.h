/* Machine-dependent JNI types for Windows, used in front of the OpenJDK jni.h.
 * JNICALL must be __stdcall: the 32-bit VM's exported entry points and its function tables use it,
 * and a mismatch only shows as a corrupted stack with a real runtime. On x86_64 the keyword is
 * accepted and ignored. */
#ifndef LAUNCHER_JNI_MD_H
#define LAUNCHER_JNI_MD_H

#define JNIEXPORT __declspec(dllexport)
#define JNIIMPORT __declspec(dllimport)
#define JNICALL __stdcall

typedef long jint; /* 32 bits on every Windows target */
typedef long long jlong;
typedef signed char jbyte;

#endif
