// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command/verb.h"

#include "show/text.h"

#include <cstdlib>

namespace Kesbt {

Build noArguments(void (*action)(const Options&)) {
    return [action](const Syntax& syntax) {
        return [action, &options = syntax.options] { action(options); };
    };
}

Build oneDevice(DeviceAction action, Offer offer) {
    return [action, offer](const Syntax& syntax) {
        return [action, &options = syntax.options, address = addAddress(syntax, offer)] {
            action(options, *address);
        };
    };
}

std::shared_ptr<std::string> addAddress(const Syntax& syntax, Offer offer) {
    auto address = std::make_shared<std::string>();
    const CLI::Option* argument =
        syntax.app.add_option("ADDRESS", *address, "The device, e.g. 00:11:22:33:44:55")
            ->required()
            ->type_name("")
            ->transform(addressInCapitals)
            ->check([](const std::string& text) {
                return isAddress(text) ? std::string()
                                       : quoted(text) + " is no address such as 00:11:22:33:44:55";
            });
    if (offer)
        syntax.completion.offer(
            argument, [offer, &options = syntax.options](const auto&) { return offer(options); });
    return address;
}

std::shared_ptr<double> addSeconds(const Syntax& syntax, const std::string& name,
                                   const std::string& description) {
    auto seconds = std::make_shared<double>(0);
    syntax.app.add_option(name, *seconds, description)->type_name("SECONDS")->check(checkSeconds);
    return seconds;
}

std::string checkSeconds(const std::string& text) {
    constexpr double longest = 1e6;
    char* end = nullptr;
    const double seconds = std::strtod(text.c_str(), &end);
    const bool usable = end != text.c_str() && *end == '\0' && seconds > 0 && seconds <= longest;
    return usable ? "" : quoted(text) + " is no time such as 10 or 0.5";
}

} // namespace Kesbt
