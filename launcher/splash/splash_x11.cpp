// The splash window under X11: the linked-in picture in a borderless window of exactly its size,
// centred, fading in from opacity 64 to 252 through _NET_WM_WINDOW_OPACITY (a compositor shows
// the fade; without one the picture simply shows opaque), closed by its display time or by
// SplashClose, whichever comes first.
//
// Threads: SplashStart and SplashClose run on the main thread; the splash thread owns its own
// Display connection, the window and the event loop, so no Xlib object is ever shared. The two
// threads meet only in gState (who gets to decide about the window) and the wake-up pipe, which
// the main thread creates before the thread and closes only after joining it.
//
// Every failure is silent: no display, a picture the reader rejects, a visual we cannot fill or any
// X error means no splash, and the launch goes on.
#include "splash.h"
#include "splash_platform.h"

#include "../x11/xconnection_x11.h"

#include <X11/Xatom.h>
#include <X11/Xlib.h>
#include <X11/Xutil.h>
#include <fcntl.h>
#include <poll.h>
#include <sys/mman.h>

#include <atomic>
#include <pthread.h>
#include <time.h>
#include <unistd.h>

namespace {

// The splash's life as both threads see it. Only two moves are contested: the splash thread
// takes kPreparing to kShowing just before it maps the window, SplashClose takes kPreparing to
// kCancelled; whichever comes first wins, so a window is either never shown or reachable.
enum : int { kPreparing = 1, kShowing = 2, kCancelled = 3, kEnded = 4 };
std::atomic<int> gState(0);

// Main thread only.
bool gThreadStarted = false;
pthread_t gThread;
int gWakePipe[2] = {-1, -1};
SplashParams gParams;  // written before the thread starts, read-only afterwards

XConnection gConnection;  // the splash thread's own
int gFadeAlpha = kSplashFirstAlpha;  // never reset: one splash per process

// Any error of the splash's own connection, or its loss, ends the splash quietly.
bool XFailed() { return gConnection.failed || gConnection.lost; }

int64_t NowMs() {
    timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<int64_t>(now.tv_sec) * 1000 + now.tv_nsec / 1000000;
}

void SetOpacity(Display* display, Window window, Atom opacity, int alpha) {
    unsigned long value = static_cast<unsigned long>(alpha) * 0x01010101ul;
    gXlib.XChangeProperty(display, window, opacity, XA_CARDINAL, 32, PropModeReplace,
                         reinterpret_cast<unsigned char*>(&value), 1);
}

// The splash is drawn only on TrueColor screens with 8-bit red, green and blue in 32-bit pixels
// (depth 24 or 32), which is what every current X server offers; on anything else there is none.
bool UsableVisual(Display* display) {
    Visual* visual = DefaultVisual(display, DefaultScreen(display));
    int depth = DefaultDepth(display, DefaultScreen(display));
    return visual->c_class == TrueColor && (depth == 24 || depth == 32) && visual->red_mask == 0xFF0000ul &&
           visual->green_mask == 0xFF00ul && visual->blue_mask == 0xFFul;
}

// The picture as an XImage in the default visual's pixel layout, or null: then the window shows
// black, as a picture the reader cannot draw leaves the Windows splash undrawn.
//
// The pixels are mapped rather than taken with malloc: fresh pages are otherwise faulted in one by
// one as the decoder first writes them, which costs about 10 us a page in a virtual machine (141
// pages for our picture, 1.3 ms of the splash's start measured); MAP_POPULATE takes them in one call.
XImage* MakeSplashImage(Display* display, const uint8_t* data, size_t size, const SplashBitmapInfo& info) {
    Visual* visual = DefaultVisual(display, DefaultScreen(display));
    int depth = DefaultDepth(display, DefaultScreen(display));
    size_t count = static_cast<size_t>(info.width) * static_cast<size_t>(info.height);
    size_t bytes = count * sizeof(uint32_t);
    void* mapped = mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_POPULATE, -1, 0);
    if (mapped == MAP_FAILED) return nullptr;
    uint32_t* pixels = static_cast<uint32_t*>(mapped);
    XImage* image = nullptr;
    if (DecodeSplashPixels(data, size, info, pixels)) {
        if (depth == 32) {
            for (size_t i = 0; i < count; ++i) pixels[i] |= 0xFF000000u;  // opaque in an alpha visual
        }
        image = gXlib.XCreateImage(display, visual, static_cast<unsigned>(depth), ZPixmap, 0, static_cast<char*>(mapped),
                                  static_cast<unsigned>(info.width), static_cast<unsigned>(info.height), 32, 0);
    }
    if (image == nullptr || image->bits_per_pixel != 32) {
        if (image != nullptr) {
            image->data = nullptr;  // ours to unmap, not Xlib's to free
            XDestroyImage(image);
        }
        munmap(mapped, bytes);
        return nullptr;
    }
    // The pixels are host-order words; XPutImage swaps them when the server's order differs.
    const uint32_t one = 1;
    image->byte_order = *reinterpret_cast<const uint8_t*>(&one) == 1 ? LSBFirst : MSBFirst;
    return image;
}

