// The VM double: a stand-in jvm.dll for tests. It exports JNI_CreateJavaVM with the real calling
// convention (__stdcall on i686, undecorated name), hands out invocation and JNI function tables
// whose every slot the launcher should not use traps loudly, records what the launcher gives it
// and behaves as a test script says. It is deliberately built from its own declarations, not from
// any jni.h, so a calling-convention slip in the launcher cannot be mirrored here.
//
// Files, in the application directory (three levels above the DLL, i.e. above jre\bin\client):
//   vmdouble.ini  script, "key=value" per line, read once in JNI_CreateJavaVM; '#' starts a comment
//   vmdouble.log  record, appended and flushed line by line (UTF-8 / raw bytes, LF)
//
// Script keys (all optional):
//   create_result=N        JNI_CreateJavaVM returns N; when N != 0 no VM is made       (default 0)
//   missing_class=NAME     FindClass(NAME) returns null (may repeat)
//   missing_method=1       GetStaticMethodID returns null
//   main_ms=N              main runs N ms (pumping messages)                           (default 0)
//   main_until_file=NAME   main runs until appDir\NAME exists (at most 120 s)
//   main_exit=N            main ends the process with exit code N, as System.exit does
//   destroy_result=N       DestroyJavaVM returns N                                       (default 0)
//   window=V,M,CLASS,TITLEHEX   main creates a top-level window before it waits: V visible 0/1,
//                          M minimised 0/1, CLASS its class name (ASCII), TITLEHEX the title as
//                          4 hex digits per UTF-16 unit (empty: untitled). May repeat; windows are
//                          created in order. Window messages are answered while main runs.
//
// Record lines, in order of the calls (texts as raw bytes; bytes < 0x20 or >= 0x7f as \xHH):
//   JNI_CreateJavaVM version=0x%08x nOptions=%d ignoreUnrecognized=%d
//   option[%d]=TEXT extraInfo=null|set         one per option
//   FindClass NAME                             "-> null" appended when scripted missing
//   GetStaticMethodID CLASS NAME SIG           "-> null" appended when scripted missing
//   NewObjectArray length=%d class=CLASS init=null|set
//   NewStringUTF TEXT
//   SetObjectArrayElement index=%d value=TEXT
//   CallStaticVoidMethodV CLASS.NAME argc=%d   then one line "arg[%d]=TEXT" per array element
//   main returned
//   DestroyJavaVM
//   TRAP invoke slot %d / TRAP jni slot %d     then the process ends with 0xDEAD0000 + slot
// JNI_CreateJavaVM with create_result != 0 records its line and options and returns at once.
#ifndef TESTS_WINE_VMDOUBLE_VMDOUBLE_H
#define TESTS_WINE_VMDOUBLE_VMDOUBLE_H
#define VMDOUBLE_TRAP_EXIT_BASE 0xDEAD0000u
#endif
