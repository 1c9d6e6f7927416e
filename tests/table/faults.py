# Planted faults: small patches to the launcher, each of which some rows of the table must catch.
# tools/planted-faults.sh [NAME-PART...]   builds each (or those named) in a scratch copy (the Linux
# build, or x86_64 under Wine for Windows code), runs the rows that can reach it, prints "N of N caught".
# Those rows must first pass on the unpatched copy, so that no fault counts as caught by a broken bed.
import re
import shutil
import subprocess
import sys
from pathlib import Path

FAULTS = [  # name, platform it is run on, rows (pytest -k), [(file under launcher/ or tools/..., old, new)]
    ("upper-case hex digits", "linux", "arguments-encoded or hand-off-arguments",
     [("jvm/encode_argument.cpp", '"0123456789abcdef"', '"0123456789ABCDEF"')]),
    ("empty argument not repeating the previous one", "linux", "arguments-encoded or hand-off-arguments",
     [("jvm/encode_argument.cpp", "if (units == 0) return true;", "if (units == 0) return buffer->text[0] = 0, true;")]),
    ("option 13 formatted with the all-users folder", "wine", "no-arguments-splash or both-folders",
     [("jvm/jvm_internal.h", "bool commonAppDataFound;", "bool commonAppDataFound; const char* commonAppData;"),
      ("jvm/jvm_win32.cpp", "    inputs->userAppData = userAppDataNarrow;", "    inputs->userAppData = userAppDataNarrow; "
       "static char common[kFolderPathUnits + 1]; NarrowLowBytes((const char16_t*)commonAppData, common); inputs->commonAppData = common;"),
      ("jvm/vm_options.cpp", '"-Duser.temp.path", userAppData', '"-Duser.temp.path", inputs.commonAppData')]),
    ("noSplash option for the first argument only", "linux", "no-splash-twice",
     [("jvm/vm_options.cpp", "i < inputs.argc; ++i", "i < 2 && i < inputs.argc; ++i")]),
    ("-noSplash compared with case", "linux", "no-splash-any-case",
     [("startup/startup.cpp", "Utf16CompareNoCase(argv[1], LAUNCHER_NO_SPLASH_SWITCH) == 0",
       "argv[1][1] == u'n' && argv[1][3] == u'S' && Utf16CompareNoCase(argv[1], LAUNCHER_NO_SPLASH_SWITCH) == 0")]),
    ("a log line without CR", "linux", "no-arguments-splash", [("log/log.cpp", 'kLineEnd[] = u"\\r\\n"', 'kLineEnd[] = u"\\n"')]),
    ("start line without its own line feed", "linux", "no-arguments-splash", [("log/log.cpp", '%02d %d\\n"', '%02d %d"')]),
    ("no closing line after a failed launch", "linux", "runtime-missing",
     [("startup/startup.cpp", "    SetStage(stageText, kLaunchEnd);", "    if (result != 0) return result;\n    SetStage(stageText, kLaunchEnd);")]),
    ("debugger line logged with the box text", "linux", "under-debugger",
     [("startup/startup.cpp", "        LogStage(kLogLevelError, stageText, kLogCodeDebugger);\n        SetStage(stageText, kLoadError);",
       "        SetStage(stageText, kLoadError);\n        LogStage(kLogLevelError, stageText, kLogCodeDebugger);")]),
    ("integrity check skipped", "linux", "image-altered",
     [("startup/startup.cpp", "Status protection = ProtectionCheckImage();", "Status protection = ProtectionCheckImage() * 0;")]),
    ("no -n when a second start has no arguments", "linux", "hand-off-no-arguments",
     [("startup/startup.cpp", "ForwardArguments(handOff, argc);", "ForwardArguments(handOff, 1);")]),
    ("program path forwarded", "linux", "hand-off", [("instance/handoff.cpp", "for (int32_t i = 1; i < argc", "for (int32_t i = 0; i < argc")]),
    ("four connect attempts", "linux", "first_instance", [("instance/handoff.cpp", "kConnectAttempts = 5", "kConnectAttempts = 4")]),
    ("case-insensitive title test", "linux", "activation",
     [("instance/instance.cpp", "return strstr(bytes, InstanceName) != nullptr;", "return strcasestr(bytes, InstanceName) != nullptr;")]),
    ("restoring a window that is not minimised", "wine", "activation",
     [("instance/instance_win32.cpp", "if (IsIconic(window)) ShowWindow", "ShowWindow")]),
    ("hidden windows raised", "wine", "activation", [("instance/instance_win32.cpp", "if (!IsWindowVisible(window)) return TRUE;", "")]),
    ("the Java toolkit's frame class not recognised", "linux", "activation",
     [("instance/instance_x11.cpp", "IsFrameClassName(className, true)", "IsFrameClassName(className, false)")]),
    ("result -3 lost when string 6 is missing", "wine", "vm-not-created-no-strings",
     [("jvm/launch.cpp", "? created : kStatusNoVmSilent", "? created : created")]),
    ("jre\\bin not searched for the runtime's DLLs", "wine", "runtime-needs", [("jvm/jvm_win32.cpp", "SetDllDirectoryW(runtimeBin) != FALSE", "false")]),
    ("SplashClose before the destroy box", "linux", "no-arguments-splash",
     [("jvm/launch.cpp", "    ShowErrorBox(destroyText);\n    SplashClose();", "    SplashClose();\n    ShowErrorBox(destroyText);")]),
    ("a fade step of 8", "linux", "first_instance", [("splash/splash.h", "kSplashAlphaStep = 4", "kSplashAlphaStep = 8")]),
    ("a second Linux instance truncating the log", "linux", "first_instance",
     [("log/log_posix.cpp", "flock(file, LOCK_EX | LOCK_NB) != 0 || ftruncate(file, 0) != 0", "ftruncate(file, 0) != 0 || flock(file, LOCK_EX | LOCK_NB) != 0")]),
    ("the lock inherited by child processes", "linux", "first_instance",
     [("instance/instance_posix.cpp", "O_RDWR | O_CREAT | O_CLOEXEC, 0600", "O_RDWR | O_CREAT, 0600")]),
    ("overlong UTF-8 accepted", "linux", "arguments-as-bytes",
     [("core/text_posix.cpp", "c < 0x80 ? 1 : c < 0xC2 ? 0", "c < 0x80 ? 1 : c < 0xC0 ? 0")]),
    ("the archive holding the training application's classes", "linux", "archive",  # and checked with its class path
     [("tools/make-jre.sh", "($1 in have) && !seen[$1]++", "!seen[$1]++"),
      ("tools/make-jre.sh", "-Xmx256m -Xshare:dump", '-Xmx256m -Xshare:dump -cp "$app"'),
      ("tools/make-jre.sh", "-Xshare:on -version", '-Xshare:on -cp "$app" -version')]),
    ("the runtime made to require its archive", "linux", "archive",
     [("tools/make-jre.sh", "--no-man-pages --compress", "--no-man-pages --add-options=-Xshare:on --compress"),
      ("tools/make-jre.sh", '-XX:DumpLoadedClassList="$list"', '-Xshare:auto -XX:DumpLoadedClassList="$list"')]),
    ("the runtime's native files not stripped", "linux", "runtime_made", [("tools/make-jre.sh", 'strip "$file" ;;', ': ;;')]),
    ("the runtime trained with the application alone", "linux", "runtime_made",
     [("tools/make-jre.sh", '"$tmp/training.jar Workbench" ${app', '${app')]),
    ("the application jar left out of the runtime's inputs", "linux", "runtime_made",
     [("tools/make-jre.sh", '"$training"/*.java ${app:+"$app"}', '"$training"/*.java')]),
]
BUILDS = {"linux": ("linux", [], ["launcher"]),
          "wine": ("x86_64", ["-DCMAKE_TOOLCHAIN_FILE={scratch}/cmake/toolchain-x86_64-w64-mingw32.cmake"],
                   ["launcher", "launcher_nostrings"])}

