// Argument forwarding: one connection to port 6152 of the local host carrying every argument after
// argv[0], hex-encoded, one send each, nothing between them; the close ends the message. Five
// connection attempts, each failure followed by a 5 s pause. The socket calls are the platform's
// (instance_platform.h).
#include "instance.h"
#include "instance_platform.h"

#include "../text/text.h"

#include <string.h>

namespace {
const int ConnectAttempts = 5;
const uint32_t ConnectRetryDelay = 5000;  // ms
}  // namespace

Status ForwardArguments(char16_t** argv, int32_t argc) {
    if (!HandOffStart()) return -1;

    HandOffLink link = {kNoHandOffSocket, 0, false};
    bool connected = false;
    for (int attempt = 0; attempt < ConnectAttempts && !connected; ++attempt) {
        int outcome = HandOffConnect(&link);
        if (outcome < 0) return -1;
        connected = outcome > 0;
        if (!connected) PauseMs(ConnectRetryDelay);
    }
    if (!connected) return -1;

    // The buffer starts empty and an empty argument leaves it as it is: an empty first argument
    // sends nothing, a later one repeats the argument before it. A failed send drops that argument
    // only. The buffer lives until the process ends, which follows at once.
    EncodeBuffer encoded = {nullptr, 0};
    for (int32_t i = 1; i < argc; ++i) {
        if (!EncodeArgument(argv[i], &encoded)) continue;  // out of memory: this argument is dropped
        const char* text = encoded.text != nullptr ? encoded.text : "";
        HandOffSend(link, text, strlen(text));
    }
    HandOffClose(&link);
    return 0;
}
