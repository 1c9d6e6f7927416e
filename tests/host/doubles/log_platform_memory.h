#ifndef TESTS_HOST_DOUBLES_LOG_PLATFORM_MEMORY_H
#define TESTS_HOST_DOUBLES_LOG_PLATFORM_MEMORY_H
#include <string>
#include <vector>

#include "log/log.h"

namespace logdouble {
extern std::vector<std::u16string> pieces;
extern std::u16string openedPath;
extern int opens;
extern bool closed;
}  // namespace logdouble
#endif
