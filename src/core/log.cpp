// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/log.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>
#include <memory>
#include <new>

namespace Bluetooth {

void logError(LogPlace place, const char* format, ...) {
    va_list args;
    va_start(args, format);
    va_list again;
    va_copy(again, args);
    char line[512];
    // NOLINTNEXTLINE(clang-analyzer-valist.Uninitialized): begun above
    const int length = vsnprintf(line, sizeof line, format, args);
    va_end(args);

    // Messages carry file names and peers' error texts: their length has no bound of ours. Without
    // memory a long one is cut: it is logged in destructors and inside libdbus, so nothing may be
    // thrown from here.
    const char* message = length < 0 ? "" : line;
    std::unique_ptr<char[]> whole;
    if (length >= static_cast<int>(sizeof line)) {
        const std::size_t size = static_cast<std::size_t>(length) + 1;
        whole.reset(new (std::nothrow) char[size]);
        if (whole && vsnprintf(whole.get(), size, format, again) >= 0)
            message = whole.get();
    }
    va_end(again);
    syslog(LOG_ERR, "%s:%d %s", place.file, place.line, message);
}

} // namespace Bluetooth
