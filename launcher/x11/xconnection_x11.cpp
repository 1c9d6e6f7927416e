// The launcher's own Xlib connections and the process-wide handlers that keep their errors quiet.
#include "xconnection_x11.h"

#include <dlfcn.h>
#include <pthread.h>
#include <stdlib.h>

#include <atomic>

XlibEntries gXlib;

namespace {

pthread_once_t gXlibOnce = PTHREAD_ONCE_INIT;
bool gXlibLoaded = false;

// The library stays loaded for the life of the process (the Java toolkit may load it too).
void ResolveXlib() {
    const char* display = getenv("DISPLAY");
    if (display == nullptr || display[0] == 0) return;
    void* library = dlopen("libX11.so.6", RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) return;
#define LAUNCHER_XLIB_RESOLVE(name)                                                    \
    gXlib.name = reinterpret_cast<decltype(gXlib.name)>(dlsym(library, #name));          \
    if (gXlib.name == nullptr) return;
    LAUNCHER_XLIB_ENTRIES(LAUNCHER_XLIB_RESOLVE)
#undef LAUNCHER_XLIB_RESOLVE
    gXlib.XInitThreads();  // before any other Xlib call: the splash thread and the main thread both use Xlib
    gXlibLoaded = true;
}

// The connections open at once: the splash's, the window search's and the dialog's, and one to spare.
const int kSlots = 4;
std::atomic<XConnection*> gConnections[kSlots];
XErrorHandler gPreviousErrorHandler = nullptr;
XIOErrorHandler gPreviousIoHandler = nullptr;

XConnection* Ours(Display* display) {
    for (std::atomic<XConnection*>& slot : gConnections) {
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
    return gPreviousErrorHandler != nullptr ? gPreviousErrorHandler(display, error) : 0;
}

// A lost connection must not end the process. Xlib first calls the process-wide I/O error handler
// (its default one exits), then the connection's own exit handler (its default one exits too); ours
// both return for our connections, so Xlib gives up on them quietly.
int QuietIoError(Display* display) {
    XConnection* connection = Ours(display);
    if (connection == nullptr) return gPreviousIoHandler != nullptr ? gPreviousIoHandler(display) : 0;
    connection->lost = true;
    return 0;
}
void RecordIoError(Display*, void* connection) { static_cast<XConnection*>(connection)->lost = true; }

}  // namespace

bool LoadXlib() {
    pthread_once(&gXlibOnce, ResolveXlib);
    return gXlibLoaded;
}

bool OpenXConnection(XConnection* connection) {
    connection->failed = connection->lost = false;
    connection->display = nullptr;
    if (!LoadXlib()) return false;
    connection->display = gXlib.XOpenDisplay(nullptr);
    if (connection->display == nullptr) return false;
    for (std::atomic<XConnection*>& slot : gConnections) {
        XConnection* empty = nullptr;
        if (slot.compare_exchange_strong(empty, connection)) break;
    }
    gXlib.XSetIOErrorExitHandler(connection->display, RecordIoError, connection);
    XErrorHandler previous = gXlib.XSetErrorHandler(RecordXError);
    if (previous != RecordXError) gPreviousErrorHandler = previous;
    XIOErrorHandler previousIo = gXlib.XSetIOErrorHandler(QuietIoError);
    if (previousIo != QuietIoError) gPreviousIoHandler = previousIo;
    return true;
}

void CloseXConnection(XConnection* connection) {
    if (connection->display == nullptr) return;
    gXlib.XCloseDisplay(connection->display);
    for (std::atomic<XConnection*>& slot : gConnections) {
        XConnection* self = connection;
        slot.compare_exchange_strong(self, nullptr);
    }
    connection->display = nullptr;
}
