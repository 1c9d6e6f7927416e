# The launcher's behaviour as one table of scenarios: each row gives the inputs of one launch and
# what must come out of it. Rows run on every platform unless `only` names one (platform-specific
# inputs: argv[0], Windows folders, windows on screen, a debugger). A row's expectations, each
# checked only when given: code (default 0); boxes (texts in order; caption and error icon too);
# splash (seen or not; when seen, up at every box, centred, fading in); options ("fixed" and
# "folders" stand for the platform's lists); main_args (what main got, decoded); calls (JNI calls,
# Windows double); vm_loaded (anything in the VM record); log ((message, code) lines after the start
# line, "end"; [] no file); received (bytes on 6152: one connection, closed by the sender); stdout;
# causes (Linux: the standard-error lines naming a failure's cause, each holding its text, in order;
# none when not given); sharing (the VM mapped the runtime's class-data archive, as the application reads it).
import os
import re
import shutil
import subprocess
import time
import zipfile
from pathlib import Path

import linux
from conftest import Listener, hexed, port_free

REINSTALL = "reinstall QZ-Lumiscope QZ-57"
VM_NOT_LOADED = f"The Java runtime could not be loaded from jre\\bin\\client\\jvm.dll in the application folder. Please {REINSTALL}."
MAIN_NOT_CALLED = ("The application could not be started: its main class com.qz.kpo.emu57.app.ApplicationMainForm was not "
                   f"found in emu57.jar. Please {REINSTALL}.")
VM_NOT_CREATED = f"The Java virtual machine could not be created. Please check that enough memory is free and {REINSTALL} if the problem persists."
LOAD_ERROR = "Unexpected Error. Error loading files."
MAIN = "com/qz/kpo/emu57/app/ApplicationMainForm"
NO_SPLASH = "-Dapp.lumiscope57.noSplash=true"
START, END = [("Preliminary Definitions", 0), ("CL interpretation", 0)], [("Successful launch end.", 0), "end"]
LOCK_UNITS = "\u5a51\u4c2d\u6d75\u7369\u6f63\u6570\u515f\u2d5a\u3735"  # "QZ-Lumiscope_QZ-57" read as UTF-16
FRAME = "COM.QZ.KPO.EMU57.APP.EMULATORFRAME"
JAVA_FRAME = "com-qz-kpo-emu57-app-ApplicationMainForm"  # the class Java's toolkit gives the frame: counts on Linux only
OUTSIDE_ANSI = "C:\\Users\\\u0418\u0432\u0430\u043d\\\u6587\u6863\\\u05e9\u05dc\u05d5\u05dd.qz57"
# 5,000 units, with a surrogate pair across unit 1,023 (where a fixed 4,096-byte buffer would end).
LONG = "".join(chr(0x4E00 + i) if i % 7 == 0 else chr(0x41 + i % 26) for i in range(5000))
LONG = LONG[:1022] + "\U0001F600" + LONG[1024:]
CREATE = "JNI_CreateJavaVM 0x00010006 ignoreUnrecognized=1"


def destroyed(result):
    return f"jvm destroy res={result}"


def normal_calls(args):
    return [CREATE, "FindClass java/lang/String", f"FindClass {MAIN}", f"GetStaticMethodID {MAIN} main ([Ljava/lang/String;)V",
            f"NewObjectArray {len(args)} java/lang/String null"] + [
        call for i, arg in enumerate(args) for call in (f"NewStringUTF {hexed(arg)}", f"SetObjectArrayElement {i} {hexed(arg)}")] + [
        f"CallStaticVoidMethodV {MAIN} main", "DestroyJavaVM"]


class Row:
    def __init__(self, name, args=(), app={}, run={}, only=None, **expect):
        self.name, self.args, self.app, self.run, self.only, self.expect = name, list(args), app, run, only, {"code": 0, **expect}


