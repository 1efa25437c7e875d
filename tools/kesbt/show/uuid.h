// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_UUID_H
#define KESBT_SHOW_UUID_H

#include <string>

namespace Kesbt {

/// What a service UUID stands for, e.g. "Audio Sink" for "0000110b-0000-1000-8000-00805f9b34fb"
/// and for the short form "0x110b"; "" when it is none or not a common one.
std::string uuidName(const std::string& uuid);

} // namespace Kesbt

#endif
