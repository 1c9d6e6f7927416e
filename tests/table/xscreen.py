"""What a user sees of the Linux launcher on an X display: a private Xvfb with a window manager
(openbox) and a compositor, and a watcher that records, during one run, the splash window (its
rectangle, the opacities it shows, when it came and went) and every dialog (its caption, whether it
had the keyboard focus and the splash was still up), dismissing each dialog with a real key press."""
import os
import select
import subprocess
import tempfile
import threading
import time

from Xlib import X, Xatom, display as xdisplay, error as xerror
from Xlib.ext import xtest
from Xlib.protocol import event as xevent


class Display:
    def __init__(self):
        for attempt in range(3):  # an X server that gives up at start (seen rarely) is started again
            if self.start_server():
                break
            self.procs[0].wait()
        else:
            raise RuntimeError("Xvfb did not start: " + open(self.errors.name, errors="replace").read())
        env = {**os.environ, "DISPLAY": self.name}
        for wm in (["openbox"], ["xcompmgr"]):
            self.procs.append(subprocess.Popen(wm, env=env, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL))
        self.x.set_error_handler(lambda *a: None)
        for _ in range(100):  # the window manager announces itself on the root window
            if self.x.screen().root.get_full_property(self.x.intern_atom("_NET_SUPPORTING_WM_CHECK"), X.AnyPropertyType):
                break
            time.sleep(0.05)

    def start_server(self):
        """Xvfb on the first free display number it finds (-displayfd), once it takes connections."""
        read, write = os.pipe()
        self.errors = tempfile.NamedTemporaryFile("w+", prefix="xvfb.")
        self.procs = [subprocess.Popen(["Xvfb", "-displayfd", str(write), "-screen", "0", "1280x1024x24", "-nolisten", "tcp"],
                                       pass_fds=[write], stdout=subprocess.DEVNULL, stderr=self.errors)]
        os.close(write)
        self.name = ":" + os.read(read, 16).decode().strip()
        os.close(read)
        if self.name == ":":  # it ended before it chose a number
            return False
        for _ in range(300):  # the number can come a while before the server takes connections
            try:
                self.x = xdisplay.Display(self.name)
                return True
            except xerror.DisplayError:
                if self.procs[0].poll() is not None:
                    return False
                time.sleep(0.1)
        self.procs[0].terminate()
        return False

    def ask_wm(self, window, message, *data):
        """A client message to the window manager about `window`, as pagers and taskbars send them."""
        atom = self.x.intern_atom
        root = self.x.screen().root
        event = xevent.ClientMessage(window=window, client_type=atom(message), data=(32, (list(data) + [0] * 5)[:5]))
        root.send_event(event, event_mask=X.SubstructureRedirectMask | X.SubstructureNotifyMask)
        self.x.sync()

    def make_windows(self, wanted):
        """Top-level windows (state, WM_CLASS, _NET_WM_NAME): state "i" minimised, "z" maximised,
        "h" never shown, anything else normal. Returns them once the window manager has them."""
        atom, root, windows = self.x.intern_atom, self.x.screen().root, []
        for state, cls, title in wanted:
            window = root.create_window(50, 50, 300, 200, 0, X.CopyFromParent)
            window.set_wm_class(cls, cls)
            if title:
                window.change_property(atom("_NET_WM_NAME"), atom("UTF8_STRING"), 8, title.encode("utf-8", "surrogatepass"))
            if state != "h":
                window.map()
            windows.append(window)
        self.x.sync()
        time.sleep(0.5)
        for window, (state, _, _) in zip(windows, wanted):
            if state == "z":
                self.ask_wm(window, "_NET_WM_STATE", 1, atom("_NET_WM_STATE_MAXIMIZED_VERT"), atom("_NET_WM_STATE_MAXIMIZED_HORZ"))
            elif state == "i":
                self.ask_wm(window, "WM_CHANGE_STATE", 3)
        time.sleep(0.5)
        return windows

    def window_states(self, windows):
        """As a user would tell: minimised, shown at all, maximised, in front, in creation order."""
        atom, root = self.x.intern_atom, self.x.screen().root
        active = root.get_full_property(atom("_NET_ACTIVE_WINDOW"), Xatom.WINDOW)
        states = []
        for pos, window in enumerate(windows):
            wm_state = window.get_full_property(atom("WM_STATE"), atom("WM_STATE"))
            net = window.get_full_property(atom("_NET_WM_STATE"), Xatom.ATOM)
            wm = wm_state.value[0] if wm_state else 0
            states.append({"pos": pos, "iconic": wm == 3, "visible": wm in (1, 3),
                           "zoomed": bool(net) and atom("_NET_WM_STATE_MAXIMIZED_VERT") in net.value,
                           "front": bool(active) and active.value[0] == window.id})
        return states

    def close(self):
        for proc in reversed(self.procs):
            proc.terminate()
            proc.wait()


