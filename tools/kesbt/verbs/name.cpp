// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/failure.h"
#include "show/output.h"
#include "show/text.h"
#include "verbs/list.h"

#include <bluetooth/commandlib.h>

#include <cerrno>
#include <cstring>
#include <iostream>

namespace Kesbt {

namespace {

Failure failure(const std::string& address, int reason) {
    std::string line = "cannot get the name of " + address;
    if (reason == EPERM || reason == EACCES)
        return Failure(line + ": " + std::strerror(reason) + "; run it as root");
    if (reason == ENODEV || reason == EAFNOSUPPORT)
        return Failure(line + ": no adapter is on; switch one on: kesbt adapter set Powered true");
    if (reason != 0)
        line += std::string(": ") + std::strerror(reason);
    return Failure(line + "; make sure that the device is on and within reach");
}

void showName(const Options& options, const std::string& address, int timeoutMs) {
    constexpr int longestName = 249; // HCI's 248 bytes and the end
    char name[longestName] = "";
    errno = 0;
    if (Bluetooth::getNameFromAddr(address.c_str(), name, sizeof name,
                                   static_cast<Bluetooth::GetNameTimeout>(timeoutMs)) != 0)
        throw failure(address, errno);
    if (options.json)
        printDocument({{"address", address}, {"name", name}});
    else
        std::cout << printable(name) << '\n';
}

Action build(const Syntax& syntax) {
    const auto address = addAddress(syntax);
    auto timeoutMs = std::make_shared<int>(0);
    syntax.app
        .add_option("--timeout", *timeoutMs,
                    "How long the device may take, in milliseconds\n(default: 10000)")
        ->type_name("MS")
        ->check([](const std::string& text) {
            constexpr std::size_t longest = 8;
            const bool isNumber = !text.empty() && text.size() <= longest && text[0] != '0' &&
                                  text.find_first_not_of("0123456789") == std::string::npos;
            return isNumber ? std::string() : quoted(text) + " is no time such as 5000";
        });
    return [&options = syntax.options, address, timeoutMs] {
        int limit = *timeoutMs;
        if (limit == 0) // before the verb it is the option of every verb
            limit = options.limit.isGiven() ? static_cast<int>(options.limit.step().count())
                                            : Bluetooth::GET_NAME_TIMEOUT_DEFAULT;
        showName(options, *address, limit);
    };
}

} // namespace

const Verb nameVerb = {"name",
                       "Host",
                       "Ask a device within reach for its name, without bluetoothd",
                       "kesbt name 00:11:22:33:44:55\n"
                       "kesbt name 00:11:22:33:44:55 --timeout 2000",
                       {{Limit::OnlyGiven, build}}};

} // namespace Kesbt
