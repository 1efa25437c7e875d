// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/profile.h"
#include "verbs/list.h"

#include <bluetooth/input.h>

namespace Kesbt {

namespace {

template <bool Connected>
void change(const Options& options, const std::string& address) {
    using Bluetooth::Input;
    const Profile<Input> input(options, address, Input::getInput, "keyboard, mouse or buttons");
    setConnected(options, *input.proxy, address, Connected);
    input.print(options, address, "input");
}

} // namespace

const Verb inputVerb = {
    "input",
    "Devices",
    "Connect or disconnect a keyboard or mouse",
    "kesbt input connect 00:11:22:33:44:55\n"
    "kesbt input disconnect 00:11:22:33:44:55 --json",
    {{"connect", "Connect a known keyboard, mouse or the like", Limit::Steps,
      oneDevice(change<true>, knownDevices)},
     {"disconnect", "Disconnect it", Limit::Steps, oneDevice(change<false>, knownDevices)}}};

} // namespace Kesbt
