// Single-instance hand-off on POSIX systems: the per-user instance lock and the sockets of the
// argument forwarding. (Raising the running frame is the display's business: instance_x11.cpp.)
#include "instance.h"

#include <arpa/inet.h>
#include <errno.h>
#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <stdlib.h>
#include <string.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

namespace {

int handOffSocket = -1;
sockaddr_in destination;
bool destinationKnown = false;

// The folder of the lock file: the user's runtime folder, or a private folder of the user's own in
// /tmp when there is none. False when neither can be had.
bool LockFolder(char* out, size_t size) {
    const char* runtime = getenv("XDG_RUNTIME_DIR");
    if (runtime != nullptr && runtime[0] == '/') {
        FormatText(out, size, "%s", runtime);
        return true;
    }
    FormatText(out, size, "/tmp/%s-%u", InstanceName, static_cast<unsigned>(getuid()));
    struct stat info;
    if (mkdir(out, 0700) != 0 && errno != EEXIST) return false;
    return lstat(out, &info) == 0 && S_ISDIR(info.st_mode) && info.st_uid == getuid() && (info.st_mode & 077) == 0;
}

}  // namespace

// The lock is an exclusive lock on a file named after `name` (the caller passes the instance name's
// nine-unit form, the name every instance meets on). The kernel drops the lock with the last
// descriptor, so it lasts exactly as long as this process however it ends; the descriptor is closed
// on exec, so programs the Java application starts do not keep it. Any failure counts as "another
// instance runs", as on every platform.
bool AcquireInstanceLock(const char16_t* name) {
    char folder[4096];
    char* narrowName = NarrowCopy(name);
    if (narrowName == nullptr || !LockFolder(folder, sizeof folder)) return false;
    char path[4096 + 64];
    FormatText(path, sizeof path, "%s/%s.lock", folder, narrowName);
    free(narrowName);
    int lock = open(path, O_RDWR | O_CREAT | O_CLOEXEC, 0600);
    if (lock < 0) return false;
    if (flock(lock, LOCK_EX | LOCK_NB) != 0) {
        close(lock);
        return false;
    }
    return true;  // the descriptor stays open until the process ends
}

bool HandOffStart() { return true; }

// "localhost" by name, as on every platform; resolved once. A refused connection leaves a socket
// that cannot be connected again here, so every attempt has a socket of its own.
int HandOffConnect() {
    if (!destinationKnown) {
        memset(&destination, 0, sizeof destination);
        destination.sin_family = AF_INET;
        destination.sin_port = htons(kHandOffPort);
        destination.sin_addr.s_addr = inet_addr("localhost");
        if (destination.sin_addr.s_addr == INADDR_NONE) {
            const hostent* host = gethostbyname("localhost");
            if (host == nullptr || host->h_addrtype != AF_INET || host->h_addr_list[0] == nullptr) return -1;
            memcpy(&destination.sin_addr, host->h_addr_list[0], sizeof destination.sin_addr);
        }
        destinationKnown = true;
    }
    if (handOffSocket >= 0) close(handOffSocket);
    handOffSocket = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, IPPROTO_TCP);
    if (handOffSocket < 0) return -1;
    return connect(handOffSocket, reinterpret_cast<const sockaddr*>(&destination), sizeof destination) == 0 ? 1 : 0;
}

// A listener that went away must not end the second instance with SIGPIPE.
void HandOffSend(const char* data, size_t bytes) { send(handOffSocket, data, bytes, MSG_NOSIGNAL); }

void HandOffClose() { close(handOffSocket); }

void PauseMs(uint32_t ms) {
    timespec rest = {static_cast<time_t>(ms / 1000), static_cast<long>(ms % 1000) * 1000000L};
    while (nanosleep(&rest, &rest) != 0 && errno == EINTR) {
    }
}
