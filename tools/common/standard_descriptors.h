// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMON_STANDARD_DESCRIPTORS_H
#define KESBT_COMMON_STANDARD_DESCRIPTORS_H

namespace Tools {

/// Opens /dev/null in place of standard descriptors that are closed. The next file or socket would
/// take their number otherwise, and be written to or closed as if it was standard.
/// @return false when standard output was closed, or /dev/null cannot be opened
bool openStandardDescriptors();

} // namespace Tools

#endif
