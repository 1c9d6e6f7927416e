// One Xlib connection of the launcher's own (the splash thread's, the window search's, the error
// dialog's), whose errors must never end the process. X11 files only.
//
// Xlib has one error handler and one I/O error handler for the whole process, and the Java toolkit
// sets its own too. The handlers installed here claim only the errors of connections opened through
// OpenXConnection and hand every other one to the handler they replaced. Each connection is used by
// one thread; several may be open at once on different threads.
#ifndef LAUNCHER_CORE_XCONNECTION_X11_H
#define LAUNCHER_CORE_XCONNECTION_X11_H

#include <X11/Xlib.h>

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
