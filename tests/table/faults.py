# Planted faults: small patches to the launcher and to the private runtime's maker, each of which some
# rows of the table (or the host tests' table) must catch.
# tools/planted-faults.sh [NAME-PART...]   builds each (or those named) in a scratch copy (the Linux
# build, x86_64 under Wine for Windows code, or the host tests), runs the rows that can reach it,
# prints "N of N caught". Those rows must first pass on the unpatched copy, so that no fault counts as
# caught by a broken bed.
# faults.py --check   only says whether every plant still applies: its text stands exactly once in
# its file. A plant whose code moved or changed fails loudly here (and in `make test`), never silently.
import re
import shutil
import subprocess
import sys
import tempfile
from pathlib import Path

FAULTS = [  # name, platform it is run on, rows (pytest -k; the host tests run whole), [(file, old, new)]
    ("upper-case hex digits", "linux", "arguments-encoded or hand-off-arguments",
     [("text/encode_argument.cpp", '"0123456789abcdef"', '"0123456789ABCDEF"')]),
    ("empty argument not repeating the previous one", "linux", "arguments-encoded or hand-off-arguments",
     [("text/encode_argument.cpp", "if (units == 0) return true;", "if (units == 0) return buffer->text[0] = 0, true;")]),
    ("option 13 formatted with the all-users folder", "wine", "no-arguments-splash or both-folders",
     [("jvm/jvm_platform.h", "bool commonAppDataFound;", "bool commonAppDataFound; const char* commonAppData;"),
      ("jvm/jvm_win32.cpp", "    inputs->userAppData = gUserAppDataNarrow;", "    inputs->userAppData = gUserAppDataNarrow; "
       "static char common[kFolderPathUnits + 1]; NarrowLowBytes((const char16_t*)commonAppData, common); inputs->commonAppData = common;"),
      ("jvm/jvm.cpp", '"-Duser.temp.path", userAppData', '"-Duser.temp.path", inputs.commonAppData')]),
    ("noSplash option for the first argument only", "linux", "no-splash-twice",
     [("jvm/jvm.cpp", "i < inputs.argc; ++i", "i < 2 && i < inputs.argc; ++i")]),
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
    ("four connect attempts", "linux", "first_instance", [("instance/handoff.cpp", "ConnectAttempts = 5", "ConnectAttempts = 4")]),
    ("case-insensitive title test", "linux", "activation",
     [("instance/instance.cpp", "return strstr(bytes, InstanceName) != nullptr;", "return strcasestr(bytes, InstanceName) != nullptr;")]),
    ("restoring a window that is not minimised", "wine", "activation",
     [("instance/instance_win32.cpp", "if (IsIconic(window)) ShowWindow", "ShowWindow")]),
    ("hidden windows raised", "wine", "activation", [("instance/instance_win32.cpp", "if (!IsWindowVisible(window)) return TRUE;", "")]),
    ("the Java toolkit's frame class not recognised", "linux", "activation",
     [("instance/instance_x11.cpp", "IsFrameClassName(className, true)", "IsFrameClassName(className, false)")]),
    ("result -3 lost when string 6 is missing", "wine", "vm-not-created-no-strings",
     [("jvm/jvm.cpp", "? created : kStatusNoVmSilent", "? created : created")]),
    ("jre\\bin not searched for the runtime's DLLs", "wine", "runtime-needs", [("jvm/jvm_win32.cpp", "SetDllDirectoryW(runtimeBin) != FALSE", "false")]),
    ("SplashClose before the destroy box", "linux", "no-arguments-splash",
     [("jvm/jvm.cpp", "    ShowErrorBox(destroyText);\n    SplashClose();", "    SplashClose();\n    ShowErrorBox(destroyText);")]),
    ("a fade step of 8", "linux", "first_instance", [("splash/splash_platform.h", "kSplashAlphaStep = 4", "kSplashAlphaStep = 8")]),
    ("a second Linux instance truncating the log", "linux", "first_instance",
     [("log/log_posix.cpp", "flock(file, LOCK_EX | LOCK_NB) != 0 || ftruncate(file, 0) != 0", "ftruncate(file, 0) != 0 || flock(file, LOCK_EX | LOCK_NB) != 0")]),
    ("the lock inherited by child processes", "linux", "first_instance",
     [("instance/instance_posix.cpp", "O_NONBLOCK | O_CLOEXEC, 0600", "O_NONBLOCK, 0600")]),
    ("a reset hand-off ending the second instance with SIGPIPE", "linux", "hand-off-reset-by-listener",
     [("instance/instance_posix.cpp", "send(static_cast<int>(link.socket), data, bytes, MSG_NOSIGNAL)",
       "send(static_cast<int>(link.socket), data, bytes, 0)")]),
    ("the instance lock taken where $HOME points", "linux", "hand-off-whatever or hand-off-no-arguments",
     [("instance/instance_posix.cpp", "const passwd* account = getpwuid(getuid());", "return getenv(\"HOME\"); const passwd* account = nullptr;")]),
    ("a lock that cannot be had taken for another instance", "linux", "lock-folder",
     [("instance/instance_posix.cpp", "    return true;\n}\n\nbool HandOffStart", "    return false;\n}\n\nbool HandOffStart")]),
    ("the lock folder followed through a symbolic link", "linux", "lock-folder-a-link",
     [("instance/instance_posix.cpp", "O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC", "O_RDONLY | O_DIRECTORY | O_CLOEXEC")]),
    ("the VM library loaded unchecked", "linux", "runtime-truncated or runtime-a-fifo",
     [("jvm/jvm_posix.cpp", "const char* damage = DamageOfLibrary(path);", "const char* damage = path == nullptr ? DamageOfLibrary(path) : nullptr;")]),
    ("the section-header table not checked", "linux", "runtime-section-headers-cut",
     [("jvm/jvm_posix.cpp", "(header.e_shoff == 0 || Inside(", "(true || Inside(")]),
    ("the second start's activation unbounded", "linux", "hand-off-display-not-answering",
     [("instance/instance_x11.cpp", "poll(&end, 1, static_cast<int>(left))", "poll(&end, 1, -1)")]),
    ("closed standard streams left closed", "linux", "standard-streams-closed",
     [("startup/startup_posix.cpp", "for (int stream = 0; stream <= 2; ++stream)", "for (int stream = 0; stream < 0; ++stream)")]),
    ("the settings file opened in a way that can block", "linux", "settings-file-a-fifo",
     [("startup/startup_posix.cpp", "O_RDONLY | O_NONBLOCK | O_CLOEXEC", "O_RDONLY | O_CLOEXEC")]),
    ("the VM's own end during its creation not heard", "linux", "vm-ends-process", [("jvm/jvm_posix.cpp", "    gVmBeingCreated = true;\n", "")]),
    ("the JNI code of a VM not created left unsaid", "linux", "vm-not-created-real-vm",
     [("jvm/jvm_posix.cpp", "if (result != JNI_OK) {", "if (result == 12345) {")]),
    ("an exception out of main not described", "linux", "exception-out-of-main", [("jvm/jvm.cpp", "    DescribeJavaException(gVmState);\n", "")]),
    ("a failed log write shown on the Linux terminal", "linux", "first_instance",
     [("log/log_posix.cpp", "void LogPlatformWriteFailed(uint32_t) {}",
       'void LogPlatformWriteFailed(uint32_t) { (void)!write(1, "WriteFile failed with error 9.\\n", 31); }')]),
    ("overlong UTF-8 accepted", "linux", "arguments-as-bytes",
     [("text/text_posix.cpp", "c < 0x80 ? 1 : c < 0xC2 ? 0", "c < 0x80 ? 1 : c < 0xC0 ? 0")]),
    ("the lock's name paired high byte first", "linux", "hand-off-no-arguments",
     [("instance/instance.cpp", "bytes[2 * i] | bytes[2 * i + 1] << 8", "bytes[2 * i] << 8 | bytes[2 * i + 1]")]),
    ("the log's text cut at the unit count on Linux", "host", "",
     [("log/log_posix.cpp", "return static_cast<int>(strlen(text)) + 1;", "return units + 1;"),
      ("log/log_posix.cpp", "int LogPlatformWidenBytes(const char* text, int)", "int LogPlatformWidenBytes(const char*, int units)")]),
    ("a picture's rows not checked against its bytes", "host", "",
     [("splash/splash_bitmap.cpp", "if (stride != 0 && static_cast<uint64_t>(height) > pixelBytes / stride) return false;", "")]),
    ("the archive holding the training application's classes", "linux", "archive",  # and checked with its class path
     [("runtime/make-jre.sh", "($1 in have) && !seen[$1]++", "!seen[$1]++"),
      ("runtime/make-jre.sh", "-Xmx256m -Xshare:dump", '-Xmx256m -Xshare:dump -cp "$app"'),
      ("runtime/make-jre.sh", "-Xshare:on -version", '-Xshare:on -cp "$app" -version')]),
    ("the runtime made to require its archive", "linux", "archive",
     [("runtime/make-jre.sh", "--no-man-pages --compress", "--no-man-pages --add-options=-Xshare:on --compress"),
      ("runtime/make-jre.sh", '-XX:DumpLoadedClassList="$list"', '-Xshare:auto -XX:DumpLoadedClassList="$list"')]),
    ("the runtime's native files not stripped", "linux", "runtime_made", [("runtime/make-jre.sh", 'strip "$file" ;;', ': ;;')]),
    ("the runtime trained with the application alone", "linux", "runtime_made",
     [("runtime/make-jre.sh", '"$tmp/training.jar Workbench" ${app', '${app')]),
    ("the application jar left out of the runtime's inputs", "linux", "runtime_made",
     [("runtime/make-jre.sh", '"$training"/*.java ${app:+"$app"}', '"$training"/*.java')]),
]
# Where each platform's plants are built and what is rebuilt per plant: a preset (CMakePresets.json)
# and its targets.
BUILDS = {"linux": ("linux", ["launcher", "runtime"]), "wine": ("x86_64", ["launcher", "launcher_nostrings"]), "host": ("linux", ["units"])}
ROOT = Path(__file__).resolve().parents[2]


