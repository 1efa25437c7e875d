// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/failure.h"
#include "show/output.h"
#include "show/text.h"
#include "verbs/list.h"

#include <bluetooth/commandlib.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iostream>

namespace Kesbt {

namespace {

Failure failure(const std::string& address, int reason) {
    std::string line = "cannot get the name of " + address;
    if (reason == EPERM || reason == EACCES)
        return Failure(line + ": " + std::strerror(reason) + "; run it as root");
    if (reason == EAFNOSUPPORT || reason == EPROTONOSUPPORT)
        return Failure(line +
                       ": this kernel has no Bluetooth; load it as root (modprobe bluetooth), "
                       "or ask bluetoothd: kesbt device " +
                       address);
    if (reason == ENODEV)
        return Failure(line + ": no adapter is on; switch one on: kesbt adapter set Powered true");
    if (reason != 0)
        line += std::string(": ") + std::strerror(reason);
    return Failure(line + "; make sure that the device is on and within reach");
}

void showName(const Options& options, const std::string& address) {
    constexpr int longestName = 249; // HCI's 248 bytes and the end
    const int timeoutMs = options.limit.isGiven() ? static_cast<int>(options.limit.step().count())
                                                  : Bluetooth::GET_NAME_TIMEOUT_DEFAULT;
    printHint("Asking " + address + " for its name");
    char name[longestName] = "";
    errno = 0;
    if (Bluetooth::getNameFromAddr(address.c_str(), name, sizeof name,
                                   static_cast<Bluetooth::GetNameTimeout>(
                                       std::max(timeoutMs, 1))) != 0) // 0 would be for ever
        throw failure(address, errno);
    if (options.json)
        printDocument({{"address", address}, {"name", name}});
    else
        std::cout << printable(name) << '\n';
}

} // namespace

const Verb nameVerb = {"name",
                       "Host",
                       "Ask a device within reach for its name, without bluetoothd",
                       "kesbt name 00:11:22:33:44:55\n"
                       "kesbt name 00:11:22:33:44:55 --timeout 2",
                       {{Limit::OnlyGiven, oneDevice(showName)}}};

} // namespace Kesbt
