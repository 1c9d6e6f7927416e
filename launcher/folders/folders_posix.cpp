// The user's settings folder and the executable's own folder on POSIX systems (folders_posix.h).
#include "folders_posix.h"

#include "../text/text.h"

#include <limits.h>
#include <pwd.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

namespace {

// $HOME, or the home of the user's account entry when the variable is unset or empty.
const char* HomeDirectory() {
    const char* home = getenv("HOME");
    if (home != nullptr && home[0] != 0) return home;
    const passwd* account = getpwuid(getuid());
    return account != nullptr && account->pw_dir != nullptr && account->pw_dir[0] != 0 ? account->pw_dir : nullptr;
}

}  // namespace

bool FindConfigHome(char* out, size_t size) {
    const char* config = getenv("XDG_CONFIG_HOME");
    if (config != nullptr && config[0] != 0) {
        FormatText(out, size, "%s", config);
        return true;
    }
    const char* home = HomeDirectory();
    if (home == nullptr) return false;
    FormatText(out, size, "%s/.config", home);
    return true;
}

// argv[0] may be a bare name found on PATH or a symbolic link; /proc/self/exe is the file itself.
bool EnterExecutableDirectory() {
    char path[PATH_MAX];
    ssize_t length = readlink("/proc/self/exe", path, sizeof path - 1);
    if (length <= 0) return false;
    path[length] = 0;
    char* slash = strrchr(path, '/');
    if (slash == nullptr) return false;
    slash[slash == path ? 1 : 0] = 0;
    return chdir(path) == 0;
}
