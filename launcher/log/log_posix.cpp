// The log file on POSIX systems. A second launcher must neither truncate nor write a running
// instance's log: the file is opened without truncation, locked exclusively (the lock lasts as long
// as the descriptor, so a crashed instance leaves none behind), and only then emptied. A file that
// another instance holds counts as an open that failed.
#include "log_platform.h"

#include "../text/text.h"

#include <errno.h>
#include <fcntl.h>
#include <stdlib.h>
#include <string.h>
#include <sys/file.h>
#include <unistd.h>

LogHandle LogPlatformOpen(const char16_t* path) {
    char* narrow = NarrowCopy(path);
    int file = narrow != nullptr && narrow[0] != 0 ? open(narrow, O_RDWR | O_CREAT | O_CLOEXEC, 0666) : -1;
    free(narrow);
    if (file < 0) return kLogInvalidHandle;
    if (flock(file, LOCK_EX | LOCK_NB) != 0 || ftruncate(file, 0) != 0) {
        close(file);
        return kLogInvalidHandle;
    }
    if (file == 0) {  // 0 is the log's "never opened"
        int moved = fcntl(file, F_DUPFD_CLOEXEC, 1);
        close(file);
        if (moved < 0) return kLogInvalidHandle;
        file = moved;
    }
    return file;
}

bool LogPlatformWrite(LogHandle handle, const void* data, uint32_t bytes, uint32_t* written, uint32_t* error) {
    ssize_t done = handle >= 0 ? write(static_cast<int>(handle), data, bytes) : -1;
    *written = done > 0 ? static_cast<uint32_t>(done) : 0;
    *error = done < 0 ? static_cast<uint32_t>(handle >= 0 ? errno : EBADF) : 0;
    return done >= 0;
}

void LogPlatformClose(LogHandle handle) {
    if (handle >= 0) close(static_cast<int>(handle));
}

void LogPlatformWriteFailed(uint32_t) {}

int LogPlatformWidenBytes(const char* text, int) { return static_cast<int>(strlen(text)) + 1; }
