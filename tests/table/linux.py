"""The table's Linux platform: the Linux build of the launcher hosting the real JVM of a private
runtime (tools/make-jre.sh) with the Java test application of tests/app, which records what it got
in vm-record.txt and follows vm-script.txt (formats in conftest.py). Runs happen on a private X
display with a window manager (xscreen.py), or headless with display=False, in a home, a runtime
folder (the instance lock) and settings folders of the table's own."""
import fcntl
import itertools
import os
import shutil
import subprocess
import tempfile
import time
from pathlib import Path
from types import SimpleNamespace

from conftest import Record
from xscreen import Display, Watcher

ROOT = Path(__file__).resolve().parents[2]
EXE = "QZ-Lumiscope_QZ-57"
LOG = "QZ-LumiscopeQZ-57Nova/logs/QZ-LumiscopeQZ-57Nova-L.log"
JDK = Path("/usr/lib/jvm/java-17-openjdk-amd64/bin")
LOCK_NAME = "\u5a51\u4c2d\u6d75\u7369\u6f63\u6570\u515f\u2d5a\u3735.lock"
CAPTION = "QZ-Lumiscope QZ-57"


class App:
    def __init__(self, path):
        self.path, self.native, self.exe = path, str(path), str(path / EXE)

    def record(self):
        file = self.path / "vm-record.txt"
        if not file.exists():
            return None
        record = Record(file.read_bytes())
        # The VM keeps the class-path option out of its input arguments; its value is the property's.
        path = [line[len("property java.class.path "):] for line in record.lines if line.startswith("property java.class.path ")]
        record.options[:0] = [f"-Djava.class.path={p}" for p in path]
        return record


class Platform:
    def __init__(self, arch, build):
        self.name, self.build = f"linux-{arch}", (ROOT / build / "linux").resolve()
        self.state = Path(tempfile.mkdtemp(prefix="qz57-table."))
        self.counter = itertools.count()
        subprocess.run(["bash", ROOT / "tools/make-jre.sh", self.build / "table"], check=True, capture_output=True)
        self.jre = self.build / "table/jre"
        self.jars = self.state / "jars"
        self.jars.mkdir()
        self._jar("emu57.jar", ROOT / "tests/app")
        nomain = self.state / "nomain/com/qz/kpo/emu57/app"
        nomain.mkdir(parents=True)
        (nomain / "ApplicationMainForm.java").write_text("package com.qz.kpo.emu57.app;\npublic class ApplicationMainForm {}\n")
        self._jar("nomain.jar", self.state / "nomain")
        self.noentry = self.state / "noentry/libjvm.so"
        self.noentry.parent.mkdir()
        subprocess.run(["cc", "-shared", "-fPIC", "-x", "c", "-", "-o", self.noentry], input=b"int nothing(void) { return 0; }\n", check=True)
        self.home, self.run_dir = self.state / "home", self.state / "run"
        self.run_dir.mkdir(mode=0o700)
        self.docs = self.home / "Documents"
        (self.home / ".config").mkdir(parents=True)
        self.display = Display()
        self.picture = (480, 300)
        self.screen = (1280, 1024)

    def _jar(self, name, sources):
        classes = self.state / ("classes-" + name)
        files = [str(f) for f in Path(sources).rglob("*.java")]
        subprocess.run([JDK / "javac", "--release", "17", "-encoding", "UTF-8", "-d", classes, *files], check=True)
        subprocess.run([JDK / "jar", "cf", self.jars / name, "-C", classes, "."], check=True)

    write_failed = "WriteFile failed with error 9.\n"

    def text(self, text):  # the one text that names the runtime's library
        return text.replace("jre\\bin\\client\\jvm.dll", "jre/lib/server/libjvm.so")

    def close(self):
        self.display.close()
        shutil.rmtree(self.state, ignore_errors=True)

    def fixed_options(self, app_dir):
        return [f"-Djava.class.path={app_dir}/emu57.jar", "-Xms64m", "-Xmx256m", "-Dswing.aatext=true",
                "-DencodedFilenames=true", "-Dsun.locale.formatasdefault=true", f"-Djava.library.path={app_dir}",
                "-DconsoleLogLevel=ALL", "-DfileLogLevel=INFO", "-DjniFileLogLevel=3"]

    def folder_options(self):
        config = str(self.home / ".config")
        return [f"-Duser.appdata.path={config}", f"-Duser.temp.path={config}"] if Path("/etc/xdg").is_dir() else \
            [f"-Duser.appdata.path={config}"]

    def app(self, runtime="double", strings=True, vm=None, suffix="", altered=False):
        path = self.state / "apps" / f"{next(self.counter)}{suffix}"
        path.mkdir(parents=True)
        image = bytearray((self.build / "launcher" / EXE).read_bytes())
        image[-1] ^= 0x5A if altered else 0  # the last byte: section headers, never loaded
        (path / EXE).write_bytes(image)
        (path / EXE).chmod(0o755)
        vm = dict(vm or {})
        jar = "nomain.jar" if vm.pop("missing_method", None) else "emu57.jar"
        if vm.pop("missing_class", None):
            (path / "emu57.jar").write_bytes(b"")
        else:
            shutil.copy(self.jars / jar, path / "emu57.jar")
        if runtime in ("double", "real"):
            (path / "jre").symlink_to(self.jre)
        elif runtime == "noentry":
            (path / "jre/lib/server").mkdir(parents=True)
            shutil.copy(self.noentry, path / "jre/lib/server/libjvm.so")
        (path / "vm-script.txt").write_text("".join(f"{k}={v}\n" for k, v in vm.items()))
        return App(path)

    def read_log(self):
        file = self.docs / LOG
        return file.read_bytes() if file.exists() else None

    def reset_log(self, how):
        folder = (self.docs / LOG).parent
        if how == "junk":
            folder.mkdir(parents=True, exist_ok=True)
            (folder / Path(LOG).name).write_bytes(b"x" * 65536)
        elif how == "nofolder":
            shutil.rmtree(folder, ignore_errors=True)

    def run(self, app, args=(), **inputs):
        return self.start(app, args, **inputs).finish()

    def start(self, app, args=(), argv0=None, cwd=None, lock=False, listener=None, folders=None, windows=(),
              debug=False, splash=False, log="junk", env=None, display=True, timeout=120):
        self.reset_log(log)
        environment = {"PATH": os.environ["PATH"], "HOME": str(self.home), "XDG_RUNTIME_DIR": str(self.run_dir),
                       "LANG": "C.UTF-8", **({"DISPLAY": self.display.name} if display else {}), **(env or {})}
        for name, value in (folders or {}).items():
            environment[name] = value if value is not None else str(self.state / "missing")
        command = [os.fsencode(a) if isinstance(a, bytes) else a.encode("utf-8", "surrogateescape") for a in args]
        program = app.exe
        if argv0 == "bare":  # started through PATH by its bare name
            environment["PATH"] = f"{app.path}:{environment['PATH']}"
            program = EXE
        if debug:
            command, program = [b"-f", b"-o", b"/dev/null", program.encode(), *command], "strace"
        held = None
        if lock:
            held = open(self.run_dir / LOCK_NAME, "w")
            fcntl.flock(held, fcntl.LOCK_EX)
        if listener:
            listener.start()
        out, err = tempfile.TemporaryFile(), tempfile.TemporaryFile()
        started = time.monotonic()
        watcher = Watcher(self.display.name, started) if display else None
        made = self.display.make_windows(windows) if windows else []
        process = subprocess.Popen([program, *command], stdout=out, stderr=err, stdin=subprocess.DEVNULL,
                                   cwd=app.path if cwd == "app" else "/", env=environment)
        return Running(self, app, process, out, err, listener, held, started, timeout, watcher, made)


