"""The launcher's scenario table: shared pieces and the platform fixture.

A platform driver (wine.py; linux.py for the Linux build) offers
    platform.name                     "wine-x86_64", "wine-i686", ...
    platform.app(runtime="double", strings=True, vm={}, suffix="") -> App
        a fresh application directory: the launcher (with or without its string table), emu57.jar,
        the runtime ("double", "none", "noentry": a library without JNI_CreateJavaVM, "dep": one
        that needs a DLL of jre/bin) and the VM script `vm`
    platform.run(app, args, **inputs) -> Outcome      platform.start(...) -> Running (.wait_main(),
        .stop() -> Outcome) for a first instance that others meet
    inputs: argv0 (an App whose program path is argv[0], or "bare": no directory), cwd ("app"),
        lock (another instance holds the lock), listener (a Listener, else nobody listens),
        folders ({"Personal"|"AppData"|"Common AppData": path}), windows ([(state, class, title)]),
        debug (run under a debugger), splash (a splash is expected: boxes wait for it),
        log ("junk": a long old log first, "nofolder": no logs folder, "keep")

VM script (vm-script.txt in the application directory, key=value lines; all optional):
    create=N  JNI_CreateJavaVM returns N        missing_class=NAME  FindClass(NAME) finds nothing
    missing_method=1  no static main             main_ms=N  main runs N ms
    until=NAME  main runs until app/NAME exists  exit=N  main ends the process with N (System.exit)
    destroy=N  DestroyJavaVM returns N

VM record (vm-record.txt in the application directory, one line each, bytes as the VM got them):
    option TEXT      each VM option, in order
    call NAME ...    each JNI call, in order (the Windows double only): JNI_CreateJavaVM VERSION
                     ignoreUnrecognized=B, FindClass NAME, GetStaticMethodID CLASS NAME SIG,
                     NewObjectArray N CLASS INIT, NewStringUTF TEXT, SetObjectArrayElement I TEXT,
                     CallStaticVoidMethodV CLASS METHOD, DestroyJavaVM; " -> null" when scripted to fail
    main N           main entered with N arguments, followed by
    arg TEXT         each element of main's String[], as main got it (encoded)
    end              main returned (absent when main ended the process)
    trap jni|invoke N   the launcher used a function it must not use (exit 0xDEAD0000 + N)
"""
import select
import socket
import subprocess
import threading
import time

import pytest

PORT = 6152


class Record:
    def __init__(self, data):
        self.lines = data.decode("latin-1").splitlines()
        self.options = self._all("option ")
        self.calls = self._all("call ")
        self.args = self._all("arg ")

    def _all(self, head):
        return [line[len(head):] for line in self.lines if line.startswith(head)]


class Listener:
    """The running application's end of the hand-off on 127.0.0.1:6152: takes connections and keeps
    what arrives until the sender closes, or resets the connection after `drop_after` bytes."""

    def __init__(self, drop_after=None):
        self.drop_after, self.received, self.connections, self.closed_by_sender = drop_after, b"", 0, False

    def start(self):
        self.sock = socket.socket()
        self.sock.setsockopt(socket.SOL_SOCKET, socket.SO_REUSEADDR, 1)
        port_free(self.sock)
        self.sock.listen(4)
        self.thread = threading.Thread(target=self._serve, daemon=True)
        self.thread.start()

    def _serve(self):
        if not select.select([self.sock], [], [], 60)[0]:
            return
        conn, _ = self.sock.accept()
        self.connections += 1
        conn.settimeout(30)
        while self.drop_after is None or len(self.received) < self.drop_after:
            want = 65536 if self.drop_after is None else self.drop_after - len(self.received)
            chunk = conn.recv(want)
            if not chunk:
                self.closed_by_sender = True
                break
            self.received += chunk
        if self.drop_after is not None:
            conn.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, b"\1\0\0\0\0\0\0\0")
        conn.close()

    def finish(self):
        self.thread.join(60)
        self.connections += len(select.select([self.sock], [], [], 0.2)[0])
        self.sock.close()


def port_free(sock=None):
    """Binds the hand-off port (waiting a little for a closing connection); fails when another
    program holds it, since then the rows would talk to it."""
    sock = sock or socket.socket()
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
    return [name for name, loader in loaders.items()
            if subprocess.run([loader, "--version"], capture_output=True).returncode == 0]


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
    if kind == "wine":
        from wine import Wine
        driver = Wine(arch, request.config.getoption("build"))
    else:
        from linux import Linux
        driver = Linux(arch, request.config.getoption("build"))
    yield driver
    driver.close()
