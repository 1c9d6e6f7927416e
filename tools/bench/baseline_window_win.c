// The splash's baseline under Wine: one layered pop-up window of the given size, centred, created
// and shown the way the launcher's Windows splash is (opacity 64 before it shows); then it ends.
//   baseline_window_win.exe WIDTH HEIGHT
#include <stdlib.h>
#include <windows.h>

int WINAPI WinMain(HINSTANCE instance, HINSTANCE previous, LPSTR commandLine, int show) {
    (void)previous, (void)show;
    int width = atoi(commandLine), height = atoi(strchr(commandLine, ' ') ? strchr(commandLine, ' ') : "0");
    WNDCLASSEXW windowClass;
    ZeroMemory(&windowClass, sizeof windowClass);
    windowClass.cbSize = sizeof windowClass;
    windowClass.lpfnWndProc = DefWindowProcW;
    windowClass.hInstance = instance;
    windowClass.lpszClassName = L"BaselineSplash";
    RegisterClassExW(&windowClass);
    HWND window = CreateWindowExW(WS_EX_LAYERED | WS_EX_TOOLWINDOW, L"BaselineSplash", L"", WS_POPUP,
                                  (GetSystemMetrics(SM_CXSCREEN) - width) / 2,
                                  (GetSystemMetrics(SM_CYSCREEN) - height) / 2, width, height, NULL, NULL,
                                  instance, NULL);
    SetLayeredWindowAttributes(window, RGB(255, 255, 255), 64, LWA_ALPHA);
    ShowWindow(window, SW_SHOW);
    MSG message;
    while (PeekMessageW(&message, NULL, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
    return 0;
}
