// The splash's baseline: one borderless window of the given size, centred, mapped through Xlib
// with the same window type, Motif hints and opacity as the launcher's splash; then the program ends.
//   baseline_window WIDTH HEIGHT
#include <X11/Xatom.h>
#include <X11/Xlib.h>
#include <stdlib.h>

int main(int argc, char** argv) {
    if (argc < 3) return 2;
    int width = atoi(argv[1]), height = atoi(argv[2]);
    Display* display = XOpenDisplay(NULL);
    if (display == NULL) return 1;
    int screen = DefaultScreen(display);
    Window window = XCreateSimpleWindow(display, RootWindow(display, screen),
                                        (DisplayWidth(display, screen) - width) / 2,
                                        (DisplayHeight(display, screen) - height) / 2, width, height, 0, 0,
                                        BlackPixel(display, screen));
    Atom type = XInternAtom(display, "_NET_WM_WINDOW_TYPE_SPLASH", False);
    XChangeProperty(display, window, XInternAtom(display, "_NET_WM_WINDOW_TYPE", False), XA_ATOM, 32,
                    PropModeReplace, (unsigned char*)&type, 1);
    long motif[5] = {2, 0, 0, 0, 0};
    Atom motifAtom = XInternAtom(display, "_MOTIF_WM_HINTS", False);
    XChangeProperty(display, window, motifAtom, motifAtom, 32, PropModeReplace, (unsigned char*)motif, 5);
    unsigned long opacity = 64ul * 0x01010101ul;
    XChangeProperty(display, window, XInternAtom(display, "_NET_WM_WINDOW_OPACITY", False), XA_CARDINAL, 32,
                    PropModeReplace, (unsigned char*)&opacity, 1);
    XMapWindow(display, window);
    XSync(display, False);
    XCloseDisplay(display);
    return 0;
}