class Watcher(threading.Thread):
    def __init__(self, name, started):
        super().__init__(daemon=True)
        self.x, self.started, self.stopping = xdisplay.Display(name), started, False
        self.x.set_error_handler(lambda *a: None)
        atom = self.x.intern_atom
        self.type, self.opacity, self.title = atom("_NET_WM_WINDOW_TYPE"), atom("_NET_WM_WINDOW_OPACITY"), atom("_NET_WM_NAME")
        self.kinds = {atom("_NET_WM_WINDOW_TYPE_SPLASH"): "splash", atom("_NET_WM_WINDOW_TYPE_DIALOG"): "dialog"}
        self.root = self.x.screen().root
        self.root.change_attributes(event_mask=X.SubstructureNotifyMask)
        self.x.sync()
        self.splash, self.dialogs, self.pending, self.shown = None, [], [], set()
        self.start()

    def now(self):
        return (time.monotonic() - self.started) * 1000

    def kind(self, window):
        value = window.get_full_property(self.type, Xatom.ATOM)
        return self.kinds.get(value.value[0]) if value else None

    def run(self):
        while not self.stopping:
            try:
                while self.x.pending_events():
                    self.handle(self.x.next_event())
                for dialog, at in list(self.pending):
                    if time.monotonic() >= at:
                        self.pending.remove((dialog, at))
                        self.dismiss(dialog)
            except xerror.XError:
                pass  # a window that went while we looked; the watch goes on
            select.select([self.x.fileno()], [], [], 0.02)

    def handle(self, event):
        try:
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
        except xerror.XError:
            pass  # a window that went while we looked

    def mapped(self, window):
        if window.id in self.shown:
            return
        self.shown.add(window.id)
        kind = self.kind(window)
        if kind == "splash" and self.splash is None:
            geometry, at = window.get_geometry(), self.root.translate_coords(window, 0, 0)
            self.splash = {"window": window, "t": self.now(), "gone": None, "alphas": [],
                           "rect": [at.x, at.y, geometry.width, geometry.height]}
            self.read_opacity(window)
        elif kind == "dialog":
            title = window.get_full_property(self.title, X.AnyPropertyType)
            self.dialogs.append({"window": window, "t": self.now(), "caption": title.value.decode() if title else None,
                                 "splash": self.splash is not None and self.splash["gone"] is None, "focus": False})
            self.pending.append((self.dialogs[-1], time.monotonic() + 0.3))

    def read_opacity(self, window):
        if self.splash and window == self.splash["window"]:
            value = window.get_full_property(self.opacity, Xatom.CARDINAL)
            if value and (not self.splash["alphas"] or self.splash["alphas"][-1] != value.value[0] >> 24):
                self.splash["alphas"].append(value.value[0] >> 24)

    def dismiss(self, dialog):
        """Return, typed on the keyboard: it reaches the dialog only when the dialog took the focus.
        (One dialog after another may well get the same window id.)"""
        window = dialog["window"]
        for _ in range(40):
            focus = self.x.get_input_focus().focus
            dialog["focus"] = focus == window
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
        if self.splash:
            self.splash.pop("window")
        return self.splash, [{k: v for k, v in d.items() if k != "window"} for d in self.dialogs]
