// Activation of the running application's frame under X11: the second instance walks the window
// manager's client list (or, with no window manager, the root's children) and restores and raises
// every window that passes the tests of the Windows search, in the same order: not withdrawn, a
// title, the byte-wise title test, a class, the class test.
//
// Main thread only, on a connection of its own that is closed before returning. Nothing here may
// stall the second instance: a window that vanishes mid-walk only fails its own tests, a lost
// connection ends the walk, and a display that does not answer at all (a stopped server, a remote
// one gone quiet) gets two seconds in all, after which the hand-off goes on without the walk.
#include "instance.h"
#include "instance_platform.h"

#include "../text/text.h"
#include "../x11/xconnection_x11.h"

#include <X11/Xatom.h>
#include <X11/Xlib.h>
#include <X11/Xutil.h>
#include <errno.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

namespace {

const size_t kClassUnits = 1024;  // the most of a class name that is compared
const int kActivationChecks = 25;
const useconds_t kActivationCheckUs = 10000;
const int kActivationLimitMs = 2000;  // the whole walk, connecting to the display included

// The first 32-bit item of property `name` of type `type` (both by name), or 0.
long FirstItem(Display* display, Window window, const char* name, const char* type) {
    Atom actualType = None;
    int format = 0;
    unsigned long count = 0;
    unsigned long after = 0;
    unsigned char* data = nullptr;
    long item = 0;
    if (gXlib.XGetWindowProperty(display, window, gXlib.XInternAtom(display, name, False), 0, 1, False,
                                gXlib.XInternAtom(display, type, False), &actualType, &format, &count, &after,
                                &data) == Success &&
        format == 32 && count > 0) {
        item = reinterpret_cast<long*>(data)[0];
    }
    if (data != nullptr) gXlib.XFree(data);
    return item;
}

// Text property `name` of `window` as a heap copy in UTF-16, or null. Xlib's converter takes
// UTF8_STRING, STRING (Latin-1, as Java writes WM_NAME) and COMPOUND_TEXT alike.
char16_t* ReadText(Display* display, Window window, Atom name) {
    XTextProperty property;
    if (gXlib.XGetTextProperty(display, window, &property, name) == 0) return nullptr;
    char** list = nullptr;
    int count = 0;
    char16_t* text = nullptr;
    if (property.nitems > 0 && gXlib.Xutf8TextPropertyToTextList(display, &property, &list, &count) >= Success &&
        count > 0) {
        text = WideCopy(list[0]);
    }
    if (list != nullptr) gXlib.XFreeStringList(list);
    gXlib.XFree(property.value);
    return text;
}

// The window test, in the order of the Windows search, and for a window that passes its restoring
// and activation. `managed`: the window came from a window manager's client list.
void ActivateIfFrame(Display* display, Window root, Window window, bool managed) {
    long state = 0;
    if (managed) {  // WM_STATE 1 normal, 3 iconic; none or 0 is withdrawn (hidden)
        state = FirstItem(display, window, "WM_STATE", "WM_STATE");
        if (state != NormalState && state != IconicState) return;
    } else {
        XWindowAttributes attributes;
        if (gXlib.XGetWindowAttributes(display, window, &attributes) == 0 || attributes.map_state != IsViewable) return;
    }
    char16_t* title = ReadText(display, window, gXlib.XInternAtom(display, "_NET_WM_NAME", False));
    if (title == nullptr || title[0] == 0) {
        free(title);
        title = ReadText(display, window, XA_WM_NAME);
    }
    bool named = title != nullptr && title[0] != 0 && TitleHoldsInstanceName(title);
    free(title);
    if (!named) return;

    XClassHint hint = {nullptr, nullptr};
    if (gXlib.XGetClassHint(display, window, &hint) == 0) return;
    char16_t className[kClassUnits + 1];
    size_t n = 0;
    for (const char* c = hint.res_class; c != nullptr && *c != 0 && n < kClassUnits; ++c) {
        className[n++] = static_cast<unsigned char>(*c);  // ICCCM's Latin-1, byte by byte
    }
    className[n] = 0;
    gXlib.XFree(hint.res_name);
    gXlib.XFree(hint.res_class);
    if (n == 0 || !IsFrameClassName(className, true)) return;

    if (!managed) {
        gXlib.XMapRaised(display, window);
        gXlib.XSetInputFocus(display, window, RevertToParent, CurrentTime);
        return;
    }
    // Mapping an iconic client window asks the window manager for the normal state (ICCCM 4.1.4);
    // the activation request then deiconifies it too under managers that want it that way.
    if (state == IconicState) gXlib.XMapWindow(display, window);
    XEvent event = {};
    event.xclient.type = ClientMessage;
    event.xclient.window = window;
    event.xclient.message_type = gXlib.XInternAtom(display, "_NET_ACTIVE_WINDOW", False);
    event.xclient.format = 32;
    event.xclient.data.l[0] = 2;  // source: a pager, i.e. at the user's request; window managers honour it
    event.xclient.data.l[1] = CurrentTime;
    gXlib.XSendEvent(display, root, False, SubstructureRedirectMask | SubstructureNotifyMask, &event);
    // Wait (a little, never for good) until the manager has made it the active window, so that the
    // next window's activation cannot overtake this one and the last one really ends in front.
    for (int i = 0; i < kActivationChecks; ++i) {
        if (static_cast<Window>(FirstItem(display, root, "_NET_ACTIVE_WINDOW", "WINDOW")) == window) break;
        usleep(kActivationCheckUs);
    }
}

int64_t NowMs() {
    timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<int64_t>(now.tv_sec) * 1000 + now.tv_nsec / 1000000;
}

// The walk itself, unbounded: Xlib waits for the display without a time-out, in XOpenDisplay and
// in every round trip after it.
void ActivateOnDisplay() {
    // Errors of our own requests (a window that went away mid-walk: BadWindow) only make that
    // window fail its test; a lost connection ends the walk.
    XConnection connection;
    if (!OpenXConnection(&connection)) return;
    Display* display = connection.display;

    // The window manager's client list when a live EWMH manager (its check window names itself)
    // keeps one; otherwise the root's children, stacked bottom to top.
    Window root = DefaultRootWindow(display);
    Window check = static_cast<Window>(FirstItem(display, root, "_NET_SUPPORTING_WM_CHECK", "WINDOW"));
    bool managed = check != None &&
                   static_cast<Window>(FirstItem(display, check, "_NET_SUPPORTING_WM_CHECK", "WINDOW")) == check;
    Atom type = None;
    int format = 0;
    unsigned long count = 0;
    unsigned long after = 0;
    unsigned char* list = nullptr;
    if (managed && (gXlib.XGetWindowProperty(display, root, gXlib.XInternAtom(display, "_NET_CLIENT_LIST", False), 0,
                                            1 << 16, False, XA_WINDOW, &type, &format, &count, &after,
                                            &list) != Success ||
                    format != 32)) {
        managed = false;
    }
    Window* windows = reinterpret_cast<Window*>(list);
    Window* children = nullptr;
    if (!managed) {
        Window parent = None;
        unsigned int n = 0;
        count = gXlib.XQueryTree(display, root, &root, &parent, &children, &n) != 0 ? n : 0;
        windows = children;
    }
    for (unsigned long i = 0; i < count && !connection.lost; ++i) {
        ActivateIfFrame(display, root, windows[i], managed);
        gXlib.XSync(display, False);  // a vanished window's late errors arrive here, not with the next one
    }
    if (list != nullptr) gXlib.XFree(list);
    if (children != nullptr) gXlib.XFree(children);
    gXlib.XSync(display, False);
    CloseXConnection(&connection);
}

}  // namespace