class Running:
    def __init__(self, linux, app, process, out, err, listener, held, started, timeout, watcher, made=()):
        self.made = made
        self.linux, self.app, self.process, self.out, self.err, self.watcher = linux, app, process, out, err, watcher
        self.listener, self.held, self.started, self.timeout = listener, held, started, timeout

    def wait_main(self, seconds=60):
        for _ in range(seconds * 10):
            record = self.app.record()
            if record and any(line.startswith("main ") for line in record.lines):
                return True
            time.sleep(0.1)
        return False

    def stop(self):
        (self.app.path / "stop").write_bytes(b"")
        return self.finish()

    def finish(self):
        killed = False
        try:
            self.process.wait(self.timeout)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()
            killed = True
        elapsed = (time.monotonic() - self.started) * 1000
        splash, dialogs = self.watcher.finish() if self.watcher else (None, [])
        windows = self.linux.display.window_states(self.made) if self.made else []
        for window in self.made:
            window.destroy()
        if self.held:
            self.held.close()
        if self.listener:
            self.listener.finish()
        self.out.seek(0)
        self.err.seek(0)
        stdout, stderr = self.out.read().decode("utf-8", "replace"), self.err.read().decode("utf-8", "replace")
        # A parent sees the low 8 bits of the exit status; the whole result stands on standard error.
        code = self.process.returncode
        boxes = []
        for line in stderr.splitlines():
            caption, _, text = line.partition(": ")
            if caption in (CAPTION, "Error") and text.startswith("launch ended with result "):
                whole = int(text.rsplit(" ", 1)[1])
                assert whole & 0xFF == code & 0xFF, (whole, code)
                code = whole
            elif caption in (CAPTION, "Error"):
                boxes.append(SimpleNamespace(caption=caption, text=text, icon=True, splash=False, t=elapsed))
        # With a display every box is also a dialog, in the same order: its caption, and whether the
        # splash was still up, come from the screen.
        if self.watcher:
            assert [d["caption"] for d in dialogs] == [b.caption for b in boxes], (dialogs, boxes)
            assert all(d["focus"] for d in dialogs), "a dialog did not take the keyboard focus"
            for box, dialog in zip(boxes, dialogs):
                box.splash, box.t = dialog["splash"], dialog["t"]
        return SimpleNamespace(
            code=code, killed=killed, elapsed=elapsed, stdout=stdout, stderr=stderr,
            boxes=boxes, splash=splash, screen=self.linux.screen, windows=windows, record=self.app.record(), log=self.linux.read_log(),
            log_folder=(self.linux.docs / LOG).parent.exists(),
            received=self.listener.received if self.listener else None, listener=self.listener)
