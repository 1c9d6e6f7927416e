// One Xlib connection of the launcher's own (the splash thread's, the window search's, the error
// dialog's), whose errors must never end the process. X11 files only.
//
// Xlib has one error handler and one I/O error handler for the whole process, and the Java toolkit
// sets its own too. The handlers installed here claim only the errors of connections opened through
// OpenXConnection and hand every other one to the handler they replaced. Each connection is used by
// one thread; several may be open at once on different threads.
//
// libX11 is not linked at load time: linking it brings five more libraries, which every start would
// pay for, headless starts and second instances included. It is loaded when a display is first
// wanted, and the X11 files call it through the gXlib table below.
#ifndef LAUNCHER_X11_XCONNECTION_X11_H
#define LAUNCHER_X11_XCONNECTION_X11_H

#include <X11/Xlib.h>
#include <X11/Xutil.h>

// Every Xlib function the X11 files call (macros such as DefaultScreen need no entry).
#define LAUNCHER_XLIB_ENTRIES(X)                                                                          \
    X(XChangeProperty) X(XClearWindow) X(XCloseDisplay) X(XCreateGC) X(XCreateImage) X(XCreateWindow)   \
    X(XDestroyWindow) X(XDrawRectangle) X(XDrawString16) X(XFlush) X(XFree) X(XFreeFont) X(XFreeGC)     \
    X(XFreeStringList) X(XGetClassHint) X(XGetTextProperty) X(XGetWindowAttributes)                     \
    X(XGetWindowProperty) X(XInitThreads) X(XInternAtom) X(XInternAtoms) X(XLoadQueryFont)              \
    X(XLookupKeysym) X(XMapRaised) X(XMapWindow) X(XNextEvent) X(XOpenDisplay) X(XPending) X(XPutImage) \
    X(XQueryTree) X(XSendEvent) X(XSetClassHint) X(XSetErrorHandler) X(XSetFont) X(XSetForeground)      \
    X(XSetIOErrorExitHandler) X(XSetIOErrorHandler) X(XSetInputFocus) X(XSetWindowBackground)           \
    X(XSetWMHints) X(XSetWMNormalHints) X(XSetWMProtocols) X(XSync) X(XUnmapWindow)                       \
    X(Xutf8TextPropertyToTextList)

struct XlibEntries {
#define LAUNCHER_XLIB_MEMBER(name) decltype(&::name) name;
    LAUNCHER_XLIB_ENTRIES(LAUNCHER_XLIB_MEMBER)
#undef LAUNCHER_XLIB_MEMBER
};
// Filled once by LoadXlib; read-only afterwards.
extern XlibEntries gXlib;

// Loads libX11 and fills gXlib once per process, from whichever thread asks first, and makes Xlib
// thread-safe before any other Xlib call. False when there is no display to talk to ($DISPLAY unset
// or empty) or libX11 cannot be loaded whole. OpenXConnection calls it.
bool LoadXlib();

struct XConnection {
    Display* display;
    volatile bool failed;  // a request of ours failed (a window that went away, say)
    volatile bool lost;    // the connection itself is gone; Xlib has given up on it
};

// Opens the default display into `connection` and claims its errors. False when there is none.
bool OpenXConnection(XConnection* connection);
// Closes the connection (as far as it still exists) and forgets it.
void CloseXConnection(XConnection* connection);

#endif
