// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_SHOWN_TEXT_H
#define KESBT_AUTOCONNECTD_SHOWN_TEXT_H

#include <string>
#include <string_view>

namespace AutoConnectd {

/// Bytes that others have written, for the log: what is no printable ASCII is escaped.
std::string shownText(std::string_view bytes);

} // namespace AutoConnectd

#endif
