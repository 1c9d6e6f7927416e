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
//
// Details the lines above leave open:
//   - Escapes use lower-case hex ("caf\xe9"); a backslash itself is not escaped.
//   - Handles print as the text behind them: a class its name, a string its text, a method its
//     name; a null handle prints "null", a handle the double did not hand out (or of another kind,
//     e.g. a class where a string belongs) prints "<invalid>".
//   - A script line that is not understood (unknown key, bad value, no '=') is recorded as
//     "SCRIPT ignored LINE" when the script is read, before the JNI_CreateJavaVM line.
//   - Numbers: decimal with optional sign, or 0x hex; anything that fits in 32 bits, so
//     main_exit=0xC0000005 works. missing_class compares the exact bytes FindClass receives.
//   - main_ms and main_until_file together: main ends at whichever comes first.
//   - window: V=0,M=1 makes a hidden window created minimised (WS_MINIMIZE). Windows are created
//     by the thread calling main with DefWindowProc and WS_OVERLAPPEDWINDOW, 400x300; V=1 shows
//     them with SW_SHOWNORMAL or SW_SHOWMINIMIZED. They stay until the process ends, but nothing
//     pumps their messages after main returns: query them from other processes while main runs,
//     or with SendMessageTimeout.
//   - create_result != 0 stores null into *pvm and *penv. A null args pointer records
//     "JNI_CreateJavaVM args=null" and returns -1; nOptions > 0 with null options records
//     "options=null".
//   - Faulty calls still record their line, with a suffix: NewObjectArray with a negative length
//     " -> null" (returns null); SetObjectArrayElement outside the array " -> out of bounds", on a
//     null or foreign array " -> array null|<invalid>"; CallStaticVoidMethodV on such an array
//     prints "argc=null|<invalid>" and no arg lines. GetStaticMethodID with a null name or
//     signature returns null with " -> null". Failures to make a scripted window are recorded as
//     "WINDOW class failed error=N" / "WINDOW create failed error=N".
//   - Function tables: the invocation interface has 8 slots (0-2 reserved, 3 DestroyJavaVM, 4-7);
//     the JNI table has 256 (4 reserved, GetVersion at 4, ... all 235 real ones, the rest spare).
//     Every slot except DestroyJavaVM, FindClass (6), GetStaticMethodID (113),
//     CallStaticVoidMethodV (142), NewStringUTF (167), NewObjectArray (172) and
//     SetObjectArrayElement (174) traps - including CallStaticVoidMethod (141), the reserved
//     slots and all exception functions. Exit codes of the two tables overlap; the TRAP line
//     tells them apart.
//   - Calling conventions on i686: JNI_CreateJavaVM (exported undecorated), DestroyJavaVM and the
//     implemented JNI functions are __stdcall and pop their arguments (ret 12/4/8/16), exactly as
//     the real library's; a caller using cdecl is left with a displaced stack. Seen with MinGW
//     code: calling the JNI table as cdecl crashes within a few calls, but one lone cdecl call of
//     JNI_CreateJavaVM is absorbed by the caller's frame-pointer epilogue (as it would be with the
//     real library); the double cannot see that from inside, so check the launcher's pointer
//     types at compile time.
//   - The application directory is the DLL's own path minus its last four components
//     (appDir\jre\bin\client\jvm.dll); a DLL placed less deep uses its own folder.
//
// The dependent variant (build target vmdouble_dep, file <build>/tests/wine/vmdouble/jvm_dep/
// jvm.dll) behaves the same but imports vmdouble_rt_ping from vmdouble_rt.dll (target vmdouble_rt,
// next to jvm.dll in the build folder) and calls it in JNI_CreateJavaVM. Install the variant as
// jre\bin\client\jvm.dll and vmdouble_rt.dll in jre\bin: it loads only when the launcher puts the
// runtime's bin folder on the DLL search path (otherwise LoadLibrary fails with error 126). The
// "vmdouble" target depends on both, so anything depending on "vmdouble" gets them built.
//
// vmdouble_selftest.exe (built next to jvm.dll, finds the DLLs next to itself) checks the double
// itself under Wine; exit code 0 when all its checks pass.
#ifndef TESTS_WINE_VMDOUBLE_VMDOUBLE_H
#define TESTS_WINE_VMDOUBLE_VMDOUBLE_H
#define VMDOUBLE_TRAP_EXIT_BASE 0xDEAD0000u
#endif
