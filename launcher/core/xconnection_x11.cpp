// The launcher's own Xlib connections and the process-wide handlers that keep their errors quiet.
#include "xconnection_x11.h"

#include <dlfcn.h>
#include <pthread.h>
#include <stdlib.h>

#include <atomic>

XlibEntries Xlib;

namespace {

pthread_once_t xlibOnce = PTHREAD_ONCE_INIT;
bool xlibLoaded = false;

// The library stays loaded for the life of the process (the Java toolkit may load it too).
void ResolveXlib() {
    const char* display = getenv("DISPLAY");
    if (display == nullptr || display[0] == 0) return;
    void* library = dlopen("libX11.so.6", RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) return;
#define LAUNCHER_XLIB_RESOLVE(name)                                                    \
    Xlib.name = reinterpret_cast<decltype(Xlib.name)>(dlsym(library, #name));          \
    if (Xlib.name == nullptr) return;
    LAUNCHER_XLIB_ENTRIES(LAUNCHER_XLIB_RESOLVE)
#undef LAUNCHER_XLIB_RESOLVE
    Xlib.XInitThreads();  // before any other Xlib call: the splash thread and the main thread both use Xlib
    xlibLoaded = true;
}

// The connections open at once: the splash's, the window search's and the dialog's, and one to spare.
const int kSlots = 4;
std::atomic<XConnection*> connections[kSlots];
XErrorHandler previousErrorHandler = nullptr;
XIOErrorHandler previousIoHandler = nullptr;

XConnection* Ours(Display* display) {
    for (std::atomic<XConnection*>& slot : connections) {
        XConnection* connection = slot.load();
        if (connection != nullptr && connection->display == display) return connection;
    }
    return nullptr;
}

int RecordXError(Display* display, XErrorEvent* error) {
    if (XConnection* connection = Ours(display)) {
        connection->failed = true;
        return 0;
    }
    return previousErrorHandler != nullptr ? previousErrorHandler(display, error) : 0;
}

// A lost connection must not end the process. Xlib first calls the process-wide I/O error handler
// (its default one exits), then the connection's own exit handler (its default one exits too); ours
// both return for our connections, so Xlib gives up on them quietly.
int QuietIoError(Display* display) {
    XConnection* connection = Ours(display);
    if (connection == nullptr) return previousIoHandler != nullptr ? previousIoHandler(display) : 0;
    connection->lost = true;
    return 0;
}
void RecordIoError(Display*, void* connection) { static_cast<XConnection*>(connection)->lost = true; }

}  // namespace

bool LoadXlib() {
    pthread_once(&xlibOnce, ResolveXlib);
    return xlibLoaded;
}

bool OpenXConnection(XConnection* connection) {
    connection->failed = connection->lost = false;
    connection->display = nullptr;
    if (!LoadXlib()) return false;
    connection->display = Xlib.XOpenDisplay(nullptr);
    if (connection->display == nullptr) return false;
    for (std::atomic<XConnection*>& slot : connections) {
        XConnection* empty = nullptr;
        if (slot.compare_exchange_strong(empty, connection)) break;
    }
    Xlib.XSetIOErrorExitHandler(connection->display, RecordIoError, connection);
    XErrorHandler previous = Xlib.XSetErrorHandler(RecordXError);
    if (previous != RecordXError) previousErrorHandler = previous;
    XIOErrorHandler previousIo = Xlib.XSetIOErrorHandler(QuietIoError);
    if (previousIo != QuietIoError) previousIoHandler = previousIo;
    return true;
}

void CloseXConnection(XConnection* connection) {
    if (connection->display == nullptr) return;
    Xlib.XCloseDisplay(connection->display);
    for (std::atomic<XConnection*>& slot : connections) {
        XConnection* self = connection;
        slot.compare_exchange_strong(self, nullptr);
    }
    connection->display = nullptr;
}
