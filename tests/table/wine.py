# The table's Windows platform: one architecture's build under Wine, in one prefix on a private X
# display (tests/wine/bed.sh), seen through probe.exe (tests/wine/probe.cpp) with the VM double.
import shutil
import struct
import subprocess
import tempfile
from pathlib import Path
from types import SimpleNamespace

import conftest

ROOT = Path(__file__).resolve().parents[2]
EXE = "QZ-Lumiscope_QZ-57.exe"
UNUSABLE = "C:\\windows\\system32\\kernel32.dll\\missing"  # a folder that can neither exist nor be made


def win(path):
    return "Z:" + str(path).replace("/", "\\")


class Platform(conftest.Platform):
    write_failed, raised = "WriteFile failed with error 6.\r\n", 2

    def __init__(self, arch, build):
        self.build = (ROOT / build / arch).resolve()
        self.state = self.build / "table-bed"
        subprocess.run(["bash", ROOT / "tests/wine/bed.sh", "setup", self.state], check=True)
        env = subprocess.run(["bash", "-c", '. "$0"; env -0', self.state / "env.sh"], capture_output=True, check=True)
        self.env = dict(item.split("=", 1) for item in env.stdout.decode().split("\0") if "=" in item)
        self.drive_c = self.state / "prefix/drive_c"
        docs = next(self.drive_c.glob("users/*/Documents"))
        super().__init__(f"wine-{arch}", self.state / "apps", docs, "\\")
        self.appdata = f"C:\\users\\{docs.parent.name}\\AppData\\Roaming"
        self.picture = struct.unpack_from("<ii", (self.build / "launcher/splash.bmp").read_bytes(), 18)

    def text(self, text):
        return text

    def close(self):
        subprocess.run(["bash", ROOT / "tests/wine/bed.sh", "teardown", self.state])

    def folder_options(self):
        return [f"-Duser.appdata.path={self.appdata}", f"-Duser.temp.path={self.appdata}"]

    def app(self, runtime="double", strings=True, vm=None, suffix="", altered=False):
        path = self.new_app(suffix, vm)
        (path / "jre/bin/client").mkdir(parents=True)
        image = bytearray((self.build / "launcher" / (EXE if strings else EXE.replace(".exe", "-nostrings.exe"))).read_bytes())
        image[-1] ^= 0x5A if altered else 0  # the last byte: file padding, never loaded
        (path / EXE).write_bytes(image)
        (path / "emu57.jar").write_bytes(b"")
        parts = self.build / "tests/wine"
        dll = {"double": "jvm.dll", "noentry": "vmdrt.dll", "dep": "dep/jvm.dll"}.get(runtime)
        if dll:
            shutil.copy(parts / dll, path / "jre/bin/client/jvm.dll")
        if runtime == "dep":
            shutil.copy(parts / "vmdrt.dll", path / "jre/bin/vmdrt.dll")
        return conftest.App(path, win(path), win(path / EXE))

    def start(self, app, args=(), argv0=None, cwd=None, lock=False, listener=None, folders=None, windows=(),
              debug=False, splash=False, log="junk", timeout=120):
        self.reset_log(log)
        output = app.path / "output.txt"  # the program's standard output and error, written by probe.exe
        probe = [self.env["WINE"], str(self.build / "tests/wine/probe.exe"), "exe=" + conftest.hexed(app.exe), f"timeout={timeout * 1000}",
                 "cmd=" + conftest.hexed(subprocess.list2cmdline([argv0 or app.exe, *args])), "out=" + conftest.hexed(win(output)),
                 "cwd=" + conftest.hexed(app.native if cwd == "app" else "C:\\windows")]
        probe += ["lock=1"] * lock + ["debug=1"] * debug + ["splash_wait=3000"] * splash
        for name, path in (folders or {}).items():
            if path:
                (self.drive_c / path[3:].replace("\\", "/")).mkdir(parents=True, exist_ok=True)
            probe.append("folder=" + conftest.hexed(f"{name}={path or UNUSABLE}"))
        probe += ["window=" + conftest.hexed(",".join(w)) for w in windows]
        # Events go to a file: Wine's own processes, started on the program's behalf, would hold a pipe open.
        events = tempfile.TemporaryFile()
        process = subprocess.Popen(probe, stdout=events, stderr=subprocess.DEVNULL, stdin=subprocess.DEVNULL, env=self.env)
        return Running(self, app, process, listener, timeout, events, output)


def text(token):
    return bytes.fromhex(token[1:]).decode("utf-16-be")


class Running(conftest.Running):
    def __init__(self, platform, app, process, listener, timeout, events, output):
        super().__init__(platform, app, process, listener, timeout)
        self.events, self.output = events, output

    def finish(self):
        self.process.wait(self.timeout + 30)
        self.events.seek(0)
        events = {}
        for kind, *fields in map(str.split, self.events.read().decode().splitlines()):
            events.setdefault(kind, []).append([text(f) if f.startswith("t") else int(f) for f in fields])
        (t, code, killed), = events["exit"]
        seen, gone = events.get("splash"), events.get("splash_gone")
        return self.outcome(
            code=code, killed=bool(killed), elapsed=t, stdout=self.output.read_bytes().decode("latin-1"), screen=tuple(events["screen"][0]),
            boxes=[SimpleNamespace(t=b[0], caption=b[1], text=b[2], icon=bool(b[3]), splash=bool(b[4])) for b in events.get("box", [])],
            windows=[dict(zip(("pos", "iconic", "zoomed", "visible", "front"), map(bool, w))) | {"pos": w[0]} for w in events.get("window", [])],
            splash=seen and {"t": seen[0][0], "rect": seen[0][1:5], "exstyle": seen[0][5], "gone": gone[0][0], "alphas": gone[0][1:]})
