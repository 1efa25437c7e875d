// SPDX-License-Identifier: LGPL-2.1-or-later
// kesbt: works with Bluetooth from the command line, through BlueZ 4's bluetoothd.

#include "command/command_line.h"
#include "common/standard_descriptors.h"
#include "daemon/objects.h"
#include "show/failure.h"
#include "show/output.h"
#include "show/text.h"
#include "verbs/list.h"

#include <bluetooth/connection.h>

#include <dbus/dbus.h>

#include <iostream>

namespace Kesbt {

namespace {

void run(int argc, char** argv) {
#define KESBT_ENTRY(name) &name##Verb,
    CommandLine({KESBT_VERBS(KESBT_ENTRY)}, adapterNames).run(argc, argv);
#undef KESBT_ENTRY
    flushOutput();
}

} // namespace

} // namespace Kesbt

int main(int argc, char** argv) {
    // Without this libdbus ignores SIGPIPE, and "kesbt monitor | head" would not end.
    dbus_connection_set_change_sigpipe(false);
    Bluetooth::Connection::checkSenders(true); // any user of the machine can send signals
    try {
        if (!Tools::openStandardDescriptors())
            throw Kesbt::Failure("standard output is closed; give results somewhere to go");
        Kesbt::run(argc, argv);
        return 0;
    } catch (const Kesbt::Failure& failure) {
        std::cout.flush();
        std::cerr << failure.what() << '\n';
        return failure.status();
    } catch (const std::exception& error) {
        std::cerr << "kesbt: " << Kesbt::printable(error.what()) << "; please report this\n";
        return 1;
    }
}
