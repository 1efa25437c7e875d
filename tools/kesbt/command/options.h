// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_OPTIONS_H
#define KESBT_COMMAND_OPTIONS_H

#include "command/limit.h"

#include <string>

namespace Kesbt {

/// What every verb obeys.
struct Options {
    bool json = false;
    std::string adapter; ///< "hci0" or an address; "" for the daemon's default adapter
    TimeLimit limit;
};

} // namespace Kesbt

#endif
