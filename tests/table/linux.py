# The table's Linux platform: the Linux build hosting the real JVM of a private runtime
# (tools/make-jre.sh) with the Java test application of tests/app, on a private X display with a window
# manager (xscreen.py) or headless (display=False), in a home, runtime folder (the instance lock) and
# settings folders of the table's own.
import fcntl
import os
import shutil
import subprocess
import tempfile
import time
from pathlib import Path
from types import SimpleNamespace

import conftest
from xscreen import Display, Watcher

ROOT = Path(__file__).resolve().parents[2]
EXE = "QZ-Lumiscope_QZ-57"
JDK = Path("/usr/lib/jvm/java-17-openjdk-amd64/bin")
LOCK_NAME = "\u5a51\u4c2d\u6d75\u7369\u6f63\u6570\u515f\u2d5a\u3735.lock"
CAPTION = "QZ-Lumiscope QZ-57"


class App(conftest.App):
    def record(self):  # the VM keeps the class path out of its input arguments; its property has it
        record = super().record()
        if record:
            record.options[:0] = [f"-Djava.class.path={line[25:]}" for line in record.lines if line.startswith("property java.class.path ")]
        return record


class Platform(conftest.Platform):
    write_failed = "WriteFile failed with error 9.\n"

    def __init__(self, arch, build):
        self.build = (ROOT / build / "linux").resolve()
        self.state = Path(tempfile.mkdtemp(prefix="qz57-table."))
        self.home, self.run_dir = self.state / "home", self.state / "run"
        super().__init__(f"linux-{arch}", self.state / "apps", self.home / "Documents", "/")
        subprocess.run(["bash", ROOT / "tools/make-jre.sh", self.build / "table"], check=True, capture_output=True)
        nomain = self.state / "nomain/com/qz/kpo/emu57/app"
        nomain.mkdir(parents=True)
        (nomain / "ApplicationMainForm.java").write_text("package com.qz.kpo.emu57.app;\npublic class ApplicationMainForm {}\n")
        for name, sources in (("emu57.jar", ROOT / "tests/app"), ("nomain.jar", self.state / "nomain")):
            files = [str(f) for f in Path(sources).rglob("*.java")]
            subprocess.run([JDK / "javac", "--release", "17", "-encoding", "UTF-8", "-d", self.state / name / "classes", *files], check=True)
            subprocess.run([JDK / "jar", "cf", self.state / name / name, "-C", self.state / name / "classes", "."], check=True)
        (self.state / "noentry").mkdir()
        subprocess.run(["cc", "-shared", "-fPIC", "-x", "c", "-", "-o", self.state / "noentry/libjvm.so"], input=b"int nothing(void) { return 0; }\n", check=True)
        self.run_dir.mkdir(mode=0o700)
        (self.home / ".config").mkdir(parents=True)
        self.display, self.picture, self.screen = Display(), (480, 300), (1280, 1024)

    def text(self, text):  # the one text that names the runtime's library
        return text.replace("jre\\bin\\client\\jvm.dll", "jre/lib/server/libjvm.so")

    def close(self):
        self.display.close()
        shutil.rmtree(self.state, ignore_errors=True)

    def folder_options(self):
        config = str(self.home / ".config")
        return [f"-Duser.appdata.path={config}"] + [f"-Duser.temp.path={config}"] * Path("/etc/xdg").is_dir()

    def app(self, runtime="double", strings=True, vm=None, suffix="", altered=False):
        vm = dict(vm or {})
        jar = "nomain.jar" if vm.pop("missing_method", None) else None if vm.pop("missing_class", None) else "emu57.jar"
        path = self.new_app(suffix, vm)
        image = bytearray((self.build / "launcher" / EXE).read_bytes())
        image[-1] ^= 0x5A if altered else 0  # the last byte: section headers, never loaded
        (path / EXE).write_bytes(image)
        (path / EXE).chmod(0o755)
        (path / "emu57.jar").write_bytes((self.state / jar / jar).read_bytes() if jar else b"")
        if runtime == "double":
            (path / "jre").symlink_to(self.build / "table/jre")
        elif runtime == "noentry":
            (path / "jre/lib/server").mkdir(parents=True)
            shutil.copy(self.state / "noentry/libjvm.so", path / "jre/lib/server")
        return App(path, str(path), str(path / EXE))

    def start(self, app, args=(), argv0=None, cwd=None, lock=False, listener=None, folders=None, windows=(),
              debug=False, splash=False, log="junk", display=True, timeout=120):
        self.reset_log(log)
        env = {"PATH": os.environ["PATH"], "HOME": str(self.home), "XDG_RUNTIME_DIR": str(self.run_dir), "LANG": "C.UTF-8",
               **({"DISPLAY": self.display.name} if display else {})}
        env.update({name: value or str(self.state / "missing") for name, value in (folders or {}).items()})
        command = [a if isinstance(a, bytes) else a.encode() for a in args]
        program = app.exe
        if argv0 == "bare":  # started through PATH by its bare name
            env["PATH"], program = f"{app.path}:{env['PATH']}", EXE
        if debug:
            command, program = [b"-f", b"-o", b"/dev/null", program.encode(), *command], "strace"
        held = open(self.run_dir / LOCK_NAME, "w") if lock else None
        if held:
            fcntl.flock(held, fcntl.LOCK_EX)
        if listener:
            listener.start()
        output = tempfile.TemporaryFile(), tempfile.TemporaryFile()
        started = time.monotonic()
        watcher = Watcher(self.display.name, started) if display else None
        made = self.display.make_windows(windows) if windows else []
        process = subprocess.Popen([program, *command], stdout=output[0], stderr=output[1], stdin=subprocess.DEVNULL,
                                   cwd=app.path if cwd == "app" else "/", env=env)
        return Running(self, app, process, output, listener, held, started, timeout, watcher, made)