void DestroySplashImage(XImage* image) {
    munmap(image->data, static_cast<size_t>(image->bytes_per_line) * static_cast<size_t>(image->height));
    image->data = nullptr;
    XDestroyImage(image);
}

// The window, managed by the window manager as a splash rather than override-redirect: an
// override-redirect window stays above the frames mapped after it and never takes part in the
// stacking order, whereas the splash is "not topmost" and must let the application's frame come
// above it. The splash window type plus the Motif "no decorations" hint gives a borderless
// window that is not focused under EWMH window managers (openbox among them); the position hints
// keep it where we centred it; without any window manager the same window simply appears there.
// Its opacity is 64 before it is ever mapped; `opacity` receives that property's atom.
//
// Every request here is only queued, except the one round trip for all the atoms: it also brings
// back any error of the window's creation before the caller decides to map it.
Window CreateSplashWindow(Display* display, const SplashParams& params, const SplashBitmapInfo& info,
                          Atom* opacity) {
    int screen = DefaultScreen(display);
    int x;
    int y;
    if (params.centerOnScreen != 0) {
        x = (DisplayWidth(display, screen) - info.width) / 2;
        y = (DisplayHeight(display, screen) - info.height) / 2;
    } else {
        x = params.centerX - info.width / 2;
        y = params.centerY - info.height / 2;
    }
    XSetWindowAttributes attributes;
    attributes.event_mask = ExposureMask;
    Window window = gXlib.XCreateWindow(display, RootWindow(display, screen), x, y, static_cast<unsigned>(info.width),
                                       static_cast<unsigned>(info.height), 0, CopyFromParent, InputOutput,
                                       CopyFromParent, CWEventMask, &attributes);

    XSizeHints size;
    size.flags = USPosition | PPosition | PMinSize | PMaxSize;
    size.x = x;
    size.y = y;
    size.min_width = size.max_width = info.width;
    size.min_height = size.max_height = info.height;
    gXlib.XSetWMNormalHints(display, window, &size);
    XWMHints hints;
    hints.flags = InputHint;
    hints.input = False;  // never takes the keyboard
    gXlib.XSetWMHints(display, window, &hints);

    enum { kType, kSplash, kState, kSkipTaskbar, kSkipPager, kMotif, kOpacity, kAtoms };
    static const char* const kNames[kAtoms] = {"_NET_WM_WINDOW_TYPE", "_NET_WM_WINDOW_TYPE_SPLASH", "_NET_WM_STATE",
                                               "_NET_WM_STATE_SKIP_TASKBAR", "_NET_WM_STATE_SKIP_PAGER",
                                               "_MOTIF_WM_HINTS", "_NET_WM_WINDOW_OPACITY"};
    Atom atoms[kAtoms] = {};
    gXlib.XInternAtoms(display, const_cast<char**>(kNames), kAtoms, False, atoms);
    gXlib.XChangeProperty(display, window, atoms[kType], XA_ATOM, 32, PropModeReplace,
                         reinterpret_cast<unsigned char*>(&atoms[kSplash]), 1);
    gXlib.XChangeProperty(display, window, atoms[kState], XA_ATOM, 32, PropModeReplace,
                         reinterpret_cast<unsigned char*>(&atoms[kSkipTaskbar]), 2);
    long motif[5] = {2, 0, 0, 0, 0};  // flags: decorations given; decorations: none
    gXlib.XChangeProperty(display, window, atoms[kMotif], atoms[kMotif], 32, PropModeReplace,
                         reinterpret_cast<unsigned char*>(motif), 5);
    *opacity = atoms[kOpacity];
    SetOpacity(display, window, *opacity, SplashFadeNext(&gFadeAlpha));
    return window;
}