ROWS = [
    # Exit paths: the code, every box, how far the VM got.
    Row("no-arguments-splash", boxes=[destroyed(0)], splash=True, options=["fixed", "folders"], main_args=[],
        calls=normal_calls([]), log=START + END),
    Row("destroy-result", ["-noSplash"], app=dict(vm=dict(destroy=7)), code=7, boxes=[destroyed(7)], only="wine"),
    Row("destroy-negative-no-strings", ["-noSplash"], app=dict(strings=False, vm=dict(destroy=-5)), code=-5,
        boxes=[destroyed(-5)], only="wine"),
    Row("runtime-missing", ["-noSplash"], app=dict(runtime="none"), code=-1, boxes=[VM_NOT_LOADED],
        log=START + END, causes=["libjvm.so: No such file or directory"]),
    Row("runtime-missing-no-strings", ["-noSplash"], app=dict(runtime="none", strings=False), code=-1, boxes=[],
        only="wine"),
    Row("vm-not-created", ["-noSplash"], app=dict(vm=dict(create=-6)), code=-6, boxes=[VM_NOT_CREATED],
        options=["fixed", NO_SPLASH, "folders"], calls=["JNI_CreateJavaVM 0x00010006 ignoreUnrecognized=1"], only="wine"),
    Row("vm-not-created-no-strings", ["-noSplash"], app=dict(strings=False, vm=dict(create=-6)), code=-3, boxes=[],
        only="wine"),
    Row("no-entry-point", ["-noSplash"], app=dict(runtime="noentry"), code=-1, boxes=[VM_NOT_CREATED],
        causes=["undefined symbol: JNI_CreateJavaVM"]),
    Row("main-class-missing", ["file.q7"], app=dict(vm=dict(missing_class=MAIN, destroy=3)), code=3, splash=True,
        boxes=[MAIN_NOT_CALLED, destroyed(3)],
        calls=["JNI_CreateJavaVM 0x00010006 ignoreUnrecognized=1", "FindClass java/lang/String",
               f"FindClass {MAIN} -> null", "DestroyJavaVM"], only="wine"),
    Row("string-class-missing", ["-noSplash"], app=dict(vm=dict(missing_class="java/lang/String")),
        boxes=[MAIN_NOT_CALLED, destroyed(0)],
        calls=["JNI_CreateJavaVM 0x00010006 ignoreUnrecognized=1", "FindClass java/lang/String -> null",
               f"FindClass {MAIN}", "DestroyJavaVM"], only="wine"),
    Row("main-method-missing", ["-noSplash"], app=dict(vm=dict(missing_method=1, destroy=-9)), code=-9,
        boxes=[MAIN_NOT_CALLED, destroyed(-9)], calls=normal_calls([])[:3] + [
            f"GetStaticMethodID {MAIN} main ([Ljava/lang/String;)V -> null", "DestroyJavaVM"], only="wine"),
    # The real VM's own answers: an empty class path, a main class without main.
    Row("main-class-missing-real-vm", ["file.q7"], app=dict(vm=dict(missing_class=MAIN)), splash=True,
        boxes=[MAIN_NOT_CALLED, destroyed(0)], vm_loaded=False, causes=["java.lang.NoClassDefFoundError: " + MAIN], only="linux"),
    Row("main-method-missing-real-vm", ["-noSplash"], app=dict(vm=dict(missing_method=1)),
        boxes=[MAIN_NOT_CALLED, destroyed(0)], causes=[f"java.lang.NoSuchMethodError: static L{MAIN};.main("], only="linux"),
    Row("exception-out-of-main", ["-noSplash"], app=dict(vm=dict(throw=1)), boxes=[destroyed(0)], log=START + END,
        causes=['Exception in thread "main" java.lang.IllegalStateException: asked to throw'], only="linux"),
    Row("system-exit-in-main", ["-noSplash"], app=dict(vm=dict(exit=42)), code=42, boxes=[], log=START),
    Row("runtime-needs-its-bin-folder", ["-noSplash"], app=dict(runtime="dep"), boxes=[destroyed(0)], only="wine"),
    # The runtime's class-data archive: used from a copy of the runtime in another folder, with another
    # emu57.jar than the one it was trained with; one that does not fit the runtime (another module
    # set, a copy cut short) is ignored, and the application starts as without one.
    Row("archive-used-moved", ["-noSplash"], app=dict(runtime="moved", suffix="-\u00fc\u0416\u6587"), sharing=True,
        main_args=["-noSplash"], only="linux"),
    Row("archive-foreign", ["-noSplash"], app=dict(runtime="foreign"), sharing=False, boxes=[destroyed(0)],
        main_args=["-noSplash"], only="linux"),
    Row("archive-truncated", ["x"], app=dict(runtime="truncated"), sharing=False, boxes=[destroyed(0)], main_args=["x"],
        only="linux"),

    # The option list and the splash switch.
    Row("no-splash-twice", ["-noSplash", "file.qz57", "-noSplash"], options=["fixed", NO_SPLASH, NO_SPLASH, "folders"]),
    Row("no-splash-any-case", ["-NOSPLASH", "x", "-nOsPlAsH"], app=dict(vm=dict(main_ms=1500)), splash=False,
        options=["fixed", NO_SPLASH, NO_SPLASH, "folders"]),
    Row("no-splash-near-misses", ["-noSplashX", "noSplash", "--noSplash", "-noSplash ", "-noSplash"], splash=True,
        options=["fixed", NO_SPLASH, "folders"], boxes=[destroyed(0)]),
    Row("argv0-without-directory", ["x"], run=dict(argv0="-noSplash", cwd="app"),
        options=["fixed", NO_SPLASH, "folders"], main_args=["x"], only="wine"),
    Row("application-folder-outside-ansi", ["-noSplash"], app=dict(suffix="-\u00fc\u0416\u6587"),
        options=["fixed-ansi", NO_SPLASH, "folders"], only="wine"),
    Row("user-folder-missing", ["-noSplash"], run=dict(folders={"AppData": None, "Common AppData": "C:\\qz-all"}),
        options=["fixed", NO_SPLASH, "-Duser.temp.path="], only="wine"),
    Row("all-users-folder-missing", ["x"],
        run=dict(folders={"AppData": "C:\\qz-\u0416\u00e9\u4e2d\u0100rest", "Common AppData": None}),
        options=["fixed", "-Duser.appdata.path=C:\\qz-\x16\xe9-"], only="wine"),
    Row("both-folders-narrowed", ["x"],
        run=dict(folders={"AppData": "C:\\qz-\u0416\u00e9\u4e2d\u0100rest", "Common AppData": "C:\\qz-all"}),
        options=["fixed", "-Duser.appdata.path=C:\\qz-\x16\xe9-", "-Duser.temp.path=C:\\qz-\x16\xe9-"], only="wine"),

    # What main receives.
    Row("arguments-encoded", ["-noSplash", "C:\\M\u00fcll", "a b", "\U0001F600", "ABC Xyz", OUTSIDE_ANSI, "", LONG, "", "x"],
        main_args=["-noSplash", "C:\\M\u00fcll", "a b", "\U0001F600", "ABC Xyz", OUTSIDE_ANSI, OUTSIDE_ANSI, LONG, LONG, "x"],
        calls=normal_calls(["-noSplash", "C:\\M\u00fcll", "a b", "\U0001F600", "ABC Xyz", OUTSIDE_ANSI, OUTSIDE_ANSI,
                            LONG, LONG, "x"])),

    # Linux: the settings folders of the option list, arguments as bytes (ill-formed UTF-8 becomes
    # U+FFFD per maximal subpart), a 30,000-byte argument, a start through PATH, no display at all.
    Row("xdg-user-folder-missing", ["-noSplash"], run=dict(folders={"XDG_CONFIG_HOME": None}),
        options=["fixed", NO_SPLASH, "-Duser.temp.path="], only="linux"),
    Row("xdg-system-folder-missing", ["-noSplash"], run=dict(folders={"XDG_CONFIG_DIRS": None}),
        options=["fixed", NO_SPLASH, "appdata"], only="linux"),
    Row("arguments-as-bytes", ["-noSplash", b"\xc0\xaf", b"\xed\xa0\x80", b"\xf4\x90\x80\x80", b"a\xe2\x82", b"\xf0\x9f\x98\x80",
                              "\u00e9" * 15000],
        main_args=["-noSplash", "\ufffd" * 2, "\ufffd" * 3, "\ufffd" * 4, "a\ufffd", "\U0001F600", "\u00e9" * 15000], only="linux"),
    Row("started-through-path", ["x"], run=dict(argv0="bare"), options=["fixed", "folders"], main_args=["x"],
        only="linux"),
    Row("headless", ["file.qz57"], app=dict(runtime="none"), run=dict(display=False), code=-1, splash=False,
        boxes=[VM_NOT_LOADED], causes=["No such file"], only="linux"),

    # Linux in hostile surroundings: never silent, never hung, never crashed. The instance lock lives
    # below the account's home whatever the environment says; a lock folder that cannot be used is
    # said and the start goes on as the first instance. The VM library is checked before it is
    # loaded; the VM's own end while it is being created still gets its box; a display that never
    # answers does not keep a second start from handing over; a settings file that is a FIFO is not
    # read; closed standard streams do not become the log.
    Row("lock-folder-not-private", ["x"], run=dict(lock_folder="foreign"), main_args=["x"],
        causes=["not a folder of this user's own"], only="linux"),
    Row("lock-folder-a-link", ["x"], run=dict(lock_folder="link"), main_args=["x"], causes=["symbolic link"], only="linux"),
    Row("descriptor-limit", ["-noSplash"], run=dict(limits=dict(nofile=4), display=False), code=6102, boxes=[LOAD_ERROR],
        log=START + [(LOAD_ERROR, 1012)], causes=["instance lock", "/proc/self/exe: Too many open files"], only="linux"),
    Row("hand-off-whatever-the-environment", ["x"], run=dict(lock=True, listener=True, folders={"XDG_RUNTIME_DIR": None, "HOME": None}),
        boxes=[], received="0078", only="linux"),
    Row("hand-off-display-not-answering", ["x"], run=dict(lock=True, listener=True, display="silent", timeout=30),
        received="0078", only="linux"),
    Row("runtime-truncated", ["-noSplash"], app=dict(runtime="cut:1024"), code=-1, boxes=[VM_NOT_LOADED], causes=["damaged"],
        only="linux"),
    Row("runtime-section-headers-cut", ["-noSplash"], app=dict(runtime="cut:-1"), code=-1, boxes=[VM_NOT_LOADED],
        causes=["damaged"], only="linux"),
    Row("runtime-a-fifo", ["-noSplash"], app=dict(runtime="fifo"), run=dict(timeout=30), code=-1, boxes=[VM_NOT_LOADED],
        causes=["not a regular file"], only="linux"),
    Row("vm-not-created-real-vm", ["-noSplash"], run=dict(env={"JAVA_TOOL_OPTIONS": "-XX:+NoSuchFlag"}), code=-6,
        boxes=[VM_NOT_CREATED], causes=["JNI error -6"], only="linux"),
    Row("vm-ends-process-in-creation", ["-noSplash"], run=dict(limits=dict(address_space=300 << 20)), code=1,
        boxes=[VM_NOT_CREATED], causes=["ended the process while it was being created (exit status 1)"], only="linux"),
    Row("settings-file-a-fifo", ["-noSplash"], run=dict(settings="fifo", timeout=30), log=START + END, only="linux"),
    Row("standard-streams-closed", ["-noSplash"], app=dict(vm=dict(say=1)), run=dict(closed=(0, 1, 2), display=False),
        log=START + END, main_args=["-noSplash"], only="linux"),

    # The log.
    Row("log-folder-missing", ["-noSplash"], run=dict(log="nofolder"), log=[], main_args=["-noSplash"]),
    Row("documents-folder-unknown", ["-noSplash"], run=dict(folders={"Personal": None}, log="nofolder"), log=[], main_args=["-noSplash"],
        stdout="WriteFile failed with error 6.\r\n" * 16, only="wine"),

    # Self-protection.
    Row("image-altered", ["-noSplash"], app=dict(altered=True), code=6101, boxes=[LOAD_ERROR], vm_loaded=False,
        log=START + [(LOAD_ERROR, 1012)], causes=["altered"]),
    Row("under-debugger", ["-noSplash"], run=dict(debug=True), code=6201, boxes=[LOAD_ERROR], vm_loaded=False,
        log=START + [("CL interpretation", -767)], causes=["debugger"]),

    # A second instance (another holds the lock): hand-off on 6152, nothing else.
    Row("hand-off-no-arguments", run=dict(lock=True, listener=True), boxes=[], vm_loaded=False, log=START,
        received="002d006e"),
    Row("hand-off-arguments", ["-noSplash", "-x", "C:\\a.dat", "x", "", "", "\U0001F600\u00e9\u00ab", LONG],
        run=dict(lock=True, listener=True), boxes=[], vm_loaded=False,
        received="".join(map(hexed, ["-noSplash", "-x", "C:\\a.dat", "x", "x", "x", "\U0001F600\u00e9\u00ab", LONG]))),
    Row("hand-off-empty-first", ["", "x"], run=dict(lock=True, listener=True), received="0078"),
    # The running application resets the connection while a long hand-off is still being sent.
    Row("hand-off-reset-by-listener", ["x" * 100000] * 15, run=dict(lock=True, listener="reset"), boxes=[], vm_loaded=False,
        only="linux"),
    Row("activation", run=dict(lock=True, listener=True, windows=[  # the first `platform.raised` are raised
        ("i", FRAME, LOCK_UNITS), ("z", FRAME, "\u5858" + LOCK_UNITS), ("i", JAVA_FRAME, LOCK_UNITS + " x"),
        ("h", FRAME, LOCK_UNITS + "1A"), ("i", FRAME, "\u7a71" + LOCK_UNITS[1:]),      # hidden; "qz-Lumi..."
        ("i", FRAME, "QZ-Lumiscope_QZ-57"), ("i", FRAME, "A" + LOCK_UNITS),            # one byte per unit
        ("i", FRAME, ""), ("i", FRAME + "X", LOCK_UNITS + "2A"), ("i", FRAME[:-1], LOCK_UNITS + "3A")])),
]


