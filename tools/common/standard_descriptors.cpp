// SPDX-License-Identifier: LGPL-2.1-or-later
#include "common/standard_descriptors.h"

#include <fcntl.h>
#include <unistd.h>

#include <initializer_list>

namespace Tools {

bool openStandardDescriptors() {
    bool canPrint = true;
    for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (fcntl(standard, F_GETFD) >= 0)
            continue;
        const int opened = open("/dev/null", O_RDWR); // the lowest free one, which is this one
        if (standard == STDOUT_FILENO || opened < 0)
            canPrint = false;
    }
    return canPrint;
}

} // namespace Tools