// Shows the window until its time is up, the wake-up pipe is written or the connection fails.
void RunSplashLoop(Display* display, Window window, XImage* image, Atom opacity, int64_t closeAt) {
    GC gc = gXlib.XCreateGC(display, window, 0, nullptr);
    int64_t nextFade = NowMs() + kSplashFadeIntervalMs;
    bool fading = true;
    for (;;) {
        int64_t now = NowMs();
        if (now >= closeAt) break;
        if (fading && now >= nextFade) {
            int alpha = SplashFadeNext(&gFadeAlpha);
            if (alpha < 0) fading = false;
            else SetOpacity(display, window, opacity, alpha);
            nextFade = now + kSplashFadeIntervalMs;
        }
        while (!XFailed() && gXlib.XPending(display) > 0) {  // XPending also sends what is queued
            XEvent event;
            gXlib.XNextEvent(display, &event);
            if (event.type == Expose && image != nullptr) {
                gXlib.XPutImage(display, window, gc, image, event.xexpose.x, event.xexpose.y, event.xexpose.x,
                               event.xexpose.y, static_cast<unsigned>(event.xexpose.width),
                               static_cast<unsigned>(event.xexpose.height));
            }
        }
        gXlib.XFlush(display);
        if (XFailed()) break;
        int64_t wakeAt = fading && nextFade < closeAt ? nextFade : closeAt;
        pollfd fds[2] = {{ConnectionNumber(display), POLLIN, 0}, {gWakePipe[0], POLLIN, 0}};
        int timeout = static_cast<int>(wakeAt - NowMs());
        if (poll(fds, 2, timeout < 0 ? 0 : timeout) > 0 && fds[1].revents != 0) break;
    }
    gXlib.XFreeGC(display, gc);
}

// The splash thread's work from the picture to the destroyed window.
void ShowSplash(const SplashParams& params) {
    const uint8_t* data = nullptr;
    size_t size = 0;
    SplashBitmapInfo info;
    if (!FindLinkedSplashPicture(params.resourceName, &data, &size) || !ReadSplashBitmap(data, size, &info)) return;
    if (info.width <= 0 || info.height <= 0 || info.width > 32767 || info.height > 32767) return;

    if (!OpenXConnection(&gConnection)) return;
    Display* display = gConnection.display;
    if (!UsableVisual(display)) {
        CloseXConnection(&gConnection);
        return;
    }

    // The window goes up as soon as it exists; the picture is decoded afterwards and drawn by the
    // first Expose. Until then the window shows nothing of its own (no background), as the Windows
    // splash shows nothing before its first paint.
    Atom opacity = None;
    Window window = CreateSplashWindow(display, params, info, &opacity);

    // The display time counts from here, fade included.
    int64_t closeAt = NowMs() + params.displayMs;
    int expected = kPreparing;
    if (!XFailed() && gState.compare_exchange_strong(expected, kShowing)) {
        // Waits until the server has mapped it: decoding at once would take a processor from the
        // server while the VM loads on the other one.
        gXlib.XMapWindow(display, window);
        gXlib.XSync(display, False);
        XImage* image = MakeSplashImage(display, data, size, info);
        if (image == nullptr) {  // a picture the reader cannot draw: a black window
            gXlib.XSetWindowBackground(display, window, BlackPixel(display, DefaultScreen(display)));
            gXlib.XClearWindow(display, window);
        }
        RunSplashLoop(display, window, image, opacity, closeAt);
        gXlib.XUnmapWindow(display, window);
        if (image != nullptr) DestroySplashImage(image);
    }
    gXlib.XDestroyWindow(display, window);
    gXlib.XSync(display, False);
    CloseXConnection(&gConnection);
}

void* SplashThreadProc(void*) {
    ShowSplash(gParams);
    gState = kEnded;
    return nullptr;
}

void JoinSplashThread() {
    pthread_join(gThread, nullptr);
    gThreadStarted = false;
    close(gWakePipe[0]);
    close(gWakePipe[1]);
    gWakePipe[0] = gWakePipe[1] = -1;
}

}  // namespace

void SplashStart(const SplashParams* params) {
    if (gState != 0) return;  // one splash per process
    // Without a display there is nothing to show: no thread, no gXlib. libX11 is loaded here, on the
    // main thread, rather than on the splash thread, where its loading could wait behind the VM's.
    if (!LoadXlib()) return;
    if (pipe2(gWakePipe, O_CLOEXEC | O_NONBLOCK) != 0) return;
    gParams = *params;
    gState = kPreparing;
    if (pthread_create(&gThread, nullptr, SplashThreadProc, nullptr) != 0) {
        gState = kEnded;
        close(gWakePipe[0]);
        close(gWakePipe[1]);
        return;
    }
    gThreadStarted = true;
    if (params->waitForClose != 0) JoinSplashThread();
}

void SplashClose() {
    if (!gThreadStarted) return;
    // Before the window is shown: it never will be, and the thread ends by itself. Nothing is
    // waited for, as the thread may still be opening its display.
    int state = kPreparing;
    if (gState.compare_exchange_strong(state, kCancelled)) return;
    if (state == kCancelled) return;
    // Shown or ended: wake the loop (it only ever waits in poll) and wait until the window is gone.
    if (state == kShowing) {
        char wake = 1;
        ssize_t written = write(gWakePipe[1], &wake, 1);
        (void)written;  // a full pipe already holds a wake-up
    }
    JoinSplashThread();
}
