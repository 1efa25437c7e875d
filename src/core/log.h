// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_LOG_H
#define KESBLUETOOTH_CORE_LOG_H

namespace Bluetooth {

/// Where a log line says that it comes from: a source file without its folder, and a line.
struct LogPlace {
    const char* file;
    int line;
};

/// Writes a failure to the system log as "FILE:LINE MESSAGE".
__attribute__((format(printf, 2, 3))) void logError(LogPlace place, const char* format, ...);

} // namespace Bluetooth

/// The LogPlace of this very line: logError(KES_HERE, "Match error (%s)", text).
#define KES_HERE                                                                                   \
    ::Bluetooth::LogPlace {                                                                        \
        __FILE_NAME__, __LINE__                                                                    \
    }

#endif
