# The scenario table's shared pieces: the hand-off listener, the VM record, the platform fixture and
# what both platforms (wine.py: a Windows build under Wine with the VM double; linux.py: the Linux
# build with the real JVM) do alike.
#
# A platform offers app(runtime="double"|"none"|"noentry"|"dep", strings=True, vm={script}, suffix="",
# altered=False) -> App; run(app, args, **inputs) -> outcome; start(...) -> Running (.wait_main(),
# .stop(), .finish() -> outcome); read_log(); fixed_options(app_dir); folder_options(). Inputs: argv0,
# cwd="app", lock (another instance holds the lock), listener (a Listener), folders ({name: path, None:
# unusable}), windows [(state, class, title)], debug, splash (boxes wait for a splash), log ("junk": a
# long old log first, "nofolder", "keep"), timeout; Linux also display=False|"silent" (never answers),
# lock_folder ("foreign", "link"), settings="fifo", closed (standard streams), limits ({"nofile": N,
# "address_space": BYTES}), env (more variables); app(runtime="fifo"|"cut:N") (libjvm.so cut to N bytes,
# a negative N: N bytes short) and runtime="moved"|"foreign"|"truncated" (a copy of the runtime in the
# application folder; with Debian's JDK's class-data archive; with its own archive cut short).
# Besides: name, docs (the documents folder), picture and screen (sizes), raised (how many windows an
# activation raises), text(TEXT) (a box text with the platform's runtime path), write_failed; Linux also
# build, display, runtime and trained_with (the build's runtime and the jar it was trained with); Wine
# also env and drive_c.
#
# vm-script.txt in the application directory, key=value lines: create=N (JNI_CreateJavaVM result),
# missing_class=NAME, missing_method=1, main_ms=N, until=NAME (main runs until app/NAME exists),
# exit=N (System.exit), destroy=N (DestroyJavaVM result); Linux also throw=1, say=1 (prints on both streams).
# vm-record.txt beside it, one line each, texts as the VM got them: "option TEXT"; "call NAME ..." per
# JNI call (the Windows double; " -> null" when scripted to fail); "main N" then "arg TEXT" per
# (encoded) element; "end" when main returns; "trap" when the launcher used a function it must not;
# Linux also "vm TEXT", the VM's java.vm.info ("..., sharing" when it maps its class-data archive).
import itertools
import shutil
import socket
import struct
import subprocess
import threading
import time
from pathlib import Path
from types import SimpleNamespace

import pytest

PORT = 6152
LOG = "QZ-LumiscopeQZ-57Nova/logs/QZ-LumiscopeQZ-57Nova-L.log"


def hexed(text):  # four hex digits per UTF-16 unit: how main and the hand-off get every argument
    return text.encode("utf-16-be", "surrogatepass").hex()


class Record:
    def __init__(self, data):
        self.lines = data.decode("latin-1").splitlines()
        self.options, self.calls, self.args, self.vm = ([line[len(head):] for line in self.lines if line.startswith(head)]
                                                        for head in ("option ", "call ", "arg ", "vm "))


class App:
    def __init__(self, path, native, exe):
        self.path, self.native, self.exe = path, native, exe

    def record(self):
        file = self.path / "vm-record.txt"
        return Record(file.read_bytes()) if file.exists() else None


class Listener(threading.Thread):  # the running application's end of the hand-off: keeps what arrives
    # until the sender closes; counts connections. With `reset`, it reads nothing through a small
    # window, so the sender is still sending a second later, and then resets the connection: a sender
    # that does not guard against it dies of SIGPIPE on its next send.
    def __init__(self, reset=False):
        super().__init__(daemon=True)
        self.received, self.connections, self.closed_by_sender, self.reset = b"", 0, False, reset
        self.sock = port_free()
        if reset:
            self.sock.setsockopt(socket.SOL_SOCKET, socket.SO_RCVBUF, 4096)
        self.sock.listen(4)
        self.sock.settimeout(60)

    def run(self):
        try:
            conn, self.connections = self.sock.accept()[0], 1
        except OSError:
            return  # nobody came: the row's check says so
        if self.reset:
            time.sleep(1)
            conn.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, struct.pack("ii", 1, 0))
            return conn.close()
        conn.settimeout(30)
        while not self.closed_by_sender:
            chunk = conn.recv(1 << 16)
            self.received, self.closed_by_sender = self.received + chunk, not chunk
        conn.close()

    def finish(self):
        self.join(60)
        self.sock.settimeout(0.2)
        try:
            self.connections += bool(self.sock.accept())
        except OSError:
            pass
        self.sock.close()


