// The splash window on Windows: a layered, borderless tool window on a thread of its own that fades
// in from opacity 64 to 252 and closes when its display time is up or when the launcher asks.
//
// Threads: SplashStart and SplashClose run on the main thread, everything else on the splash thread
// (its window procedure included). The only thing the two share is gSplashWindow, written once by
// the splash thread after the window exists and read by SplashClose, without a lock: a close that
// comes before the handle is published simply has no effect.
//
// Every failure is silent. A missing or unreadable picture ends the thread before any window exists,
// and the launch goes on unchanged.
#include "splash.h"
#include "splash_platform.h"

#include "../core/core.h"
#include "../text/text.h"

#include <windows.h>
#include <vfw.h>

namespace {

const wchar_t kClassName[] = L"SplashScreenWndClass";
const wchar_t kResourceType[] = L"SPLASH";

enum : UINT_PTR { kCloseTimer = 1, kFadeTimer = 2 };

// What the paint handler needs. Lives on the splash thread's stack for the life of the window and
// hangs on the window as its user data.
struct SplashWindowData {
    HDRAWDIB drawDib;
    const uint8_t* bitmapFile;  // the locked resource: a whole bitmap file image
    DWORD bitmapBytes;          // its size, for the bounds-checked reader
    int32_t width;
    int32_t height;
};

typedef BOOL(WINAPI* SetLayeredWindowAttributesProc)(HWND, COLORREF, BYTE, DWORD);

// Process-wide state. The window handle is never cleared and the fade is never restarted: there is
// one splash per process.
HWND volatile gSplashWindow = nullptr;
int gFadeAlpha = kSplashFirstAlpha;
HMODULE gUser32 = nullptr;
SetLayeredWindowAttributesProc gSetLayeredWindowAttributes = nullptr;
// What setting the fade timer returned. Nothing reads it; it is kept as the splash has always kept it.
UINT_PTR gFadeTimer = 0;

// DrawDib lives in msvfw32, which brings libraries of its own (under Wine winmm, msacm32, ole32,
// combase and rpcrt4: WinMain came about 60 ms later, measured). Only the splash draws with it, so
// SplashStart loads it, on the main thread before the splash thread exists: loaded on the splash
// thread while the main thread loads the VM's library, the two loads could deadlock (seen under Wine,
// a few starts in a hundred). A second instance or a "-noSplash" start never loads it. Written before
// the splash thread starts, read-only afterwards; the library stays loaded.
decltype(&DrawDibOpen) gDrawDibOpen = nullptr;
decltype(&DrawDibDraw) gDrawDibDraw = nullptr;
decltype(&DrawDibClose) gDrawDibClose = nullptr;

void LoadDrawDib() {
    HMODULE library = LoadLibraryW(L"msvfw32");
    if (library == nullptr) return;
    gDrawDibDraw = reinterpret_cast<decltype(&DrawDibDraw)>(GetProcAddress(library, "DrawDibDraw"));
    gDrawDibClose = reinterpret_cast<decltype(&DrawDibClose)>(GetProcAddress(library, "DrawDibClose"));
    if (gDrawDibDraw != nullptr && gDrawDibClose != nullptr) {
        gDrawDibOpen = reinterpret_cast<decltype(&DrawDibOpen)>(GetProcAddress(library, "DrawDibOpen"));
    }
}

}  // namespace

// Finds the "SPLASH" resource `name` in `module` and checks its file image. Returns the loaded
// resource, or null when it is missing or is not a bitmap file image that fits in its size.
HGLOBAL LoadSplashBitmap(HMODULE module, const char* name, int32_t* width, int32_t* height, DWORD* bytes) {
    wchar_t wideName[kMaxPathUnits];
    const wchar_t* resourceName = nullptr;
    if (name != nullptr) {
        if (ToWide(name, -1, reinterpret_cast<char16_t*>(wideName), kMaxPathUnits) == 0) return nullptr;
        resourceName = wideName;
    }
    HRSRC found = FindResourceW(module, resourceName, kResourceType);
    if (found == nullptr) return nullptr;
    DWORD size = SizeofResource(module, found);
    if (size == 0) return nullptr;
    HGLOBAL loaded = LoadResource(module, found);
    if (loaded == nullptr) return nullptr;
    const uint8_t* image = static_cast<const uint8_t*>(LockResource(loaded));
    if (image == nullptr) return nullptr;

    SplashBitmapInfo info;
    if (!ReadSplashBitmap(image, size, &info)) return nullptr;
    *width = info.width;
    *height = info.height;
    *bytes = size;
    return loaded;
}

