// SPDX-License-Identifier: LGPL-2.1-or-later
// Stands in for bluetoothd: puts itself into the background and waits to be killed.

#include <unistd.h>

int main() {
    // Descriptors 0 to 2 go to /dev/null; what else it inherited stays open, for the tests to see.
    if (daemon(0, 0) != 0)
        return 1;
    for (;;)
        pause();
}
