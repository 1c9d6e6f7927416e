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
EXE, CAPTIONS = "QZ-Lumiscope_QZ-57", ("QZ-Lumiscope QZ-57", "Error")
JDK = Path("/usr/lib/jvm/java-17-openjdk-amd64/bin")
LOCK_NAME = "\u5a51\u4c2d\u6d75\u7369\u6f63\u6570\u515f\u2d5a\u3735.lock"


class Platform(conftest.Platform):
    write_failed, raised = "WriteFile failed with error 9.\n", 3  # the Java toolkit's frame class counts here

    def __init__(self, arch, build):
        self.build, self.state = (ROOT / build / "linux").resolve(), Path(tempfile.mkdtemp(prefix="qz57-table."))
        self.home, self.run_dir = self.state / "home", self.state / "run"
        super().__init__(f"linux-{arch}", self.state / "apps", self.home / "Documents", "/")
        subprocess.run(["bash", ROOT / "tools/make-jre.sh", self.build / "table"], check=True, capture_output=True)
        nomain = self.state / "nomain/com/qz/kpo/emu57/app/ApplicationMainForm.java"  # a main class without main
        nomain.parent.mkdir(parents=True)
        nomain.write_text("package com.qz.kpo.emu57.app;\npublic class ApplicationMainForm {}\n")
        for name, sources in (("emu57.jar", ROOT / "tests/app"), ("nomain.jar", self.state / "nomain")):
            subprocess.run([JDK / "javac", "--release", "17", "-d", self.state / name / "c", *Path(sources).rglob("*.java")], check=True)
            subprocess.run([JDK / "jar", "cf", self.state / name / name, "-C", self.state / name / "c", "."], check=True)
        (self.state / "noentry").mkdir()
        subprocess.run(["cc", "-shared", "-x", "c", "-", "-o", self.state / "noentry/libjvm.so"], input=b"int nothing;\n", check=True)
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
            shutil.copytree(self.state / "noentry", path / "jre/lib/server")
        return conftest.App(path, str(path), str(path / EXE))

    def start(self, app, args=(), argv0=None, cwd=None, lock=False, listener=None, folders=None, windows=(),
              debug=False, splash=False, log="junk", display=True, timeout=120):
        self.reset_log(log)
        env = {"PATH": os.environ["PATH"], "HOME": str(self.home), "XDG_RUNTIME_DIR": str(self.run_dir), "LANG": "C.UTF-8",
               **({"DISPLAY": self.display.name} if display else {})}
        env.update({name: value or str(self.state / "missing") for name, value in (folders or {}).items()})
        command = [app.exe, *(a if isinstance(a, bytes) else a.encode() for a in args)]
        if argv0 == "bare":  # started through PATH by its bare name
            env["PATH"], command[0] = f"{app.path}:{env['PATH']}", EXE
        held = open(self.run_dir / LOCK_NAME, "w") if lock else None
        if held:
            fcntl.flock(held, fcntl.LOCK_EX)
        output, started = tempfile.TemporaryFile(), time.monotonic()
        watcher, made = display and Watcher(self.display.name, started), self.display.make_windows(windows)
        process = subprocess.Popen(["strace", "-f", "-o", "/dev/null"] * debug + command, stdout=output, stderr=subprocess.PIPE,
                                   stdin=subprocess.DEVNULL, cwd=app.path if cwd == "app" else "/", env=env)
        return Running(self, app, process, listener, timeout, SimpleNamespace(output=output, held=held, started=started,
                                                                               watcher=watcher, made=made))


class Running(conftest.Running):
    def __init__(self, platform, app, process, listener, timeout, run):
        super().__init__(platform, app, process, listener, timeout)
        self.run = run

    def finish(self):
        try:
            stderr = self.process.communicate(timeout=self.timeout)[1].decode("utf-8", "replace")
        except subprocess.TimeoutExpired:
            self.process.kill()
            stderr = self.process.communicate()[1].decode("utf-8", "replace")
        run, elapsed = self.run, (time.monotonic() - self.run.started) * 1000
        splash, dialogs = run.watcher.finish() if run.watcher else (None, [])
        windows = self.platform.display.window_states(run.made)
        for window in run.made:
            window.destroy()
        if run.held:
            run.held.close()
        run.output.seek(0)
        # A parent sees the low 8 bits of the exit status; the whole result stands on standard error.
        code, boxes = self.process.returncode, []
        for caption, _, text in (line.partition(": ") for line in stderr.splitlines()):
            if caption in CAPTIONS and text.startswith("launch ended with result "):
                assert int(text.split()[-1]) & 0xFF == code & 0xFF
                code = int(text.split()[-1])
            elif caption in CAPTIONS:
                boxes.append(SimpleNamespace(caption=caption, text=text, icon=True, splash=False, t=elapsed))
        # With a display every box is also a dialog, in the same order: whether it took the focus and
        # the splash was still up come from the screen.
        if run.watcher:
            assert [d["caption"] for d in dialogs] == [b.caption for b in boxes] and all(d["focus"] for d in dialogs), (dialogs, boxes)
            for box, dialog in zip(boxes, dialogs):
                box.splash, box.t = dialog["splash"], dialog["t"]
        return self.outcome(code=code, killed=self.process.returncode == -9, elapsed=elapsed, stdout=run.output.read().decode(),
                            boxes=boxes, splash=splash, screen=self.platform.screen, windows=windows)
