#ifndef KESBT_COMMAND_OPTIONS_H
#define KESBT_COMMAND_OPTIONS_H

#include <chrono>
#include <string>

namespace Kesbt {

/// What every verb obeys.
struct Options {
    bool json = false;
    std::string adapter;  ///< "hci0" or an address; "" for the daemon's default adapter
    double timeout = 25;  ///< seconds within which the daemon answers and a change shows
    bool limited = false; ///< whether the user gave the time-out

    std::chrono::milliseconds timeLimit() const {
        return std::chrono::milliseconds(static_cast<long>(timeout * 1000));
    }
};

} // namespace Kesbt

#endif