def main(names, scratch=Path("/tmp/planted-faults")):
    faults = [f for f in FAULTS if not names or any(n in f[0] for n in names)]
    shutil.rmtree(scratch, ignore_errors=True)
    shutil.copytree(Path(__file__).resolve().parents[2], scratch, ignore=shutil.ignore_patterns("build", "dist", ".git"))
    quiet = dict(stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    table = lambda platform, rows: subprocess.run(
        [sys.executable, "-m", "pytest", "tests/table", "-p", "no:cacheprovider", "-q", "-rf", "--build", "build",
         "--platforms", f"{platform}-x86_64", "-k", rows], cwd=scratch, capture_output=True, text=True)
    for platform in sorted({f[1] for f in faults}):  # everything the table needs, and its rows pass before any fault
        folder, options, _ = BUILDS[platform]
        subprocess.run(["cmake", "-S", scratch, "-B", scratch / "build" / folder, "-G", "Ninja", "-DCMAKE_BUILD_TYPE=Release",
                        *[o.format(scratch=scratch) for o in options]], check=True, **quiet)
        subprocess.run(["cmake", "--build", scratch / "build" / folder], check=True, **quiet)
        baseline = table(platform, " or ".join(f"({f[2]})" for f in faults if f[1] == platform))
        if baseline.returncode != 0:
            print(f"the rows fail on {platform} without any fault planted:\n{baseline.stdout[-3000:]}")
            return False
    caught = 0
    for name, platform, rows, edits in faults:
        folder, _, targets = BUILDS[platform]
        originals = {}
        for file, old, new in edits:
            path = scratch / (file if file.startswith("tools/") else "launcher/" + file)
            text = path.read_text()
            originals.setdefault(path, text)
            assert text.count(old) == 1, f"{name}: {old!r} does not occur once in {file}"
            path.write_text(text.replace(old, new))
        built = subprocess.run(["cmake", "--build", scratch / "build" / folder, "--target", *targets], **quiet).returncode == 0
        run = table(platform, rows)
        failed = re.findall(r"^FAILED \S+::(\S+)", run.stdout, re.M) if built else []
        caught += bool(failed)
        verdict = "caught by " + ", ".join(failed) if failed else "does not build" if not built else \
            "NOT CAUGHT" if run.returncode == 0 else "NOT CAUGHT, the rows could not run:\n" + run.stdout[-2000:]
        print(f"{name} ({platform}): {verdict}", flush=True)
        for path, text in originals.items():
            path.write_text(text)
    print(f"{caught} of {len(faults)} caught")
    return caught == len(faults)

if __name__ == "__main__":
    sys.exit(0 if main(sys.argv[1:]) else 1)