// One step of the fade: 64, 68, ... 252, and the step after 252 stops the fade timer. Without
// SetLayeredWindowAttributes nothing happens (the fade timer then fires harmlessly until the end).
void SplashFadeStep(HWND window) {
    if (gUser32 == nullptr) {
        gUser32 = LoadLibraryW(L"user32");
        if (gUser32 != nullptr) {
            gSetLayeredWindowAttributes = reinterpret_cast<SetLayeredWindowAttributesProc>(
                reinterpret_cast<void*>(GetProcAddress(gUser32, "SetLayeredWindowAttributes")));
        }
    }
    if (gSetLayeredWindowAttributes == nullptr) return;
    int alpha = SplashFadeNext(&gFadeAlpha);
    if (alpha >= 0) {
        gSetLayeredWindowAttributes(window, RGB(255, 255, 255), static_cast<BYTE>(alpha), LWA_ALPHA);
    } else {
        KillTimer(window, kFadeTimer);
    }
}

// The whole picture at the window's origin, unscaled. Bit counts other than 24, 8, 4 and 1 draw nothing.
void SplashPaint(HWND window) {
    const SplashWindowData* data = reinterpret_cast<const SplashWindowData*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    PAINTSTRUCT paint;
    HDC dc = BeginPaint(window, &paint);
    SplashBitmapInfo info;
    if (data != nullptr && data->bitmapFile != nullptr && ReadSplashBitmap(data->bitmapFile, data->bitmapBytes, &info) &&
        info.pixelOffset != 0) {
        BITMAPINFOHEADER* header =
            reinterpret_cast<BITMAPINFOHEADER*>(const_cast<uint8_t*>(data->bitmapFile + info.infoOffset));
        void* pixels = const_cast<uint8_t*>(data->bitmapFile + info.pixelOffset);
        gDrawDibDraw(data->drawDib, dc, 0, 0, data->width, data->height, header, pixels, 0, 0, data->width,
                    data->height, DDF_HALFTONE);
    }
    EndPaint(window, &paint);
}

LRESULT CALLBACK SplashWndProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    switch (message) {
        case WM_ERASEBKGND:
            return 1;  // the picture covers the whole window
        case WM_DESTROY:
            PostQuitMessage(0);
            return 0;
        case WM_PAINT:
            SplashPaint(window);
            return 0;
        case WM_SETCURSOR:
            return 0;  // the pointer keeps its shape over the splash
        case WM_TIMER:
            if (wParam == kCloseTimer) {
                KillTimer(window, kCloseTimer);
                SendMessageW(window, WM_CLOSE, 0, 0);
            } else if (wParam == kFadeTimer) {
                SplashFadeStep(window);
            }
            return 0;
        default:
            return DefWindowProcW(window, message, wParam, lParam);
    }
}

// The window class, registered once per instance and never unregistered; false when it cannot be.
bool RegisterSplashClass(HINSTANCE instance) {
    WNDCLASSEXW windowClass;
    if (GetClassInfoExW(instance, kClassName, &windowClass)) return true;
    ZeroMemory(&windowClass, sizeof windowClass);
    windowClass.cbSize = sizeof windowClass;
    windowClass.lpfnWndProc = SplashWndProc;
    windowClass.hInstance = instance;
    windowClass.hCursor = LoadCursorW(nullptr, reinterpret_cast<LPCWSTR>(IDC_ARROW));
    windowClass.lpszClassName = kClassName;
    return RegisterClassExW(&windowClass) != 0;
}

