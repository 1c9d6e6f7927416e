// Prints "map <CLOCK_MONOTONIC ns> <width> <height> <WM_CLASS class or ->" for every top-level window
// mapped on the display, after "ready" once it listens. The benchmark's stopwatch for windows appearing.
#include <X11/Xlib.h>
#include <X11/Xutil.h>
#include <stdio.h>
#include <time.h>

static int Ignore(Display* display, XErrorEvent* error) {  // a window gone before its class was read
    (void)display, (void)error;
    return 0;
}

int main(void) {
    Display* display = XOpenDisplay(NULL);
    if (display == NULL) return 1;
    XSetErrorHandler(Ignore);
    XSelectInput(display, DefaultRootWindow(display), SubstructureNotifyMask);
    XSync(display, False);
    printf("ready\n");
    fflush(stdout);
    Window ids[4096];
    int sizes[4096][2], count = 0;
    for (;;) {
        XEvent event;
        XNextEvent(display, &event);
        struct timespec now;
        clock_gettime(CLOCK_MONOTONIC, &now);
        if (event.type == CreateNotify) {
            int at = count++ % 4096;
            ids[at] = event.xcreatewindow.window;
            sizes[at][0] = event.xcreatewindow.width;
            sizes[at][1] = event.xcreatewindow.height;
        } else if (event.type == MapNotify) {
            int width = 0, height = 0;
            for (int i = 0; i < count && i < 4096; ++i) {
                if (ids[i] == event.xmap.window) width = sizes[i][0], height = sizes[i][1];
            }
            XClassHint hint = {NULL, NULL};
            XGetClassHint(display, event.xmap.window, &hint);
            printf("map %lld %d %d %s\n", (long long)now.tv_sec * 1000000000LL + now.tv_nsec, width, height,
                   hint.res_class ? hint.res_class : "-");
            fflush(stdout);
            XFree(hint.res_name);
            XFree(hint.res_class);
        }
    }
}