class Running(conftest.Running):
    def __init__(self, linux, app, process, output, listener, held, started, timeout, watcher, made):
        super().__init__(app, process)
        self.linux, self.output, self.listener, self.held, self.started, self.timeout, self.watcher, self.made = \
            linux, output, listener, held, started, timeout, watcher, made

    def finish(self):
        try:
            self.process.wait(self.timeout)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()
        elapsed = (time.monotonic() - self.started) * 1000
        splash, dialogs = self.watcher.finish() if self.watcher else (None, [])
        windows = self.linux.display.window_states(self.made) if self.made else []
        for window in self.made:
            window.destroy()
        if self.held:
            self.held.close()
        if self.listener:
            self.listener.finish()
        for file in self.output:
            file.seek(0)
        stdout, stderr = (file.read().decode("utf-8", "replace") for file in self.output)
        # A parent sees the low 8 bits of the exit status; the whole result stands on standard error.
        code, boxes = self.process.returncode, []
        for line in stderr.splitlines():
            caption, _, text = line.partition(": ")
            if caption in (CAPTION, "Error") and text.startswith("launch ended with result "):
                assert int(text.split()[-1]) & 0xFF == code & 0xFF
                code = int(text.split()[-1])
            elif caption in (CAPTION, "Error"):
                boxes.append(SimpleNamespace(caption=caption, text=text, icon=True, splash=False, t=elapsed))
        # With a display every box is also a dialog, in the same order: whether it took the focus and
        # the splash was still up come from the screen.
        if self.watcher:
            assert [d["caption"] for d in dialogs] == [b.caption for b in boxes], (dialogs, boxes)
            assert all(d["focus"] for d in dialogs), "a dialog did not take the keyboard focus"
            for box, dialog in zip(boxes, dialogs):
                box.splash, box.t = dialog["splash"], dialog["t"]
        return SimpleNamespace(code=code, killed=self.process.returncode == -9, elapsed=elapsed, stdout=stdout, boxes=boxes, splash=splash,
                               screen=self.linux.screen, windows=windows, record=self.app.record(), log=self.linux.read_log(),
                               log_folder=self.linux.log_folder(), listener=self.listener, received=self.listener and self.listener.received)
