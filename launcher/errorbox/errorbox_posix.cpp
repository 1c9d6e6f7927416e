// The string table on POSIX systems, whose texts are built in, and the cause lines on standard
// error. (The box itself is errorbox_x11.cpp.)
#include "errorbox.h"
#include "errorbox_posix.h"

#include <stdarg.h>
#include <stdio.h>
#include <string.h>

namespace {

struct MessageText {
    int32_t id;
    const char* text;
};

const MessageText kMessages[] = {
    {kMessageVmLibraryNotLoaded,
     "The Java runtime could not be loaded from jre/lib/server/libjvm.so in the application folder. Please "
     "reinstall QZ-Lumiscope QZ-57."},
    {kMessageMainClassNotCalled,
     "The application could not be started: its main class com.qz.kpo.emu57.app.ApplicationMainForm was not "
     "found in emu57.jar. Please reinstall QZ-Lumiscope QZ-57."},
    {kMessageVmNotCreated,
     "The Java virtual machine could not be created. Please check that enough memory is free and reinstall "
     "QZ-Lumiscope QZ-57 if the problem persists."},
    {kMessageCaption, "QZ-Lumiscope QZ-57"},
};

}  // namespace

char* LoadMessageText(int32_t id) {
    for (const MessageText& message : kMessages) {
        if (message.id == id) return strdup(message.text);
    }
    return nullptr;
}

void ReportCause(const char* format, ...) {
    char cause[1024];
    va_list args;
    va_start(args, format);
    vsnprintf(cause, sizeof cause, format, args);
    va_end(args);
    fprintf(stderr, "QZ-Lumiscope_QZ-57: %s\n", cause);
    fflush(stderr);
}
