# The table's Linux platform: the Linux build hosting the real JVM of its private runtime
# (runtime/jre of the build) with the Java test application of tests/app, in a home and settings folders of
# the table's own, and in a mount namespace of its own whose tmpfs covers the folder of the instance
# lock (the account's ~/.cache: the launcher takes no environment variable's word for it), so that no
# other run on the machine meets the table's locks; headless (display=False), on a display that takes
# connections and never answers (display="silent"), or on what a user sees: a private Xvfb with a
# window manager (openbox) and a compositor, and a watcher that records, during one run, the splash
# window (its rectangle, the opacities it shows, when it came and went) and every dialog (its
# caption, whether it had the keyboard focus and the splash was still up), dismissing each with a real
# key press.
import ctypes
import fcntl
import os
import pwd
import resource
import select
import socket
import shutil
import signal
import subprocess
import tempfile
import threading
import time
from pathlib import Path
from types import SimpleNamespace

from Xlib import X, Xatom, Xutil, display as xdisplay, error as xerror
from Xlib.ext import xtest

import conftest

ROOT = Path(__file__).resolve().parents[2]
EXE, CAPTIONS = "QZ-Lumiscope_QZ-57", ("QZ-Lumiscope QZ-57", "Error")
JDK = Path("/usr/lib/jvm/java-17-openjdk-amd64/bin")
CACHE = Path(pwd.getpwuid(os.getuid()).pw_dir) / ".cache"  # the lock's folder is QZ-Lumiscope_QZ-57 in it
LOCK_NAME = f"\u5a51\u4c2d\u6d75\u7369\u6f63\u6570\u515f\u2d5a\u3735@{os.uname().nodename.replace('/', '_')}.lock"
LIMITS = {"nofile": resource.RLIMIT_NOFILE, "address_space": resource.RLIMIT_AS}
setns = ctypes.CDLL(None, use_errno=True).setns


def silent_display():  # a listening X socket (abstract, in the table's network namespace) that never answers
    for number in range(7000, 7100):
        sock = socket.socket(socket.AF_UNIX)
        try:
            sock.bind(f"\0/tmp/.X11-unix/X{number}")
        except OSError:
            sock.close()
            continue
        sock.listen(8)
        return sock, f":{number}"
    raise RuntimeError("no free display number for a silent display")


def entering(namespace, cwd, closed, limits):  # run in the child before exec: the table's mount namespace,
    def enter():                                # then standard streams closed and limits, as the row asks
        if setns(namespace, 0x00020000) != 0:   # CLONE_NEWNS
            os._exit(126)
        os.chdir(cwd)  # entering a mount namespace leaves the working folder at its root
        for fd in closed:
            os.close(fd)
        for name, value in limits.items():
            resource.setrlimit(LIMITS[name], (value, value))
    return enter


def connect(name):
    x = xdisplay.Display(name)
    x.set_error_handler(lambda *a: None)  # windows come and go while we look
    return x, x.intern_atom, x.screen().root


