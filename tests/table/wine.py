"""The table's Windows platform: one architecture's build run under Wine, in one prefix on a private X
display (tests/wine/bed.sh), seen through probe.exe (tests/wine/probe.cpp) and the VM double."""
import itertools
import json
import shutil
import struct
import subprocess
import tempfile
import time
from pathlib import Path
from types import SimpleNamespace

from conftest import Record

ROOT = Path(__file__).resolve().parents[2]
EXE = "QZ-Lumiscope_QZ-57.exe"
UNUSABLE = "C:\\windows\\system32\\kernel32.dll\\missing"  # a folder that can neither exist nor be made
LOG = "QZ-LumiscopeQZ-57Nova/logs/QZ-LumiscopeQZ-57Nova-L.log"


def hexunits(text):
    return text.encode("utf-16-be", "surrogatepass").hex()


def win(path):
    return "Z:" + str(path).replace("/", "\\")


class App:
    def __init__(self, path):
        self.path, self.native, self.exe = path, win(path), win(path / EXE)

    def record(self):
        file = self.path / "vm-record.txt"
        return Record(file.read_bytes()) if file.exists() else None


class Platform:
    def __init__(self, arch, build):
        self.name, self.build = f"wine-{arch}", (ROOT / build / arch).resolve()
        self.state, self.counter = self.build / "table-bed", itertools.count()
        subprocess.run(["bash", ROOT / "tests/wine/bed.sh", "setup", self.state], check=True)
        env = subprocess.run(["bash", "-c", '. "$0"; env -0', self.state / "env.sh"], capture_output=True, check=True)
        self.env = dict(item.split("=", 1) for item in env.stdout.decode().split("\0") if "=" in item)
        self.drive_c = self.state / "prefix/drive_c"
        self.docs = next(self.drive_c.glob("users/*/Documents"))
        self.appdata = f"C:\\users\\{self.docs.parent.name}\\AppData\\Roaming"
        self.picture = struct.unpack_from("<ii", (self.build / "launcher/splash.bmp").read_bytes(), 18)

    write_failed = "WriteFile failed with error 6.\r\n"

    def text(self, text):
        return text

    def close(self):
        subprocess.run(["bash", ROOT / "tests/wine/bed.sh", "teardown", self.state])

    def fixed_options(self, app_dir):
        return [f"-Djava.class.path={app_dir}\\emu57.jar", "-Xms64m", "-Xmx256m", "-Dswing.aatext=true",
                "-DencodedFilenames=true", "-Dsun.locale.formatasdefault=true", f"-Djava.library.path={app_dir}",
                "-DconsoleLogLevel=ALL", "-DfileLogLevel=INFO", "-DjniFileLogLevel=3"]

    def folder_options(self):
        return [f"-Duser.appdata.path={self.appdata}", f"-Duser.temp.path={self.appdata}"]

    def app(self, runtime="double", strings=True, vm=None, suffix="", altered=False):
        path = self.state / "apps" / f"{next(self.counter)}{suffix}"
        (path / "jre/bin/client").mkdir(parents=True)
        launcher = self.build / "launcher" / (EXE if strings else EXE.replace(".exe", "-nostrings.exe"))
        image = bytearray(launcher.read_bytes())
        image[-1] ^= 0x5A if altered else 0  # the last byte: file padding, never loaded
        (path / EXE).write_bytes(image)
        (path / "emu57.jar").write_bytes(b"")
        parts = self.build / "tests/wine"
        dll = {"double": "jvm.dll", "noentry": "vmdrt.dll", "dep": "dep/jvm.dll"}.get(runtime)
        if dll:
            shutil.copy(parts / dll, path / "jre/bin/client/jvm.dll")
        if runtime == "dep":
            shutil.copy(parts / "vmdrt.dll", path / "jre/bin/vmdrt.dll")
        (path / "vm-script.txt").write_text("".join(f"{k}={v}\n" for k, v in (vm or {}).items()))
        return App(path)

    def read_log(self):
        file = self.docs / LOG
        return file.read_bytes() if file.exists() else None

    def run(self, app, args=(), **inputs):
        return self.start(app, args, **inputs).finish()

    def start(self, app, args=(), argv0=None, cwd=None, lock=False, listener=None, folders=None, windows=(),
              debug=False, splash=False, log="junk", timeout=120):
        folder = (self.docs / LOG).parent
        if log == "nofolder":
            shutil.rmtree(folder, ignore_errors=True)
        elif log == "junk":
            folder.mkdir(parents=True, exist_ok=True)
            (self.docs / LOG).write_bytes(b"x" * 65536)
        argv0 = argv0.exe if isinstance(argv0, App) else argv0 or app.exe
        probe = [self.env["WINE"], str(self.build / "tests/wine/probe.exe"), "exe=" + hexunits(app.exe),
                 "cmd=" + hexunits(subprocess.list2cmdline([argv0, *args])), f"timeout={timeout * 1000}",
                 "cwd=" + hexunits(app.native if cwd == "app" else "C:\\windows")]
        probe += ["lock=1"] * lock + ["debug=1"] * debug + ["splash_wait=3000"] * splash
        for name, path in (folders or {}).items():
            if path:
                (self.drive_c / path[3:].replace("\\", "/")).mkdir(parents=True, exist_ok=True)
            probe.append("folder=" + hexunits(f"{name}={path or UNUSABLE}"))
        probe += ["window=" + hexunits(",".join(w)) for w in windows]
        if listener:
            listener.start()
        output = tempfile.TemporaryFile("w+")
        process = subprocess.Popen(probe, stdout=output, stderr=subprocess.DEVNULL, stdin=subprocess.DEVNULL, env=self.env)
        return Running(self, app, process, output, listener, timeout)


class Running:
    def __init__(self, wine, app, process, output, listener, timeout):
        self.wine, self.app, self.process, self.output, self.listener, self.timeout = wine, app, process, output, listener, timeout

    def wait_main(self):
        for _ in range(600):
            if any(line.startswith("main ") for line in (self.app.record() or Record(b"")).lines):
                return True
            time.sleep(0.1)

    def stop(self):
        (self.app.path / "stop").write_bytes(b"")
        return self.finish()

    def finish(self):
        self.process.wait(self.timeout + 30)
        if self.listener:
            self.listener.finish()
        self.output.seek(0)
        events = [json.loads(line) for line in self.output.read().splitlines() if line.startswith("{")]
        of = lambda kind: [e for e in events if e["ev"] == kind]
        (exit,), (screen,), seen, gone = of("exit"), of("screen"), of("splash"), of("splash_gone")
        return SimpleNamespace(
            code=exit["code"], killed=exit["killed"], elapsed=exit["t"], stdout=exit["stdout"], screen=(screen["w"], screen["h"]),
            boxes=[SimpleNamespace(**b) for b in of("box")], windows=of("window"), record=self.app.record(),
            splash={**seen[0], "gone": gone[0]["t"], "alphas": gone[0]["alphas"]} if seen else None,
            log=self.wine.read_log(), log_folder=(self.wine.docs / LOG).parent.exists(), listener=self.listener,
            received=self.listener.received if self.listener else None)