def source(tree, file):  # a plant's file: the private runtime's maker, else a file of the launcher
    return tree / file if file.startswith("runtime/") else tree / "launcher" / file


def stale(faults, tree=ROOT):
    """The plants whose text does not stand exactly once in its file of `tree`, each said plainly."""
    problems = []
    for name, _, _, edits in faults:
        texts = {}
        for file, old, new in edits:
            path = source(tree, file)
            text = texts.setdefault(path, path.read_text() if path.exists() else None)
            if text is None or text.count(old) != 1:
                problems.append(f"{name}: {old!r} stands {0 if text is None else text.count(old)} times in {source(Path(), file)}, not once")
            else:
                texts[path] = text.replace(old, new)
    return problems


def main(names):
    faults = [f for f in FAULTS if not names or any(n in f[0] for n in names)]
    # A scratch copy of this checkout's own: another checkout's run never finds its copy replaced.
    scratch = Path(tempfile.gettempdir()) / f"planted-faults-{ROOT.name}"
    problems = stale(faults)
    if problems:
        print("plants that no longer apply (move each to where its code now lives):", *problems, sep="\n  ")
        return False
    shutil.rmtree(scratch, ignore_errors=True)
    shutil.copytree(ROOT, scratch, ignore=shutil.ignore_patterns("build", "dist", ".git"))
    quiet = dict(stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)

    def run_rows(platform, rows):  # (failed row names, completed run)
        if platform == "host":
            run = subprocess.run([scratch / "build/linux/tests/host/units"], capture_output=True, text=True)
            failed = ["units: " + (re.findall(r"(FAILED: .*|ERROR: AddressSanitizer: [\w-]+)", run.stdout + run.stderr) or ["failed"])[0]]
            return (failed if run.returncode else []), run
        run = subprocess.run([sys.executable, "-m", "pytest", "tests/table", "-p", "no:cacheprovider", "-q", "-rf", "--build", "build",
                              "--platforms", f"{platform}-x86_64", "-k", rows], cwd=scratch, capture_output=True, text=True)
        return re.findall(r"^FAILED \S+::(\S+)", run.stdout, re.M), run

    for platform in sorted({f[1] for f in faults}):  # everything the table needs, and its rows pass before any fault
        preset, _ = BUILDS[platform]
        subprocess.run(["cmake", "--preset", preset], cwd=scratch, check=True, **quiet)
        subprocess.run(["cmake", "--build", "--preset", preset], cwd=scratch, check=True, **quiet)
        failed, baseline = run_rows(platform, " or ".join(f"({f[2]})" for f in faults if f[1] == platform))
        if failed or baseline.returncode != 0:
            print(f"the rows fail on {platform} without any fault planted:\n{(baseline.stdout + baseline.stderr)[-3000:]}")
            return False
    caught = 0
    for name, platform, rows, edits in faults:
        preset, targets = BUILDS[platform]
        originals = {}
        for file, old, new in edits:
            path = source(scratch, file)
            originals.setdefault(path, path.read_text())
            path.write_text(path.read_text().replace(old, new))
        built = subprocess.run(["cmake", "--build", "--preset", preset, "--target", *targets], cwd=scratch, **quiet).returncode == 0
        failed, run = run_rows(platform, rows) if built else ([], None)
        caught += bool(failed)
        verdict = "caught by " + ", ".join(failed) if failed else "does not build" if not built else \
            "NOT CAUGHT" if run.returncode == 0 else "NOT CAUGHT, the rows could not run:\n" + run.stdout[-2000:]
        print(f"{name} ({platform}): {verdict}", flush=True)
        for path, text in originals.items():
            path.write_text(text)
    print(f"{caught} of {len(faults)} caught")
    return caught == len(faults)


if __name__ == "__main__":
    if sys.argv[1:] == ["--check"]:
        problems = stale(FAULTS)
        print(*problems, sep="\n") if problems else print(f"all {len(FAULTS)} planted faults apply")
        sys.exit(1 if problems else 0)
    sys.exit(0 if main(sys.argv[1:]) else 1)