class Display:
    def __init__(self):
        for attempt in range(3):  # a server that refuses every connection at start (seen rarely) is started again
            try:
                return self.start()
            except (xerror.DisplayError, xerror.ConnectionClosedError, OSError, RuntimeError):
                self.close()
        raise RuntimeError("Xvfb and its window manager did not start")

    def start(self):
        read, write = os.pipe()  # Xvfb picks a free display and writes its number there; -noreset: our
        # connections coming and going never restart the server under a run
        self.procs = [subprocess.Popen(["Xvfb", "-displayfd", str(write), "-noreset", "-screen", "0", "1280x1024x24", "-nolisten",
                                        "tcp"], pass_fds=[write], stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)]
        os.close(write)
        self.name = ":" + os.read(read, 16).decode().strip()
        os.close(read)
        self.x, self.atom, self.root = connect(self.name)
        env = {**os.environ, "DISPLAY": self.name}
        self.procs += [subprocess.Popen(p, env=env, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL) for p in (["openbox"], ["xcompmgr"])]
        # The window manager is ready once it has mapped a window of ours: one that announces itself
        # but is still starting up can drop a map request, and a splash would then never show.
        probe = self.root.create_window(0, 0, 10, 10, 0, X.CopyFromParent)
        probe.map()
        for _ in range(200):
            if probe.get_attributes().map_state == X.IsViewable and probe.query_tree().parent != self.root:
                break
            time.sleep(0.05)
        else:
            raise RuntimeError("the window manager did not start")
        probe.destroy()

    def make_windows(self, wanted):
        # Top-level windows (state, WM_CLASS, _NET_WM_NAME), each asking for its first state: "i"
        # minimised, "z" maximised, "h" never shown.
        windows, maximised = [], [self.atom("_NET_WM_STATE_MAXIMIZED_VERT"), self.atom("_NET_WM_STATE_MAXIMIZED_HORZ")]
        for state, cls, title in wanted or ():
            windows.append(self.root.create_window(50, 50, 300, 200, 0, X.CopyFromParent))
            windows[-1].set_wm_class(cls, cls)
            windows[-1].set_wm_hints(flags=Xutil.StateHint, initial_state=Xutil.IconicState if state == "i" else Xutil.NormalState)
            if title:
                windows[-1].change_property(self.atom("_NET_WM_NAME"), self.atom("UTF8_STRING"), 8, title.encode("utf-8", "surrogatepass"))
            if state == "z":
                windows[-1].change_property(self.atom("_NET_WM_STATE"), Xatom.ATOM, 32, maximised)
            if state != "h":
                windows[-1].map()
        self.x.sync()
        time.sleep(0.5 * bool(windows))
        return windows

    def window_states(self, windows):
        # As a user would tell: minimised, shown at all, maximised, in front; pos: creation order.
        active = self.root.get_full_property(self.atom("_NET_ACTIVE_WINDOW"), Xatom.WINDOW)
        states = []
        for pos, window in enumerate(windows):
            wm = window.get_full_property(self.atom("WM_STATE"), self.atom("WM_STATE"))
            wm = wm.value[0] if wm else 0
            net = window.get_full_property(self.atom("_NET_WM_STATE"), Xatom.ATOM)
            states.append({"pos": pos, "iconic": wm == 3, "visible": wm in (1, 3), "front": bool(active) and active.value[0] == window.id,
                           "zoomed": bool(net) and self.atom("_NET_WM_STATE_MAXIMIZED_VERT") in net.value})
        return states

    def close(self):
        for proc in reversed(getattr(self, "procs", [])):  # none when Xvfb could not even be started
            proc.terminate()
            proc.wait()


class Watcher(threading.Thread):
    def __init__(self, name, started):
        super().__init__(daemon=True)
        self.x, atom, self.root = connect(name)
        self.started, self.stopping, self.splash, self.dialogs, self.pending, self.shown = started, False, None, [], [], set()
        self.type, self.opacity, self.title = atom("_NET_WM_WINDOW_TYPE"), atom("_NET_WM_WINDOW_OPACITY"), atom("_NET_WM_NAME")
        self.kinds = {atom("_NET_WM_WINDOW_TYPE_SPLASH"): "splash", atom("_NET_WM_WINDOW_TYPE_DIALOG"): "dialog"}
        self.root.change_attributes(event_mask=X.SubstructureNotifyMask)
        self.x.sync()
        self.start()

    def now(self):
        return (time.monotonic() - self.started) * 1000

    def run(self):
        while not self.stopping:
            while self.x.pending_events():
                try:
                    self.handle(self.x.next_event())
                except xerror.XError:
                    pass  # a window that went while we looked
            for dialog in [d for d in self.pending if time.monotonic() >= d["due"]]:
                self.pending.remove(dialog)
                self.dismiss(dialog)
            select.select([self.x.fileno()], [], [], 0.02)

    def handle(self, event):
        if event.type == X.CreateNotify and event.parent == self.root:
            event.window.change_attributes(event_mask=X.PropertyChangeMask | X.StructureNotifyMask)
            if event.window.get_attributes().map_state != X.IsUnmapped:  # mapped before we looked
                self.mapped(event.window)
        elif event.type == X.MapNotify and event.window == event.event:
            self.mapped(event.window)
        elif event.type == X.PropertyNotify and event.atom == self.opacity:
            self.read_opacity(event.window)
        elif event.type in (X.UnmapNotify, X.DestroyNotify):
            self.shown.discard(event.window.id)
            if self.splash and event.window == self.splash["window"]:
                self.splash["gone"] = self.splash["gone"] or self.now()

    def mapped(self, window):
        kind = window.get_full_property(self.type, Xatom.ATOM)
        kind = kind and self.kinds.get(kind.value[0])
        if window.id in self.shown or not kind:
            return
        self.shown.add(window.id)
        if kind == "splash" and self.splash is None:
            geometry, at = window.get_geometry(), self.root.translate_coords(window, 0, 0)
            self.splash = {"window": window, "t": self.now(), "gone": None, "alphas": [], "rect": [at.x, at.y, geometry.width, geometry.height]}
            self.read_opacity(window)
        elif kind == "dialog":
            title = window.get_full_property(self.title, X.AnyPropertyType)
            self.dialogs.append({"window": window, "t": self.now(), "caption": title.value.decode() if title else None,
                                 "splash": bool(self.splash) and self.splash["gone"] is None, "focus": False, "due": time.monotonic() + 0.3})
            self.pending.append(self.dialogs[-1])

    def read_opacity(self, window):
        value = self.splash and window == self.splash["window"] and window.get_full_property(self.opacity, Xatom.CARDINAL)
        if value and self.splash["alphas"][-1:] != [value.value[0] >> 24]:
            self.splash["alphas"].append(value.value[0] >> 24)

    def dismiss(self, dialog):
        # Return, typed on the keyboard: it reaches the dialog only when the dialog took the focus.
        for _ in range(40):
            dialog["focus"] = self.x.get_input_focus().focus == dialog["window"]
            if dialog["focus"]:
                break
            time.sleep(0.05)
        keycode = self.x.keysym_to_keycode(0xFF0D)
        xtest.fake_input(self.x, X.KeyPress, keycode)
        xtest.fake_input(self.x, X.KeyRelease, keycode)
        self.x.sync()

    def finish(self):
        self.stopping = True
        self.join(5)
        self.x.close()
        return self.splash, self.dialogs


