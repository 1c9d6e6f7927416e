"""The launcher's scenario table: shared pieces and the platform fixture.

A platform (wine.py; linux.py later) offers: name; app(runtime="double"|"none"|"noentry"|"dep",
strings=True, vm={script}, suffix="", altered=False) -> App (a fresh application directory, .record());
run(app, args, **inputs) -> Outcome; start(...) -> Running (.wait_main(), .stop() -> Outcome);
read_log(); fixed_options(app_dir) and folder_options(). Inputs: argv0 (App or text), cwd="app",
lock (another instance holds the lock), listener (a Listener; else nobody listens), folders
({"Personal"|"AppData"|"Common AppData": path, None: unusable}), windows [(state, class, title)],
debug, splash (boxes wait for a splash), log ("junk": a long old log first, "nofolder", "keep").

VM script, vm-script.txt in the application directory, key=value lines: create=N (JNI_CreateJavaVM
result), missing_class=NAME, missing_method=1, main_ms=N, until=NAME (main runs until app/NAME
exists), exit=N (main ends the process, as System.exit), destroy=N (DestroyJavaVM result).

VM record, vm-record.txt beside it, one line each, texts as the VM got them: "option TEXT" per VM
option; "call NAME ..." per JNI call (the Windows double only; " -> null" when scripted to fail);
"main N" when main starts with N arguments, then "arg TEXT" per element (encoded); "end" when main
returns; "trap jni|invoke N" when the launcher used a function it must not (exit 0xDEAD0000 + N).
"""
import os
import select
import socket
import struct
import subprocess
import threading
import time

import pytest

PORT = 6152


class Record:
    def __init__(self, data):
        self.lines = data.decode("latin-1").splitlines()
        self.options, self.calls, self.args = ([line[len(head):] for line in self.lines if line.startswith(head)]
                                               for head in ("option ", "call ", "arg "))


class Listener:  # the running application's end of the hand-off: keeps what arrives until the sender
    # closes, or resets the connection after `drop_after` bytes; counts connections
    def __init__(self, drop_after=None):
        self.drop_after, self.received, self.connections, self.closed_by_sender = drop_after, b"", 0, False

    def start(self):
        self.sock = port_free()
        self.sock.listen(4)
        self.thread = threading.Thread(target=self._serve, daemon=True)
        self.thread.start()

    def _serve(self):
        if select.select([self.sock], [], [], 60)[0]:
            conn, self.connections = self.sock.accept()[0], 1
            conn.settimeout(30)
            while self.drop_after is None or len(self.received) < self.drop_after:
                chunk = conn.recv(65536 if self.drop_after is None else self.drop_after - len(self.received))
                self.closed_by_sender = not chunk
                if not chunk:
                    break
                self.received += chunk
            if self.drop_after:
                conn.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, struct.pack("ii", 1, 0))
            conn.close()

    def finish(self):
        self.thread.join(60)
        self.connections += len(select.select([self.sock], [], [], 0.2)[0])
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


def pytest_addoption(parser):
    parser.addoption("--build", default="build", help="build folder with one subfolder per architecture")
    parser.addoption("--platforms", default="", help="comma-separated, e.g. wine-x86_64; default: what runs here")


def runnable_platforms():
    loaders = {"wine-i686": "/usr/lib/wine/wine", "wine-x86_64": "/usr/lib/wine/wine64"}
    return ["linux-x86_64"] * (os.uname().machine == "x86_64") + [
        name for name, loader in loaders.items() if subprocess.run([loader, "--version"], capture_output=True).returncode == 0]


def pytest_generate_tests(metafunc):
    if "platform" not in metafunc.fixturenames:
        return
    names = [p for p in metafunc.config.getoption("platforms").split(",") if p] or runnable_platforms()
    rows = getattr(metafunc.module, "ROWS", None)
    if "row" in metafunc.fixturenames:
        pairs = [(p, r) for p in names for r in rows if r.only is None or p.startswith(r.only)]
        metafunc.parametrize(["platform", "row"], pairs, indirect=["platform"], scope="session",
                             ids=[f"{p}-{r.name}" for p, r in pairs])
    else:
        metafunc.parametrize("platform", names, indirect=True, scope="session")


@pytest.fixture(scope="session")
def platform(request):
    kind, arch = request.param.split("-", 1)
    driver = __import__(kind).Platform(arch, request.config.getoption("build"))
    yield driver
    driver.close()
