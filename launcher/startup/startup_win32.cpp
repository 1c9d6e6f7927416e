// The start-up sequence's Windows layer: WinMain, the documents folder, CommandLineToArgvW and the
// application directory as the program path names it.
#include <windows.h>
#include <shellapi.h>
#include <shlobj.h>
#include <shlwapi.h>
#include <stdlib.h>
#include <direct.h>

#include "startup.h"
#include "startup_platform.h"

bool FindLogPath(char16_t* path) {
    // CSIDL_FLAG_CREATE: the documents folder itself is created when it is missing. A failed call may
    // leave anything in the buffer, so the path is emptied for the log's open to fail on.
    LPWSTR wide = reinterpret_cast<LPWSTR>(path);
    if (FAILED(SHGetFolderPathW(nullptr, CSIDL_PERSONAL | CSIDL_FLAG_CREATE, nullptr, SHGFP_TYPE_CURRENT, wide))) {
        path[0] = 0;
        return false;
    }
    PathAppendW(wide, L"QZ-LumiscopeQZ-57Nova\\logs\\QZ-LumiscopeQZ-57Nova-L.log");
    return true;
}

char16_t** SplitCommandLine(int32_t* argc) {
    int count = 0;
    LPWSTR* argv = CommandLineToArgvW(GetCommandLineW(), &count);
    *argc = count;
    return reinterpret_cast<char16_t**>(argv);
}

// The drive and directory of the program path as typed; a path without a directory leaves the
// current directory as it is.
void EnterApplicationDirectory(const char16_t* argv0) {
    WCHAR drive[_MAX_DRIVE], directory[_MAX_DIR], name[_MAX_FNAME], extension[_MAX_EXT];
    WCHAR appDirectory[MAX_PATH];
    _wsplitpath(reinterpret_cast<const wchar_t*>(argv0), drive, directory, name, extension);
    wsprintfW(appDirectory, L"%s%s", drive, directory);
    _wchdir(appDirectory);
}

int WINAPI WinMain(HINSTANCE, HINSTANCE, LPSTR, int) { return RunLauncher(); }
