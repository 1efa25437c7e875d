// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/commandlib.h>

#include <bluetooth/bluetooth.h>
#include <bluetooth/hci.h>
#include <bluetooth/hci_lib.h>

#include <algorithm>
#include <cstring>

namespace Bluetooth {

int getNameFromAddr(const char* address, char* name, int size, GetNameTimeout timeout) {
    if (!name || size < 1 || !address)
        return -1;
    bdaddr_t remote;
    if (str2ba(address, &remote) != 0)
        return -1;
    const int adapter = hci_get_route(&remote);
    if (adapter < 0)
        return -1;
    const int device = hci_open_dev(adapter);
    if (device < 0)
        return -1;

    char found[HCI_MAX_NAME_LENGTH] = {};
    const int result =
        hci_read_remote_name(device, &remote, static_cast<int>(sizeof(found)), found, timeout);
    hci_close_dev(device);
    if (result < 0)
        return -1;

    // A name of the full length comes without a terminator.
    const std::size_t length =
        std::min(strnlen(found, sizeof(found)), static_cast<std::size_t>(size) - 1);
    memcpy(name, found, length);
    name[length] = '\0';
    return 0;
}

} // namespace Bluetooth
