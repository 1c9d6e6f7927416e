// The start-up sequence's POSIX layer: main, the documents folder of the freedesktop user-dirs
// convention, the command line decoded from UTF-8, and the directory of the executable file.
//
// The sequence runs on a launcher thread of its own rather than on the process's first thread: the
// VM is created on the thread that runs the sequence, and HotSpot's guard pages and stack banging
// need a thread whose stack it can measure, which the first thread's stack (sized and grown by
// `ulimit -s`) is not. The JDK's own launcher starts its VM on a new thread for the same reason. The
// first thread only waits for the result; when Java ends the process itself (System.exit), exit()
// runs from a Java thread and the process ends with Java's code.
#include "startup.h"
#include "startup_platform.h"

#include "../errorbox/errorbox.h"
#include "../folders/folders_posix.h"
#include "../text/text.h"

#include <errno.h>
#include <fcntl.h>
#include <pthread.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

int gProcessArgc = 0;
char** gProcessArgv = nullptr;

// Big enough for the VM's main thread (Java's default thread stack is 1 MB) and the launcher.
const size_t kLauncherStackBytes = 8u << 20;

const char kLogRelativePath[] = "/QZ-LumiscopeQZ-57Nova/logs/QZ-LumiscopeQZ-57Nova-L.log";

// XDG_DOCUMENTS_DIR of user-dirs.dirs in the settings folder: a line XDG_DOCUMENTS_DIR="..." whose
// value is "$HOME/..." or an absolute path. False when the file or the line is not there.
bool ReadDocumentsSetting(const char* configHome, const char* home, char* out, size_t size) {
    char file[4096];
    FormatText(file, sizeof file, "%s/user-dirs.dirs", configHome);
    // Only a regular file is read, and opening never waits: a FIFO in its place would otherwise
    // hold the start before anything shows.
    int descriptor = open(file, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (descriptor < 0) return false;
    struct stat info;
    FILE* dirs = fstat(descriptor, &info) == 0 && S_ISREG(info.st_mode) ? fdopen(descriptor, "r") : nullptr;
    if (dirs == nullptr) {
        close(descriptor);
        return false;
    }
    bool found = false;
    char line[4096];
    const char kKey[] = "XDG_DOCUMENTS_DIR=\"";
    while (!found && fgets(line, sizeof line, dirs) != nullptr) {
        const char* value = line + strspn(line, " \t");
        if (strncmp(value, kKey, sizeof kKey - 1) != 0) continue;
        value += sizeof kKey - 1;
        const char* end = strchr(value, '"');
        if (end == nullptr) continue;
        int length = static_cast<int>(end - value);
        if (strncmp(value, "$HOME", 5) == 0 && (value[5] == '/' || value + 5 == end) && home != nullptr) {
            FormatText(out, size, "%s%.*s", home, length - 5, value + 5);
            found = true;
        } else if (value[0] == '/') {
            FormatText(out, size, "%.*s", length, value);
            found = true;
        }
    }
    fclose(dirs);
    return found;
}

void* LauncherThread(void* result) {
    *static_cast<Status*>(result) = RunLauncher();
    return nullptr;
}

}  // namespace

// The documents folder is created when it is missing, as on Windows; the two folders below it are
// the application's own and are never created here.
bool FindLogPath(char16_t* path) {
    const char* home = getenv("HOME");
    if (home != nullptr && home[0] == 0) home = nullptr;
    char configHome[4096];
    char documents[4096];
    bool haveConfig = FindConfigHome(configHome, sizeof configHome);
    if (!(haveConfig && ReadDocumentsSetting(configHome, home, documents, sizeof documents))) {
        if (home == nullptr) return false;
        FormatText(documents, sizeof documents, "%s/Documents", home);
    }
    struct stat info;
    if (mkdir(documents, 0777) != 0 && !(stat(documents, &info) == 0 && S_ISDIR(info.st_mode))) return false;

    char full[4096 + sizeof kLogRelativePath];
    FormatText(full, sizeof full, "%s%s", documents, kLogRelativePath);
    if (WideSize(full) > kMaxPathUnits) return false;
    return ToWide(full, -1, path, kMaxPathUnits) != 0;
}

// Arguments arrive as bytes; ill-formed UTF-8 becomes U+FFFD per maximal subpart.
// A program started with no argv[0] at all gets an empty one, so argv[0] always exists.
char16_t** SplitCommandLine(int32_t* argc) {
    int count = gProcessArgc > 0 ? gProcessArgc : 1;
    char16_t** argv = static_cast<char16_t**>(calloc(static_cast<size_t>(count) + 1, sizeof(char16_t*)));
    if (argv == nullptr) abort();
    for (int i = 0; i < count; ++i) {
        argv[i] = i < gProcessArgc ? WideCopy(gProcessArgv[i]) : nullptr;
        if (argv[i] == nullptr) argv[i] = const_cast<char16_t*>(u"");
    }
    *argc = count;
    return argv;
}

void EnterApplicationDirectory(const char16_t*) { EnterExecutableDirectory(); }

int main(int argc, char** argv) {
    // Standard input, output or error left closed by whoever started us would go to the first files
    // opened (the log, the lock), and the VM's and the Java application's output into them: each
    // closed one is held by /dev/null before anything else is opened.
    for (int stream = 0; stream <= 2; ++stream) {
        if (fcntl(stream, F_GETFD) < 0 && errno == EBADF && open("/dev/null", O_RDWR) < 0) break;
    }
    gProcessArgc = argc;
    gProcessArgv = argv;
    Status result = 0;
    pthread_attr_t attributes;
    pthread_t launcher;
    if (pthread_attr_init(&attributes) == 0 && pthread_attr_setstacksize(&attributes, kLauncherStackBytes) == 0 &&
        pthread_create(&launcher, &attributes, LauncherThread, &result) == 0) {
        pthread_join(launcher, nullptr);
    } else {
        result = RunLauncher();
    }
    // A parent sees only the low 8 bits of the exit status (-1 arrives as 255): the whole result
    // stands on standard error.
    if (result != 0) {
        const char* caption = LoadMessageText(kMessageCaption);
        fprintf(stderr, "%s: launch ended with result %d\n", caption != nullptr ? caption : "Error", result);
    }
    return result;
}
