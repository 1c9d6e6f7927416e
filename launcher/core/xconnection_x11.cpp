// The launcher's own Xlib connections and the process-wide handlers that keep their errors quiet.
#include "xconnection_x11.h"

#include <atomic>

namespace {

// At most one connection per user at a time: the splash, the window search and the dialog.
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

bool OpenXConnection(XConnection* connection) {
    XInitThreads();  // before any other Xlib call: the splash thread and the main thread both use Xlib
    connection->failed = connection->lost = false;
    connection->display = XOpenDisplay(nullptr);
    if (connection->display == nullptr) return false;
    for (std::atomic<XConnection*>& slot : connections) {
        XConnection* empty = nullptr;
        if (slot.compare_exchange_strong(empty, connection)) break;
    }
    XSetIOErrorExitHandler(connection->display, RecordIoError, connection);
    XErrorHandler previous = XSetErrorHandler(RecordXError);
    if (previous != RecordXError) previousErrorHandler = previous;
    XIOErrorHandler previousIo = XSetIOErrorHandler(QuietIoError);
    if (previousIo != QuietIoError) previousIoHandler = previousIo;
    return true;
}

void CloseXConnection(XConnection* connection) {
    if (connection->display == nullptr) return;
    XCloseDisplay(connection->display);
    for (std::atomic<XConnection*>& slot : connections) {
        XConnection* self = connection;
        slot.compare_exchange_strong(self, nullptr);
    }
    connection->display = nullptr;
}
