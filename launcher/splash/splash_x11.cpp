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

#include "../core/xconnection_x11.h"

#include <X11/Xatom.h>
#include <X11/Xlib.h>
#include <X11/Xutil.h>
#include <fcntl.h>
#include <poll.h>

#include <atomic>
#include <pthread.h>
#include <stdlib.h>
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
    Xlib.XChangeProperty(display, window, opacity, XA_CARDINAL, 32, PropModeReplace,
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
XImage* MakeSplashImage(Display* display, const uint8_t* data, size_t size, const SplashBitmapInfo& info) {
    Visual* visual = DefaultVisual(display, DefaultScreen(display));
    int depth = DefaultDepth(display, DefaultScreen(display));
    size_t count = static_cast<size_t>(info.width) * static_cast<size_t>(info.height);
    uint32_t* pixels = static_cast<uint32_t*>(malloc(count * sizeof(uint32_t)));
    if (pixels == nullptr) return nullptr;
    if (!DecodeSplashPixels(data, size, info, pixels)) {
        free(pixels);
        return nullptr;
    }
    if (depth == 32) {
        for (size_t i = 0; i < count; ++i) pixels[i] |= 0xFF000000u;  // opaque in an alpha visual
    }
    XImage* image = Xlib.XCreateImage(display, visual, static_cast<unsigned>(depth), ZPixmap, 0,
                                      reinterpret_cast<char*>(pixels), static_cast<unsigned>(info.width),
                                      static_cast<unsigned>(info.height), 32, 0);
    if (image == nullptr || image->bits_per_pixel != 32) {
        if (image != nullptr) XDestroyImage(image);  // frees the pixels too
        else free(pixels);
        return nullptr;
    }
    // The pixels are host-order words; XPutImage swaps them when the server's order differs.
    const uint32_t one = 1;
    image->byte_order = *reinterpret_cast<const uint8_t*>(&one) == 1 ? LSBFirst : MSBFirst;
    return image;
}

// The window, managed by the window manager as a splash rather than override-redirect: an
// override-redirect window stays above the frames mapped after it and never takes part in the
// stacking order, whereas the splash is "not topmost" and must let the application's frame come
// above it. The splash window type plus the Motif "no decorations" hint gives a borderless
// window that is not focused under EWMH window managers (openbox among them); the position hints
// keep it where we centred it; without any window manager the same window simply appears there.
Window CreateSplashWindow(Display* display, const SplashParams& params, const SplashBitmapInfo& info,
                          bool drawn) {
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
    attributes.background_pixel = BlackPixel(display, screen);
    attributes.event_mask = ExposureMask;
    Window window = Xlib.XCreateWindow(display, RootWindow(display, screen), x, y, static_cast<unsigned>(info.width),
                                       static_cast<unsigned>(info.height), 0, CopyFromParent, InputOutput,
                                       CopyFromParent, CWEventMask | (drawn ? 0 : CWBackPixel), &attributes);

    XSizeHints size;
    size.flags = USPosition | PPosition | PMinSize | PMaxSize;
    size.x = x;
    size.y = y;
    size.min_width = size.max_width = info.width;
    size.min_height = size.max_height = info.height;
    Xlib.XSetWMNormalHints(display, window, &size);
    XWMHints hints;
    hints.flags = InputHint;
    hints.input = False;  // never takes the keyboard
    Xlib.XSetWMHints(display, window, &hints);

    Atom atom = Xlib.XInternAtom(display, "_NET_WM_WINDOW_TYPE_SPLASH", False);
    Xlib.XChangeProperty(display, window, Xlib.XInternAtom(display, "_NET_WM_WINDOW_TYPE", False), XA_ATOM, 32,
                         PropModeReplace, reinterpret_cast<unsigned char*>(&atom), 1);
    Atom states[2] = {Xlib.XInternAtom(display, "_NET_WM_STATE_SKIP_TASKBAR", False),
                      Xlib.XInternAtom(display, "_NET_WM_STATE_SKIP_PAGER", False)};
    Xlib.XChangeProperty(display, window, Xlib.XInternAtom(display, "_NET_WM_STATE", False), XA_ATOM, 32,
                         PropModeReplace, reinterpret_cast<unsigned char*>(states), 2);
    long motif[5] = {2, 0, 0, 0, 0};  // flags: decorations given; decorations: none
    Atom motifAtom = Xlib.XInternAtom(display, "_MOTIF_WM_HINTS", False);
    Xlib.XChangeProperty(display, window, motifAtom, motifAtom, 32, PropModeReplace,
                         reinterpret_cast<unsigned char*>(motif), 5);
    return window;
}

// Shows the window until its time is up, the wake-up pipe is written or the connection fails.
void RunSplashLoop(Display* display, Window window, XImage* image, Atom opacity, int64_t closeAt) {
    GC gc = Xlib.XCreateGC(display, window, 0, nullptr);
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
        while (!XFailed() && Xlib.XPending(display) > 0) {  // XPending also sends what is queued
            XEvent event;
            Xlib.XNextEvent(display, &event);
            if (event.type == Expose && image != nullptr) {
                Xlib.XPutImage(display, window, gc, image, event.xexpose.x, event.xexpose.y, event.xexpose.x,
                               event.xexpose.y, static_cast<unsigned>(event.xexpose.width),
                               static_cast<unsigned>(event.xexpose.height));
            }
        }
        Xlib.XFlush(display);
        if (XFailed()) break;
        int64_t wakeAt = fading && nextFade < closeAt ? nextFade : closeAt;
        pollfd fds[2] = {{ConnectionNumber(display), POLLIN, 0}, {gWakePipe[0], POLLIN, 0}};
        int timeout = static_cast<int>(wakeAt - NowMs());
        if (poll(fds, 2, timeout < 0 ? 0 : timeout) > 0 && fds[1].revents != 0) break;
    }
    Xlib.XFreeGC(display, gc);
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

    XImage* image = MakeSplashImage(display, data, size, info);
    Window window = CreateSplashWindow(display, params, info, image != nullptr);
    Atom opacity = Xlib.XInternAtom(display, "_NET_WM_WINDOW_OPACITY", False);
    SetOpacity(display, window, opacity, SplashFadeNext(&gFadeAlpha));  // 64 before it ever shows
    Xlib.XSync(display, False);

    // The display time counts from here, fade included.
    int64_t closeAt = NowMs() + params.displayMs;
    int expected = kPreparing;
    if (!XFailed() && gState.compare_exchange_strong(expected, kShowing)) {
        Xlib.XMapWindow(display, window);
        RunSplashLoop(display, window, image, opacity, closeAt);
        Xlib.XUnmapWindow(display, window);
    }
    Xlib.XDestroyWindow(display, window);
    Xlib.XSync(display, False);
    if (image != nullptr) XDestroyImage(image);
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
    // Without a display there is nothing to show: no thread, no Xlib. libX11 is loaded here, on the
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