// The walk runs in a child process, which is ended when it is not done in time: Xlib offers no
// time-out of its own, and a thread stuck inside it could not be stopped. The child's end closes its
// side of the pipe, which is what the wait looks for. A child whose parent is killed meanwhile goes
// with it rather than wait on the display for good. Without a display (none named, or no libX11)
// there is nothing to raise, and a headless second start starts no process.
void ActivateRunningInstances() {
    if (!LoadXlib()) return;
    int done[2];
    if (pipe2(done, O_CLOEXEC) != 0) return;
    pid_t parent = getpid();
    pid_t walker = fork();
    if (walker == 0) {
        close(done[0]);
        if (prctl(PR_SET_PDEATHSIG, SIGKILL) == 0 && getppid() == parent) ActivateOnDisplay();
        _exit(0);
    }
    close(done[1]);
    if (walker > 0) {
        int64_t deadline = NowMs() + kActivationLimitMs;
        pollfd end = {done[0], POLLIN, 0};
        for (int64_t left = kActivationLimitMs; left > 0; left = deadline - NowMs()) {
            if (poll(&end, 1, static_cast<int>(left)) >= 0 || errno != EINTR) break;
        }
        kill(walker, SIGKILL);
        while (waitpid(walker, nullptr, 0) < 0 && errno == EINTR) {
        }
    }
    close(done[0]);
}
