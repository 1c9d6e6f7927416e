// For the POSIX files of the start-up sequence and the VM host: the folders both look for, the
// user's settings folder of the freedesktop base-directory convention and the folder of the
// executable file itself. (On Windows both rooms ask the shell directly.)
//
// Main thread only (the launcher thread on POSIX): EnterExecutableDirectory changes the process's
// current directory.
#ifndef LAUNCHER_FOLDERS_FOLDERS_POSIX_H
#define LAUNCHER_FOLDERS_FOLDERS_POSIX_H

#include <stddef.h>

// The user's settings folder: $XDG_CONFIG_HOME, or $HOME/.config when the variable is unset or
// empty (the account's home when $HOME is too); its bytes as they are. False when there is no home
// to put it in.
bool FindConfigHome(char* out, size_t size);

// Makes the directory of the executable file itself the current directory; false when it cannot
// be found or entered (the current directory then stays as it was).
bool EnterExecutableDirectory();

#endif
