"""Planted faults: small patches to the launcher, each of which some rows of the table must catch.
    /usr/bin/python3 tests/table/faults.py [NAME-PART...]   builds each (or those named) in a scratch copy
                                        (x86_64), runs the rows that can reach it, prints "N of N caught" """
import re
import shutil
import subprocess
import sys
from pathlib import Path

FAULTS = [  # name, rows (pytest -k), [(file under launcher/, old, new)]
    ("upper-case hex digits", "arguments-encoded or hand-off-arguments",
     [("jvm/encode_argument.cpp", '"0123456789abcdef"', '"0123456789ABCDEF"')]),
    ("empty argument not repeating the previous one", "arguments-encoded or hand-off-arguments",
     [("jvm/encode_argument.cpp", "if (units == 0) return true;", "if (units == 0) return buffer->text[0] = 0, true;")]),
    ("option 13 formatted with the all-users folder", "no-arguments-splash or both-folders",
     [("jvm/jvm_internal.h", "bool commonAppDataFound;", "bool commonAppDataFound; const char* commonAppData;"),
      ("jvm/jvm_win32.cpp", "inputs.commonAppDataFound = commonAppDataFound;", "inputs.commonAppDataFound = commonAppDataFound; "
       "char common[kFolderPathUnits + 1]; NarrowLowBytes((const char16_t*)commonAppData, common); inputs.commonAppData = common;"),
      ("jvm/vm_options.cpp", '"-Duser.temp.path", userAppData', '"-Duser.temp.path", inputs.commonAppData')]),
    ("noSplash option for the first argument only", "no-splash-twice",
     [("jvm/vm_options.cpp", "i < inputs.argc; ++i", "i < 2 && i < inputs.argc; ++i")]),
    ("-noSplash compared with case", "no-splash-any-case",
     [("startup/startup_win32.cpp", "Utf16CompareNoCase(reinterpret_cast<const char16_t*>(argv[1]), LAUNCHER_NO_SPLASH_SWITCH)",
       'wcscmp(argv[1], L"-noSplash")')]),
    ("a log line without CR", "no-arguments-splash", [("log/log.cpp", 'kLineEnd[] = u"\\r\\n"', 'kLineEnd[] = u"\\n"')]),
    ("start line without its own line feed", "no-arguments-splash", [("log/log.cpp", '%02d %d\\n"', '%02d %d"')]),
    ("no closing line after a failed launch", "runtime-missing",
     [("startup/startup_win32.cpp", "    SetStage(stageText, kLaunchEnd);", "    if (result != 0) return result;\n    SetStage(stageText, kLaunchEnd);")]),
    ("debugger line logged with the box text", "under-debugger",
     [("startup/startup_win32.cpp", "        LogStage(kLogLevelError, stageText, kDebuggerErrorCode);\n        SetStage(stageText, kLoadError);",
       "        SetStage(stageText, kLoadError);\n        LogStage(kLogLevelError, stageText, kDebuggerErrorCode);")]),
    ("integrity check skipped", "image-altered",
     [("startup/startup_win32.cpp", "Status protection = ProtectionCheckImage();", "Status protection = 0;")]),
    ("no -n when a second start has no arguments", "hand-off-no-arguments",
     [("startup/startup_win32.cpp", "ForwardArguments(handOff, argc);", "ForwardArguments(handOff, 1);")]),
    ("program path forwarded", "hand-off", [("instance/instance_win32.cpp", "for (int32_t i = 1; i < argc", "for (int32_t i = 0; i < argc")]),
    ("four connect attempts", "first_instance", [("instance/instance_win32.cpp", "kConnectAttempts = 5", "kConnectAttempts = 4")]),
    ("case-insensitive title test", "activation",
     [("instance/instance_win32.cpp", "strstr(reinterpret_cast<const char*>(title), InstanceName)",
       "StrStrIA(reinterpret_cast<const char*>(title), InstanceName)"),
      ("instance/instance_win32.cpp", "#include <string.h>", "#include <string.h>\n#include <shlwapi.h>")]),
    ("restoring a window that is not minimised", "activation",
     [("instance/instance_win32.cpp", "if (IsIconic(window)) ShowWindow", "ShowWindow")]),
    ("hidden windows raised", "activation", [("instance/instance_win32.cpp", "if (!IsWindowVisible(window)) return TRUE;", "")]),
    ("result -3 lost when string 6 is missing", "vm-not-created-no-strings",
     [("jvm/jvm_win32.cpp", "? created : kStatusNoVmSilent", "? created : created")]),
    ("jre\\bin not searched for the runtime's DLLs", "runtime-needs", [("jvm/jvm_win32.cpp", "SetDllDirectoryW(runtimeBin) != FALSE", "false")]),
    ("SplashClose before the destroy box", "no-arguments-splash or main-class-missing",
     [("jvm/jvm_win32.cpp", "    ShowErrorBox(destroyText);\n    SplashClose();", "    SplashClose();\n    ShowErrorBox(destroyText);")]),
    ("a fade step of 8", "first_instance", [("splash/splash_win32.cpp", "kAlphaStep = 4;", "kAlphaStep = 8;")]),
]


def main(names, scratch=Path("/tmp/planted-faults")):
    faults = [f for f in FAULTS if not names or any(n in f[0] for n in names)]
    shutil.rmtree(scratch, ignore_errors=True)
    shutil.copytree(Path(__file__).resolve().parents[2], scratch, ignore=shutil.ignore_patterns("build", "dist", ".git"))
    build, quiet = scratch / "build/x86_64", dict(stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    subprocess.run(["cmake", "-S", scratch, "-B", build, "-G", "Ninja", "-DCMAKE_BUILD_TYPE=Release",
                    f"-DCMAKE_TOOLCHAIN_FILE={scratch}/cmake/toolchain-x86_64-w64-mingw32.cmake"], check=True, **quiet)
    subprocess.run(["cmake", "--build", build], check=True, **quiet)
    caught = 0
    for name, rows, edits in faults:
        originals = {}
        for file, old, new in edits:
            path = scratch / "launcher" / file
            text = path.read_text()
            originals.setdefault(path, text)
            assert text.count(old) == 1, f"{name}: {old!r} does not occur once in {file}"
            path.write_text(text.replace(old, new))
        built = subprocess.run(["cmake", "--build", build, "--target", "launcher", "launcher_nostrings"], **quiet).returncode == 0
        run = subprocess.run([sys.executable, "-m", "pytest", "tests/table", "-p", "no:cacheprovider", "-q", "-rf", "--build",
                              "build", "--platforms", "wine-x86_64", "-k", rows], cwd=scratch, capture_output=True, text=True)
        failed = re.findall(r"^FAILED \S+::(\S+)", run.stdout, re.M) if built else []
        caught += bool(failed)
        print(f"{name}: " + ("caught by " + ", ".join(failed) if failed else "NOT CAUGHT" if built else "does not build"), flush=True)
        for path, text in originals.items():
            path.write_text(text)
    print(f"{caught} of {len(faults)} caught")
    return caught == len(faults)


if __name__ == "__main__":
    sys.exit(0 if main(sys.argv[1:]) else 1)