class Platform(conftest.Platform):
    write_failed, raised = "", 3  # a failed log write is told nowhere a user sees; the Java toolkit's frame class counts

    def __init__(self, arch, build):
        self.build, self.state = (ROOT / build / "linux").resolve(), Path(tempfile.mkdtemp(prefix="qz57-table."))
        self.home = self.state / "home"
        super().__init__(f"linux-{arch}", self.state / "apps", self.home / "Documents", "/")
        # The runtime as the application folder gets it, trained with the demo application, while every
        # row runs the test application: another emu57.jar.
        self.runtime, self.trained_with = self.build / "runtime/jre", self.build / "demo/emu57.jar"
        nomain = self.state / "nomain/com/qz/kpo/emu57/app/ApplicationMainForm.java"  # a main class without main
        nomain.parent.mkdir(parents=True)
        nomain.write_text("package com.qz.kpo.emu57.app;\npublic class ApplicationMainForm {}\n")
        for name, sources in (("emu57.jar", ROOT / "tests/app"), ("nomain.jar", self.state / "nomain")):
            subprocess.run([JDK / "javac", "--release", "17", "-d", self.state / name / "c", *Path(sources).rglob("*.java")], check=True)
            subprocess.run([JDK / "jar", "cf", self.state / name / name, "-C", self.state / name / "c", "."], check=True)
        (self.state / "noentry").mkdir()
        subprocess.run(["cc", "-shared", "-x", "c", "-", "-o", self.state / "noentry/libjvm.so"], input=b"int nothing;\n", check=True)
        (self.home / ".config").mkdir(parents=True)
        CACHE.mkdir(mode=0o700, exist_ok=True)
        self.holder = subprocess.Popen(["unshare", "--mount", "--propagation", "private", "sh", "-c",
                                        'mount -t tmpfs -o mode=0700 qz57-table "$0" && echo ready && exec sleep infinity', CACHE],
                                       stdout=subprocess.PIPE)
        assert self.holder.stdout.readline() == b"ready\n", "the Linux rows need a mount namespace of their own (root)"
        self.namespace = os.open(f"/proc/{self.holder.pid}/ns/mnt", os.O_RDONLY)
        self.lock_folder = Path(f"/proc/{self.holder.pid}/root{CACHE}/QZ-Lumiscope_QZ-57")  # as the launcher sees it
        self.display, self.picture, self.screen = Display(), (480, 300), (1280, 1024)

    def text(self, text):  # the one text that names the runtime's library
        return text.replace("jre\\bin\\client\\jvm.dll", "jre/lib/server/libjvm.so")

    def close(self):
        self.display.close()
        self.holder.kill()
        shutil.rmtree(self.state, ignore_errors=True)

    def reset_lock_folder(self, how=None):  # gone, "ours", "foreign" (another user's), "link" (a symbolic link to one of ours)
        if self.lock_folder.is_symlink():
            self.lock_folder.unlink()
        shutil.rmtree(self.lock_folder, ignore_errors=True)
        if how == "link":
            (self.lock_folder.parent / "elsewhere").mkdir(mode=0o700, exist_ok=True)
            self.lock_folder.symlink_to("elsewhere")
        elif how:
            self.lock_folder.mkdir(mode=0o700)
            os.chown(self.lock_folder, 1 if how == "foreign" else os.getuid(), -1)

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
            (path / "jre").symlink_to(self.runtime)
        elif runtime in ("moved", "foreign", "truncated"):  # a copy in another folder, with new file times, as installers make it
            shutil.copytree(self.runtime, path / "jre", symlinks=True, copy_function=shutil.copy)
            archive = path / "jre/lib/server/classes.jsa"
            if runtime == "foreign":  # the archive of Debian's full JDK: another module set
                archive.unlink()
                shutil.copy(JDK.parent / "lib/server/classes.jsa", archive)
            elif runtime == "truncated":  # a copy cut short
                os.truncate(archive, archive.stat().st_size // 2)
        elif runtime == "noentry":
            shutil.copytree(self.state / "noentry", path / "jre/lib/server")
        elif runtime == "fifo":
            (path / "jre/lib/server").mkdir(parents=True)
            os.mkfifo(path / "jre/lib/server/libjvm.so")
        elif runtime.startswith("cut:"):  # the real library cut to N bytes (a negative N: N bytes short)
            data = (self.runtime / "lib/server/libjvm.so").read_bytes()
            (path / "jre/lib/server").mkdir(parents=True)
            (path / "jre/lib/server/libjvm.so").write_bytes(data[:int(runtime[4:])])
        return conftest.App(path, str(path), str(path / EXE))

    def start(self, app, args=(), argv0=None, cwd=None, lock=False, listener=None, folders=None, windows=(),
              debug=False, splash=False, log="junk", display=True, timeout=120, lock_folder=None, settings=None,
              closed=(), limits={}, env=None):
        self.reset_log(log)
        silent = display == "silent" and silent_display()
        env = {"PATH": os.environ["PATH"], "HOME": str(self.home), "LANG": "C.UTF-8", **(env or {}),
               **({"DISPLAY": silent[1] if silent else self.display.name} if display else {})}
        env.update({name: value or str(self.state / "missing") for name, value in (folders or {}).items()})
        command = [app.exe, *(a if isinstance(a, bytes) else a.encode() for a in args)]
        if argv0 == "bare":  # started through PATH by its bare name
            env["PATH"], command[0] = f"{app.path}:{env['PATH']}", EXE
        if lock or lock_folder:
            self.reset_lock_folder(lock_folder or "ours")
        held = lock and open(self.lock_folder / LOCK_NAME, "w")
        if held:
            fcntl.flock(held, fcntl.LOCK_EX)
        if settings == "fifo":  # user-dirs.dirs, the settings file read first of all
            os.mkfifo(self.home / ".config/user-dirs.dirs")
        output, started = tempfile.TemporaryFile(), time.monotonic()
        watcher, made = display is True and Watcher(self.display.name, started), self.display.make_windows(windows)
        cwd = str(app.path) if cwd == "app" else "/"
        process = subprocess.Popen(["strace", "-f", "-o", "/dev/null"] * debug + command, stdout=output, stderr=subprocess.PIPE,
                                   stdin=subprocess.DEVNULL, cwd=cwd, env=env, start_new_session=True,
                                   preexec_fn=entering(self.namespace, cwd, closed, limits))
        return Running(self, app, process, listener, timeout, SimpleNamespace(output=output, held=held, started=started,
                                                                               watcher=watcher, made=made, silent=silent,
                                                                               lock_folder=lock_folder, settings=settings))


class Running(conftest.Running):
    def __init__(self, platform, app, process, listener, timeout, run):
        super().__init__(platform, app, process, listener, timeout)
        self.run = run

    def finish(self):
        try:
            stderr = self.process.communicate(timeout=self.timeout)[1].decode("utf-8", "replace")
        except subprocess.TimeoutExpired:  # the launcher and whatever it started, which may hold its output open
            os.killpg(self.process.pid, signal.SIGKILL)
            stderr = self.process.communicate()[1].decode("utf-8", "replace")
        run, elapsed = self.run, (time.monotonic() - self.run.started) * 1000
        splash, dialogs = run.watcher.finish() if run.watcher else (None, [])
        windows = self.platform.display.window_states(run.made)
        for window in run.made:
            window.destroy()
        if run.held:
            run.held.close()
        if run.silent:
            run.silent[0].close()
        if run.lock_folder:
            self.platform.reset_lock_folder()
        if run.settings:
            (self.platform.home / ".config/user-dirs.dirs").unlink()
        run.output.seek(0)
        # A parent sees the low 8 bits of the exit status; the whole result stands on standard error.
        code, boxes = self.process.returncode, []
        # What the user or packager can act on: the launcher's cause lines and a Java exception's description.
        causes = [line for line in stderr.splitlines() if line.startswith((f"{EXE}: ", "Exception in thread "))]
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
                            boxes=boxes, splash=splash, screen=self.platform.screen, windows=windows, causes=causes)
