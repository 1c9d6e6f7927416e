// Single-instance hand-off on POSIX systems: the per-user instance lock and the sockets of the
// argument forwarding. (Raising the running frame is the display's business: instance_x11.cpp.)
#include "instance.h"
#include "instance_platform.h"

#include "../errorbox/errorbox_posix.h"
#include "../text/text.h"

#include <arpa/inet.h>
#include <errno.h>
#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <pwd.h>
#include <stdlib.h>
#include <string.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/utsname.h>
#include <time.h>
#include <unistd.h>

namespace {

// The lock's folder, below the home of the user's account entry.
const char kCacheFolder[] = ".cache";
const char kLockFolder[] = "QZ-Lumiscope_QZ-57";

// The home folder of the account entry, never $HOME: one user meets one lock from every environment
// (su without -, a desktop entry, a terminal), whatever its variables say.
const char* AccountHome() {
    const passwd* account = getpwuid(getuid());
    return account != nullptr && account->pw_dir != nullptr && account->pw_dir[0] == '/' ? account->pw_dir : nullptr;
}

// Opens the lock's folder, <home>/.cache/QZ-Lumiscope_QZ-57, made when missing. It must be a folder
// of this user's own with mode 0700, reached without a symbolic link in its own place, so that no
// other user can create it first, take the lock in it or block it. -1 with `why` set otherwise.
int OpenLockFolder(char* path, size_t size, const char** why) {
    const char* home = AccountHome();
    if (home == nullptr) {
        *why = "the user account has no home folder";
        return -1;
    }
    FormatText(path, size, "%s/%s/%s", home, kCacheFolder, kLockFolder);
    int homeFolder = open(home, O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    int cache = -1;
    if (homeFolder >= 0 && (mkdirat(homeFolder, kCacheFolder, 0700) == 0 || errno == EEXIST)) {
        cache = openat(homeFolder, kCacheFolder, O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    }
    int folder = -1;
    if (cache >= 0 && (mkdirat(cache, kLockFolder, 0700) == 0 || errno == EEXIST)) {
        folder = openat(cache, kLockFolder, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    }
    int error = errno;
    if (homeFolder >= 0) close(homeFolder);
    if (cache >= 0) close(cache);
    struct stat info;
    if (folder < 0) {
        *why = error == ELOOP || error == ENOTDIR ? "it is a symbolic link or not a folder" : strerror(error);
    } else if (fstat(folder, &info) != 0 || info.st_uid != getuid() || (info.st_mode & 077) != 0) {
        *why = "it is not a folder of this user's own with mode 0700";
        close(folder);
        folder = -1;
    }
    return folder;
}

}  // namespace

// The lock is an exclusive lock on a file named after `name` (the caller passes the instance name's
// nine-unit form, the name every instance meets on) and the machine, since a home folder may be
// shared between machines. The kernel drops the lock with the last descriptor, so it lasts exactly
// as long as this process however it ends; the descriptor is closed on exec, so programs the Java
// application starts do not keep it.
//
// Only a lock that a live first instance holds makes this a second instance. A lock that cannot be
// had at all (no usable folder, no descriptor left, a full disk) is said on standard error and the
// start goes on as the first instance: the application then runs, where taking every failure for
// another instance would leave the user with nothing.
bool AcquireInstanceLock(const char16_t* name) {
    char folderPath[4096];
    const char* why = nullptr;
    int folder = OpenLockFolder(folderPath, sizeof folderPath, &why);
    if (folder >= 0) {
        char* narrowName = NarrowCopy(name);
        utsname machine;
        if (uname(&machine) != 0) machine.nodename[0] = 0;
        for (char* c = machine.nodename; *c != 0; ++c) *c = *c == '/' ? '_' : *c;
        char file[512];
        FormatText(file, sizeof file, "%s@%s.lock", narrowName != nullptr ? narrowName : "", machine.nodename);
        free(narrowName);
        int lock = openat(folder, file, O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0600);
        int error = lock < 0 ? errno : flock(lock, LOCK_EX | LOCK_NB) != 0 ? errno : 0;
        close(folder);
        if (error == 0) return true;  // the lock's descriptor stays open until the process ends
        if (lock >= 0) close(lock);
        if (error == EWOULDBLOCK) return false;
        why = strerror(error);
    }
    ReportCause("cannot take the instance lock in %s (%s); starting as the first instance", folderPath, why);
    return true;
}

bool HandOffStart() { return true; }

// "localhost" by name, as on every platform; resolved once. A refused connection leaves a socket
// that cannot be connected again here, so every attempt has a socket of its own.
int HandOffConnect(HandOffLink* link) {
    sockaddr_in destination;
    memset(&destination, 0, sizeof destination);
    destination.sin_family = AF_INET;
    destination.sin_port = htons(HandOffPort);
    if (!link->resolved) {
        destination.sin_addr.s_addr = inet_addr("localhost");
        if (destination.sin_addr.s_addr == INADDR_NONE) {
            const hostent* host = gethostbyname("localhost");
            if (host == nullptr || host->h_addrtype != AF_INET || host->h_addr_list[0] == nullptr) return -1;
            memcpy(&destination.sin_addr, host->h_addr_list[0], sizeof destination.sin_addr);
        }
        link->address = destination.sin_addr.s_addr;
        link->resolved = true;
    }
    destination.sin_addr.s_addr = link->address;
    if (link->socket >= 0) close(static_cast<int>(link->socket));
    link->socket = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, IPPROTO_TCP);
    if (link->socket < 0) return -1;
    return connect(static_cast<int>(link->socket), reinterpret_cast<const sockaddr*>(&destination), sizeof destination) == 0
               ? 1
               : 0;
}

// A listener that went away must not end the second instance with SIGPIPE.
void HandOffSend(const HandOffLink& link, const char* data, size_t bytes) {
    send(static_cast<int>(link.socket), data, bytes, MSG_NOSIGNAL);
}

void HandOffClose(HandOffLink* link) { close(static_cast<int>(link->socket)); }

void PauseMs(uint32_t ms) {
    timespec rest = {static_cast<time_t>(ms / 1000), static_cast<long>(ms % 1000) * 1000000L};
    while (nanosleep(&rest, &rest) != 0 && errno == EINTR) {
    }
}