// The window, created hidden, exactly the picture's size, where the parameters place it, off the
// taskbar, at opacity 64 before it is ever shown (never 0). The result is not checked.
HWND CreateSplashWindow(HINSTANCE instance, const SplashParams& params, int32_t width, int32_t height) {
    // Signed divisions, rounding toward zero, as the position rule says.
    int x;
    int y;
    if (params.centerOnScreen != 0) {
        x = (GetSystemMetrics(SM_CXSCREEN) - width) / 2;
        y = (GetSystemMetrics(SM_CYSCREEN) - height) / 2;
    } else {
        x = params.centerX - width / 2;
        y = params.centerY - height / 2;
    }
    DWORD exStyle = WS_EX_LAYERED | WS_EX_TOOLWINDOW;  // off the taskbar
    if (params.topMost != 0) exStyle |= WS_EX_TOPMOST;
    HWND window = CreateWindowExW(exStyle, kClassName, L"", WS_POPUP, x, y, width, height, nullptr, nullptr, instance,
                                  nullptr);
    SplashFadeStep(window);
    return window;
}

// Starts the display time (fade included) and the fade, and shows the window; a window whose display
// timer cannot be set closes without ever being shown.
void ShowSplashWindow(HWND window, uint16_t displayMs) {
    UINT_PTR closeTimer = SetTimer(window, kCloseTimer, displayMs, nullptr);
    gFadeTimer = SetTimer(window, kFadeTimer, kSplashFadeIntervalMs, nullptr);
    if (closeTimer != 0) {
        ShowWindow(window, SW_SHOW);
    } else {
        PostMessageW(window, WM_CLOSE, 0, 0);
    }
}

// The splash thread: owns the parameter copy, the DrawDib handle and the window, and runs the
// window's messages until it is destroyed.
DWORD WINAPI SplashThreadProc(LPVOID parameter) {
    SplashParams* params = static_cast<SplashParams*>(parameter);
    // The window class, the window and the picture all belong to the launcher's own module.
    HINSTANCE instance = GetModuleHandleW(nullptr);

    // Without the library DrawDibOpen counts as failed.
    HDRAWDIB drawDib = gDrawDibOpen != nullptr ? gDrawDibOpen() : nullptr;
    if (drawDib == nullptr) {
        GlobalFree(params);
        return 0;
    }
    SplashWindowData data = {drawDib, nullptr, 0, 0, 0};
    HGLOBAL bitmap = LoadSplashBitmap(instance, params->resourceName, &data.width, &data.height, &data.bitmapBytes);
    data.bitmapFile = bitmap != nullptr ? static_cast<const uint8_t*>(LockResource(bitmap)) : nullptr;
    if (data.bitmapFile == nullptr || !RegisterSplashClass(instance)) {
        gDrawDibClose(drawDib);
        GlobalFree(params);
        return 0;
    }

    HWND window = CreateSplashWindow(instance, *params, data.width, data.height);
    SetWindowLongPtrW(window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(&data));
    ShowSplashWindow(window, params->displayMs);
    gSplashWindow = window;

    MSG message;
    while (GetMessageW(&message, nullptr, 0, 0) != 0) {
        TranslateMessage(&message);
        DispatchMessageW(&message);
    }
    // The resource stays loaded and gSplashWindow keeps its stale value.
    gDrawDibClose(drawDib);
    GlobalFree(params);
    return 0;
}

void SplashStart(const SplashParams* params) {
    SplashParams* copy = static_cast<SplashParams*>(GlobalAlloc(GPTR, sizeof(SplashParams)));
    if (copy == nullptr) return;
    *copy = *params;
    bool wait = copy->waitForClose != 0;  // read before the copy belongs to the thread
    if (gDrawDibOpen == nullptr) LoadDrawDib();
    HANDLE thread = CreateThread(nullptr, 0, SplashThreadProc, copy, 0, nullptr);
    if (thread == nullptr) {
        GlobalFree(copy);
        return;
    }
    if (wait) WaitForSingleObject(thread, INFINITE);
    // The thread handle stays open for the life of the process.
}

void SplashClose() {
    // A cross-thread send: returns once the splash thread has destroyed the window. Fails quietly
    // when there is no window (never created, not yet published or already gone).
    SendMessageW(gSplashWindow, WM_CLOSE, 0, 0);
}
