// Self-protection checks on POSIX systems: our own executable file (read through /proc/self/exe)
// against the checksum stamped into it after linking, and the kernel's word on a tracer.
//
// The stamp lives in the data of the executable: a marker the build looks for, then four bytes
// that tools/stamp_checksum.py fills with the file's checksum (those four bytes counted as zero).
#include "protection.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#if defined(LAUNCHER_PROTECTION) && LAUNCHER_PROTECTION

namespace {

const size_t kMarkerBytes = 12;
// Not const: the compiler must keep the bytes in the file, and the check reads them at run time.
unsigned char imageStamp[kMarkerBytes + 4] = {'Q', 'Z', '5', '7', '-', 'S', 'T', 'A', 'M', 'P', '-', '1', 0, 0, 0, 0};

const long kLargestImage = 64l << 20;

}  // namespace

Status ProtectionCheckImage() {
    FILE* file = fopen("/proc/self/exe", "rbe");
    if (file == nullptr) return kProtectionImageUnreadable;
    Status result = kProtectionImageUnreadable;
    long size = fseek(file, 0, SEEK_END) == 0 ? ftell(file) : -1;
    uint8_t* image = size > 0 && size < kLargestImage ? static_cast<uint8_t*>(malloc(static_cast<size_t>(size))) : nullptr;
    if (image != nullptr && fseek(file, 0, SEEK_SET) == 0 && fread(image, 1, static_cast<size_t>(size), file) == static_cast<size_t>(size)) {
        // The marker appears once in the file: in the data of imageStamp itself.
        const uint8_t* marker = static_cast<const uint8_t*>(memmem(image, static_cast<size_t>(size), imageStamp, kMarkerBytes));
        if (marker != nullptr) {
            result = VerifyStampedChecksum(image, static_cast<uint32_t>(size), static_cast<uint32_t>(marker - image + kMarkerBytes));
        }
    }
    free(image);
    fclose(file);
    return result;
}

// "TracerPid:" of /proc/self/status is not 0 while a debugger or tracer is attached.
Status ProtectionCheckDebugger() {
    FILE* status = fopen("/proc/self/status", "re");
    if (status == nullptr) return kProtectionPassed;
    char line[256];
    long tracer = 0;
    while (fgets(line, sizeof line, status) != nullptr) {
        if (strncmp(line, "TracerPid:", 10) == 0) tracer = strtol(line + 10, nullptr, 10);
    }
    fclose(status);
    return tracer != 0 ? kProtectionDebuggerLocal : kProtectionPassed;
}

#else

Status ProtectionCheckImage() { return kProtectionPassed; }
Status ProtectionCheckDebugger() { return kProtectionPassed; }

#endif
