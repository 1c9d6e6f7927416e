# What a user sees of the Linux launcher on an X display: a private Xvfb with a window manager
# (openbox) and a compositor, and a watcher that records, during one run, the splash window (its
# rectangle, the opacities it shows, when it came and went) and every dialog (its caption, whether it
# had the keyboard focus and the splash was still up), dismissing each with a real key press.
import os
import select
import subprocess
import threading
import time

from Xlib import X, Xatom, Xutil, display as xdisplay, error as xerror
from Xlib.ext import xtest


def connect(name):
    for attempt in range(50):  # a new server can refuse its first connections for a moment (seen rarely)
        try:
            x = xdisplay.Display(name)
            break
        except (xerror.DisplayError, OSError):
            if attempt == 49:
                raise
            time.sleep(0.1)
    x.set_error_handler(lambda *a: None)  # windows come and go while we look
    return x, x.intern_atom, x.screen().root


class Display:
    def __init__(self):
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
        for proc in reversed(self.procs):
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

