// SPDX-License-Identifier: LGPL-2.1-or-later
// kesbt: works with Bluetooth from the command line, through BlueZ 4's bluetoothd.

#include "command/command_line.h"
#include "daemon/objects.h"
#include "show/failure.h"
#include "show/output.h"
#include "show/text.h"
#include "verbs/list.h"

#include <bluetooth/connection.h>

#include <dbus/dbus.h>
#include <fcntl.h>
#include <unistd.h>

#include <iostream>

namespace Kesbt {

namespace {

/// A closed standard descriptor would be taken by the next socket, and results be written there.
void checkDescriptors() {
    for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (fcntl(standard, F_GETFD) >= 0)
            continue;
        const int opened = open("/dev/null", O_RDWR); // the lowest free one
        if (standard == STDOUT_FILENO || opened < 0)
            throw Failure("standard output is closed; give results somewhere to go");
    }
}

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
        Kesbt::checkDescriptors();
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
