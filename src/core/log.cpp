#include "core/log.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>
#include <vector>

namespace Bluetooth {

void logError(LogPlace place, const char* format, ...) {
    va_list args;
    va_start(args, format);
    va_list again;
    va_copy(again, args);
    const int length = vsnprintf(nullptr, 0, format, args);
    va_end(args);

    // Messages carry file names and peers' error texts: their length has no bound of ours.
    std::vector<char> message(length < 0 ? 1 : static_cast<std::size_t>(length) + 1, '\0');
    if (length > 0)
        vsnprintf(message.data(), message.size(), format, again);
    va_end(again);
    syslog(LOG_ERR, "%s:%d %s", place.file, place.line, message.data());
}

} // namespace Bluetooth
