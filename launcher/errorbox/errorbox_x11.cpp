// The error box where the display is X11 (the POSIX launcher): always one line on standard error
// ("caption: text"), and where there is a display also a small modal dialog of our own in plain Xlib
// (no toolkit to depend on): the caption as its title, the text wrapped into lines, and an OK button.
// Enter, Escape, a click on OK or the window manager's close button dismiss it; the launch waits for
// it, as it waits for a message box on Windows.
//
// Main thread only, on a connection of its own (the splash thread may be running on another).
// Nothing here may stall the launch for good: a lost connection ends the dialog at once.
#include "errorbox.h"

#include "../text/text.h"
#include "../x11/xconnection_x11.h"

#include <X11/Xatom.h>
#include <X11/Xlib.h>
#include <X11/Xutil.h>
#include <X11/keysym.h>
#include <poll.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

namespace {

enum { kMaxLineUnits = 60, kMaxLines = 40, kMargin = 16, kMinWidth = 320, kButtonWidth = 80, kButtonHeight = 26 };

struct DialogLine {
    const char16_t* start;
    int units;
};

XConnection gConnection;  // the dialog's own; main thread only

// The text as UTF-16 (narrow text is UTF-8 here; bytes that are not are shown as Latin-1).
char16_t* WidenText(const char* text) {
    char16_t* wide = WideCopy(text);
    if (wide != nullptr) return wide;
    size_t n = strlen(text);
    wide = static_cast<char16_t*>(malloc((n + 1) * sizeof(char16_t)));
    for (size_t i = 0; wide != nullptr && i <= n; ++i) wide[i] = static_cast<unsigned char>(text[i]);
    return wide;
}

// Breaks `text` at line ends, and at the last space before kMaxLineUnits (mid-word when there is
// none). Returns the number of lines, at most kMaxLines; the rest of a longer text is left out.
int WrapText(const char16_t* text, DialogLine* lines) {
    int count = 0;
    const char16_t* p = text;
    while (*p != 0 && count < kMaxLines) {
        int end = 0;
        int lastSpace = -1;
        while (p[end] != 0 && p[end] != u'\n' && end < kMaxLineUnits) {
            if (p[end] == u' ') lastSpace = end;
            ++end;
        }
        int next = end;
        if (p[end] == u'\n') ++next;
        else if (p[end] != 0 && lastSpace > 0) end = lastSpace, next = lastSpace + 1;
        if (end > 0 && p[end - 1] == u'\r') --end;
        lines[count].start = p;
        lines[count].units = end;
        ++count;
        p += next;
    }
    return count;
}

// Draws `units` characters as two-byte glyph indices: a Unicode font takes them all, a Latin-1
// font those below U+0100, anything else shows as '?'.
void DrawText16(Display* display, Window window, GC gc, const XFontStruct* font, int x, int y, const char16_t* text,
                int units) {
    XChar2b glyphs[kMaxLineUnits];
    if (units > kMaxLineUnits) units = kMaxLineUnits;
    for (int i = 0; i < units; ++i) {
        unsigned c = text[i];
        if (c < 0x20 || (c >= 0xD800 && c <= 0xDFFF) || (c > 0xFF && font->max_byte1 == 0)) c = '?';
        glyphs[i].byte1 = static_cast<unsigned char>(c >> 8);
        glyphs[i].byte2 = static_cast<unsigned char>(c & 0xFF);
    }
    gXlib.XDrawString16(display, window, gc, x, y, glyphs, units);
}

Atom Intern(Display* display, const char* name) { return gXlib.XInternAtom(display, name, False); }

void SetAtomProperty(Display* display, Window window, const char* name, const char* value) {
    Atom atom = Intern(display, value);
    gXlib.XChangeProperty(display, window, Intern(display, name), XA_ATOM, 32, PropModeAppend,
                         reinterpret_cast<unsigned char*>(&atom), 1);
}

// The dialog's window and what drawing and dismissing it need.
struct Dialog {
    Display* display;
    Window window;
    GC gc;
    XFontStruct* font;
    const DialogLine* lines;
    int lineCount;
    int lineHeight;
    XRectangle button;
    Atom closeProtocol;  // WM_DELETE_WINDOW: the window manager's close button
};

// Sized to the text (at least kMinWidth wide) and centred on the screen; the window manager is told
// its title (UTF-8 in both name properties), class, fixed size and place, that it takes the focus
// and has a close button, and that it is a dialog kept on top. Not shown yet.
void CreateDialogWindow(Dialog* dialog, const char* caption) {
    Display* display = dialog->display;
    const XFontStruct* font = dialog->font;
    int screen = DefaultScreen(display);
    dialog->lineHeight = font->ascent + font->descent + 2;
    int textWidth = 0;
    for (int i = 0; i < dialog->lineCount; ++i) {
        if (dialog->lines[i].units * font->max_bounds.width > textWidth) {
            textWidth = dialog->lines[i].units * font->max_bounds.width;
        }
    }
    int width = textWidth + 2 * kMargin < kMinWidth ? kMinWidth : textWidth + 2 * kMargin;
    int height = kMargin + dialog->lineCount * dialog->lineHeight + kMargin + kButtonHeight + kMargin;
    int x = (DisplayWidth(display, screen) - width) / 2;
    int y = (DisplayHeight(display, screen) - height) / 2;
    dialog->button = {static_cast<short>((width - kButtonWidth) / 2), static_cast<short>(height - kMargin - kButtonHeight),
                      kButtonWidth, kButtonHeight};

    XSetWindowAttributes attributes;
    attributes.background_pixel = WhitePixel(display, screen);
    attributes.event_mask = ExposureMask | KeyPressMask | ButtonPressMask | ButtonReleaseMask | StructureNotifyMask;
    Window window = gXlib.XCreateWindow(display, RootWindow(display, screen), x, y, static_cast<unsigned>(width),
                                        static_cast<unsigned>(height), 0, CopyFromParent, InputOutput, CopyFromParent,
                                        CWBackPixel | CWEventMask, &attributes);
    dialog->window = window;

    Atom utf8 = Intern(display, "UTF8_STRING");
    int captionBytes = static_cast<int>(strlen(caption));
    const unsigned char* captionData = reinterpret_cast<const unsigned char*>(caption);
    gXlib.XChangeProperty(display, window, XA_WM_NAME, utf8, 8, PropModeReplace, captionData, captionBytes);
    gXlib.XChangeProperty(display, window, Intern(display, "_NET_WM_NAME"), utf8, 8, PropModeReplace, captionData,
                          captionBytes);
    // Not a frame class, so a second instance's activation never picks the dialog.
    char className[] = "QZ-Lumiscope_QZ-57";
    XClassHint classHint = {className, className};
    gXlib.XSetClassHint(display, window, &classHint);
    XSizeHints size;
    size.flags = USPosition | PPosition | PMinSize | PMaxSize | PWinGravity;
    size.x = x;
    size.y = y;
    size.min_width = size.max_width = width;
    size.min_height = size.max_height = height;
    size.win_gravity = CenterGravity;  // the frame is centred, not just the client area
    gXlib.XSetWMNormalHints(display, window, &size);
    XWMHints wmHints;
    wmHints.flags = InputHint;
    wmHints.input = True;
    gXlib.XSetWMHints(display, window, &wmHints);
    dialog->closeProtocol = Intern(display, "WM_DELETE_WINDOW");
    gXlib.XSetWMProtocols(display, window, &dialog->closeProtocol, 1);
    SetAtomProperty(display, window, "_NET_WM_WINDOW_TYPE", "_NET_WM_WINDOW_TYPE_DIALOG");
    SetAtomProperty(display, window, "_NET_WM_STATE", "_NET_WM_STATE_ABOVE");  // on top, as the Windows box
}

// Asks the window manager for the focus, as a pager would, and takes it where there is none.
void TakeFocus(const Dialog& dialog) {
    Display* display = dialog.display;
    XEvent active = {};
    active.xclient.type = ClientMessage;
    active.xclient.window = dialog.window;
    active.xclient.message_type = Intern(display, "_NET_ACTIVE_WINDOW");
    active.xclient.format = 32;
    active.xclient.data.l[0] = 2;
    gXlib.XSendEvent(display, DefaultRootWindow(display), False, SubstructureRedirectMask | SubstructureNotifyMask,
                     &active);
    gXlib.XSetInputFocus(display, dialog.window, RevertToParent, CurrentTime);
}

// The lines of text and the OK button.
void PaintDialog(const Dialog& dialog) {
    Display* display = dialog.display;
    const XFontStruct* font = dialog.font;
    const XRectangle& button = dialog.button;
    gXlib.XClearWindow(display, dialog.window);
    gXlib.XSetForeground(display, dialog.gc, BlackPixel(display, DefaultScreen(display)));
    for (int i = 0; i < dialog.lineCount; ++i) {
        DrawText16(display, dialog.window, dialog.gc, font, kMargin, kMargin + i * dialog.lineHeight + font->ascent,
                   dialog.lines[i].start, dialog.lines[i].units);
    }
    gXlib.XDrawRectangle(display, dialog.window, dialog.gc, button.x, button.y, button.width - 1, button.height - 1);
    static const char16_t kOk[] = u"OK";
    DrawText16(display, dialog.window, dialog.gc, font, button.x + (button.width - 2 * font->max_bounds.width) / 2,
               button.y + (button.height + font->ascent - font->descent) / 2, kOk, 2);
}

// One event of the dialog's window; true when it dismisses the dialog. `shown` becomes true when the
// window is first mapped; `pressedOnButton` remembers where the last press of the first button was.
bool HandleDialogEvent(const Dialog& dialog, const XEvent& event, bool* shown, bool* pressedOnButton) {
    const XRectangle& button = dialog.button;
    if (event.type == MapNotify && !*shown) {
        *shown = true;
        TakeFocus(dialog);
    } else if (event.type == Expose && event.xexpose.count == 0) {
        PaintDialog(dialog);
    } else if (event.type == KeyPress && !event.xkey.send_event) {
        XKeyEvent key = event.xkey;
        KeySym symbol = gXlib.XLookupKeysym(&key, 0);
        return symbol == XK_Return || symbol == XK_KP_Enter || symbol == XK_Escape;
    } else if ((event.type == ButtonPress || event.type == ButtonRelease) && event.xbutton.button == Button1) {
        bool onButton = event.xbutton.x >= button.x && event.xbutton.x < button.x + button.width &&
                        event.xbutton.y >= button.y && event.xbutton.y < button.y + button.height;
        if (event.type == ButtonPress) *pressedOnButton = onButton;
        else return *pressedOnButton && onButton;
    } else if (event.type == ClientMessage && event.xclient.format == 32 &&
               event.xclient.message_type == Intern(dialog.display, "WM_PROTOCOLS")) {
        return static_cast<Atom>(event.xclient.data.l[0]) == dialog.closeProtocol;  // the close button
    } else if (event.type == DestroyNotify) {
        return true;  // someone else destroyed it
    }
    return false;
}

// The dialog from creation to dismissal; true when it was shown.
bool RunDialog(Display* display, XFontStruct* font, const char* caption, const DialogLine* lines, int lineCount) {
    Dialog dialog = {};
    dialog.display = display;
    dialog.font = font;
    dialog.lines = lines;
    dialog.lineCount = lineCount;
    CreateDialogWindow(&dialog, caption);
    dialog.gc = gXlib.XCreateGC(display, dialog.window, 0, nullptr);
    gXlib.XSetFont(display, dialog.gc, font->fid);
    gXlib.XMapRaised(display, dialog.window);
    gXlib.XSync(display, False);

    bool shown = false;
    bool done = gConnection.failed || gConnection.lost;  // the window could not be made
    bool pressedOnButton = false;
    while (!done) {
        while (!done && !gConnection.lost && gXlib.XPending(display) > 0) {
            XEvent event;
            gXlib.XNextEvent(display, &event);
            done = HandleDialogEvent(dialog, event, &shown, &pressedOnButton);
        }
        if (gConnection.lost) break;
        gXlib.XFlush(display);
        pollfd fd = {ConnectionNumber(display), POLLIN, 0};
        if (!done) poll(&fd, 1, -1);
    }
    if (!gConnection.lost) {
        gXlib.XFreeGC(display, dialog.gc);
        gXlib.XDestroyWindow(display, dialog.window);
        gXlib.XSync(display, False);
    }
    return shown;
}

// The dialog on the default display; false when there is none or it could not be shown.
bool ShowErrorDialog(const char* caption, const char* text) {
    if (!OpenXConnection(&gConnection)) return false;
    Display* display = gConnection.display;

    // A Unicode face of the core "fixed" font where the server has one, else "fixed" itself.
    XFontStruct* font = gXlib.XLoadQueryFont(display, "-misc-fixed-medium-r-semicondensed--13-*-*-*-*-*-iso10646-1");
    if (font == nullptr) font = gXlib.XLoadQueryFont(display, "fixed");
    char16_t* wide = WidenText(text != nullptr ? text : "");
    bool shown = false;
    if (font != nullptr && wide != nullptr) {
        DialogLine lines[kMaxLines];
        shown = RunDialog(display, font, caption != nullptr ? caption : "Error", lines, WrapText(wide, lines));
    }
    free(wide);
    if (font != nullptr && !gConnection.lost) gXlib.XFreeFont(display, font);
    CloseXConnection(&gConnection);
    return shown;
}

}  // namespace

void ShowErrorBox(const char* text) {
    const char* caption = LoadMessageText(kMessageCaption);
    if (caption == nullptr) caption = "Error";
    if (text == nullptr) text = "";
    fprintf(stderr, "%s: %s\n", caption, text);
    fflush(stderr);
    ShowErrorDialog(caption, text);
}
