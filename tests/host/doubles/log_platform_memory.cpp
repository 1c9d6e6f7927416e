// In-memory stand-in for the log's file layer: records every piece handed to it, separately.
#include "doubles/log_platform_memory.h"

namespace logdouble {
std::vector<std::u16string> pieces;
std::u16string openedPath;
int opens = 0;
bool closed = false;
}  // namespace logdouble

LogHandle LogPlatformOpen(const char16_t* path) {
    ++logdouble::opens;
    logdouble::openedPath = path;
    return 42;
}

bool LogPlatformWrite(LogHandle handle, const void* data, uint32_t bytes, uint32_t* written, uint32_t* error) {
    if (handle != 42 || logdouble::closed) {
        *written = 0;
        *error = 6;  // invalid handle
        return false;
    }
    logdouble::pieces.emplace_back(static_cast<const char16_t*>(data), bytes / 2);
    *written = bytes;
    *error = 0;
    return true;
}

void LogPlatformClose(LogHandle) { logdouble::closed = true; }