def port_free():  # bound to the hand-off port, or the row fails: rows must not talk to another program
    sock = socket.socket()
    sock.setsockopt(socket.SOL_SOCKET, socket.SO_REUSEADDR, 1)
    for _ in range(50):
        try:
            sock.bind(("127.0.0.1", PORT))
            return sock
        except OSError:
            time.sleep(0.2)
    pytest.fail(f"port {PORT} is taken by another program")


class Platform:
    # What both platforms share: application folders, the log, the option list, run = start + finish.
    def __init__(self, name, apps, docs, separator):
        self.name, self.apps, self.docs, self.sep, self.counter = name, apps, docs, separator, itertools.count()

    def new_app(self, suffix, vm):
        path = self.apps / f"{next(self.counter)}{suffix}"
        path.mkdir(parents=True)
        (path / "vm-script.txt").write_text("".join(f"{k}={v}\n" for k, v in (vm or {}).items()))
        return path

    def fixed_options(self, app_dir):
        return [f"-Djava.class.path={app_dir}{self.sep}emu57.jar", "-Xms64m", "-Xmx256m", "-Dswing.aatext=true",
                "-DencodedFilenames=true", "-Dsun.locale.formatasdefault=true", f"-Djava.library.path={app_dir}",
                "-DconsoleLogLevel=ALL", "-DfileLogLevel=INFO", "-DjniFileLogLevel=3"]

    def read_log(self):
        file = self.docs / LOG
        return file.read_bytes() if file.exists() else None

    def reset_log(self, how):
        folder = (self.docs / LOG).parent
        if how == "junk":
            folder.mkdir(parents=True, exist_ok=True)
            (self.docs / LOG).write_bytes(b"x" * 65536)
        elif how == "nofolder":
            shutil.rmtree(folder, ignore_errors=True)

    def run(self, app, args=(), **inputs):
        return self.start(app, args, **inputs).finish()


class Running:
    def __init__(self, platform, app, process, listener, timeout):
        self.platform, self.app, self.process, self.listener, self.timeout = platform, app, process, listener, timeout
        if listener:
            listener.start()

    def wait_main(self):
        for _ in range(600):
            if any(line.startswith("main ") for line in (self.app.record() or Record(b"")).lines):
                return True
            time.sleep(0.1)
        return False

    def stop(self):
        (self.app.path / "stop").write_bytes(b"")
        return self.finish()

    def outcome(self, **seen):  # what both platforms report alike, with what only the platform saw
        if self.listener:
            self.listener.finish()
        return SimpleNamespace(**seen, record=self.app.record(), log=self.platform.read_log(), listener=self.listener,
                               log_folder=(self.platform.docs / LOG).parent.exists(), received=self.listener and self.listener.received)


def pytest_addoption(parser):
    parser.addoption("--build", default="build", help="build folder with one subfolder per architecture")
    parser.addoption("--platforms", default="", help="comma-separated, e.g. linux-x86_64,wine-x86_64; default: what runs here")


def pytest_generate_tests(metafunc):
    names = [p for p in metafunc.config.getoption("platforms").split(",") if p] or ["linux-x86_64"] + [
        f"wine-{arch}" for arch, loader in (("i686", "wine"), ("x86_64", "wine64"))
        if subprocess.run([f"/usr/lib/wine/{loader}", "--version"], capture_output=True).returncode == 0]
    if "row" in metafunc.fixturenames:
        pairs = [(p, r) for p in names for r in metafunc.module.ROWS if r.only is None or p.startswith(r.only)]
        metafunc.parametrize(["platform", "row"], pairs, indirect=["platform"], scope="session", ids=[f"{p}-{r.name}" for p, r in pairs])
    elif "platform" in metafunc.fixturenames:  # a test for one platform says so in its `only`
        only = [p for p in names if p.startswith(getattr(metafunc.function, "only", ""))]
        metafunc.parametrize("platform", only, indirect=True, scope="session")


@pytest.fixture(scope="session")
def platform(request):
    kind, arch = request.param.split("-", 1)
    driver = __import__(kind).Platform(arch, Path(request.config.getoption("build")))
    yield driver
    driver.close()