def expand(platform, app, options):
    out = []
    for option in options:  # Windows: the folder in the ANSI code page: U+00FC is 0xFC, the others "?"
        out += {"fixed": platform.fixed_options(app.native), "folders": platform.folder_options(), "appdata": platform.folder_options()[:1],
                "fixed-ansi": platform.fixed_options(app.native.replace("\u0416\u6587", "??"))}.get(option, [option])
    return out


def check_log(data, lines):
    if not lines:
        return data is None
    text = data.decode("utf-16-le")
    date = re.match(r"QZ_CW_startLOG : Started logging\.\.\.(\w{3} \w{3} \d\d \d\d:\d\d:\d\d \d{4})\n\r\n", text)
    return date and abs(time.mktime(time.strptime(date.group(1))) - time.time()) < 600 and text[date.end():] == "".join(
        "Ended logging... : \r\n" if line == "end" else f"QZ-Lumiscope_QZ-57.exe : {line[0]} : {line[1]}\r\n" for line in lines)


def test_row(platform, row):
    app, want = platform.app(**row.app), row.expect
    inputs = {**row.run, "listener": row.run.get("listener") and Listener(reset=row.run["listener"] == "reset")}
    out = platform.run(app, row.args, splash=bool(want.get("splash")), **inputs)
    assert (out.killed, out.code) == (False, want["code"])
    if "boxes" in want:
        caption = "QZ-Lumiscope QZ-57" if row.app.get("strings", True) else "Error"
        assert [(b.caption, b.text, b.icon) for b in out.boxes] == [(caption, platform.text(t), True) for t in want["boxes"]]
    if "splash" in want:
        assert (out.splash is not None) == want["splash"]
    if want.get("splash"):  # up at every box, centred, fading in by steps of 4 from 64, a layered tool window
        alphas, (w, h) = out.splash["alphas"], platform.picture
        assert all(b.splash for b in out.boxes) and alphas == sorted(set(alphas)) and alphas[0] >= 64 and not any(a % 4 for a in alphas)
        assert out.splash["rect"] == [(out.screen[0] - w) // 2, (out.screen[1] - h) // 2, w, h]
        assert out.splash.get("exstyle", 0x80080) == 0x80080  # Windows: a layered tool window
    if "options" in want:
        assert out.record.options == expand(platform, app, want["options"])
    if "main_args" in want:
        assert out.record.args == [hexed(a) for a in want["main_args"]] and "end" in out.record.lines
    if "calls" in want and platform.name.startswith("wine"):
        assert out.record.calls == want["calls"]
    if "vm_loaded" in want:
        assert bool(out.record and out.record.lines) == want["vm_loaded"]
    if "log" in want:
        assert check_log(out.log, want["log"]) and out.log_folder == bool(want["log"]), "the log never makes its folder"
    if "received" in want:
        assert out.received == want["received"].encode() and out.listener.connections == 1 and out.listener.closed_by_sender
    if "stdout" in want:
        assert out.stdout == want["stdout"]
    if platform.name.startswith("linux"):
        causes = want.get("causes", [])
        assert len(out.causes) == len(causes) and all(c in line for c, line in zip(causes, out.causes)), out.causes
    if "sharing" in want:
        assert [info.endswith(", sharing") for info in out.record.vm] == [want["sharing"]], out.record.vm
    if out.windows:  # activation: the first ones qualify, the rest are near misses and stay as they were
        raised, missed = out.windows[:platform.raised], out.windows[platform.raised:]
        assert not any(w["iconic"] for w in raised) and raised[1]["zoomed"], "restored only when minimised"
        assert max(raised, key=lambda w: w["pos"])["front"], "the later one ends in front"
        states = [state for state, _, _ in row.run["windows"][platform.raised:]]
        assert [(w["visible"], w["visible"] and w["iconic"]) for w in missed] == [(s != "h", s == "i") for s in states], out.windows


def test_first_instance_holds_the_lock(platform):
    # A running first instance: a second start without a listener tries five times (five pauses of
    # 5 s), exits 0 and leaves the first's log alone (it cannot even open it); the first's splash goes by
    # itself after its display time, fully faded in, while main still runs; once the first has ended,
    # the next start is a first instance again. On Linux, the lock's descriptor is not inherited.
    first = platform.start(platform.app(vm=dict(until="stop")), [], splash=True)
    try:
        assert first.wait_main()
        log = platform.read_log()
        port_free().close()  # nobody listens
        second_app = platform.app()
        second = platform.run(second_app, ["C:\\a.dat"], log="keep")
        assert platform.read_log() == log
        if platform.name.startswith("linux"):  # the lock closes on exec (Java's own process launcher would hide a leak)
            fds = Path(f"/proc/{first.process.pid}/fd")
            locks = [fd.name for fd in fds.iterdir() if os.readlink(fd).endswith(".lock")]
            assert locks and all(int(re.search(r"flags:\s*(\d+)", (fds.parent / "fdinfo" / fd).read_text())[1], 8) & 0o2000000 for fd in locks)
    finally:
        out = first.stop()
    assert (second.code, second.boxes, second.record) == (0, [], None)
    assert second.elapsed >= 24000
    assert second.stdout == platform.write_failed * 8
    assert (out.code, [b.text for b in out.boxes]) == (0, [destroyed(0)])
    assert out.splash["alphas"][-1] == 252
    assert out.splash["t"] + 10000 <= out.splash["gone"] <= out.boxes[0].t and not out.boxes[0].splash
    assert check_log(out.log, START + END)
    assert platform.run(second_app, ["-noSplash"]).record.args == [hexed("-noSplash")]


def test_runtime_made_for_its_application(platform, tmp_path):
    # The private runtime (runtime/make-jre.sh): its archive valid, dumped without a class path, holding the
    # runtime's own classes only (the boot loader's), among them those of every training program's
    # windows; every ELF file without a native symbol table (a package must not ship one) but with the
    # dynamic symbols its loading needs; made again, with a new archive, once the application jar it was
    # trained with changes, and left as it is while nothing changed; a training run that fails fails the
    # whole run and leaves the runtime made before in place.
    shared = subprocess.run([platform.runtime / "bin/java", "-XX:+PrintSharedArchiveAndExit", "-XX:+PrintSharedDictionary"],
                            cwd=tmp_path, capture_output=True, text=True).stdout
    classes = dict(line.split()[1:3] for line in shared.splitlines() if re.match(r" *\d+: ", line))
    assert "archive is valid" in shared and re.search(r"Expecting -Djava\.class\.path=$", shared, re.M)
    assert set(classes.values()) == {"boot_loader"} and {f"javax.swing.{name}" for name in (
        "JList", "JMenuBar", "JTree", "JTable", "JTextArea", "JOptionPane", "JFileChooser")} <= classes.keys()
    elf = [f for f in platform.runtime.rglob("*") if f.is_file() and f.read_bytes()[:4] == b"\x7fELF"]
    sections = {f: subprocess.run(["readelf", "-SW", f], capture_output=True, text=True, check=True).stdout for f in elf}
    assert len(elf) > 20 and {f for f, s in sections.items() if " .symtab " in s or " .dynsym " not in s} == set()
    # The tool runs on a copy only: the build's own runtime stays as every row links it.
    made, archive = tmp_path / "runtime", tmp_path / "runtime/jre/lib/server/classes.jsa"
    made.mkdir()
    shutil.copytree(platform.runtime, made / "jre", symlinks=True)
    shutil.copy(platform.runtime.parent / ".jre-inputs", made)
    make = lambda jar: subprocess.run(["bash", linux.ROOT / "runtime/make-jre.sh", made, "--app", jar], capture_output=True,
                                      text=True, env={**os.environ, "JDK": str(linux.JDK.parent)})
    assert "up to date" in make(platform.trained_with).stdout
    before = archive.stat().st_ino
    with zipfile.ZipFile(shutil.copy(platform.trained_with, tmp_path / "demo.jar"), "a") as jar:  # a new build of the application
        jar.writestr("build.txt", "2")
    assert "make-jre: made " in make(tmp_path / "demo.jar").stdout and archive.stat().st_ino != before
    before = archive.stat().st_ino
    with zipfile.ZipFile(tmp_path / "broken.jar", "w") as jar:
        jar.writestr("com/qz/kpo/emu57/app/ApplicationMainForm.class", b"not a class")
    broken = make(tmp_path / "broken.jar")
    assert broken.returncode and "training with com.qz.kpo.emu57.app.ApplicationMainForm" in broken.stderr, broken.stderr
    assert archive.stat().st_ino == before


test_runtime_made_for_its_application.only = "linux"  # the Windows runtime slot holds the VM double
