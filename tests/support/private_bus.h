// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_PRIVATE_BUS_H
#define KESBLUETOOTH_TESTS_PRIVATE_BUS_H

#include "support/child_process.h"

#include <memory>
#include <string>

namespace Bluetooth::Test {

/// A message bus of the test's own, instead of the machine's. libdbus looks up the address of each
/// bus only once in a process, so all buses of a kind in one process have the same address, and
/// one of each kind can run at a time.
class PrivateBus {
public:
    enum class Kind { System, Session };

    /// Sets the kind's address in the environment and starts the bus.
    /// @param configuration more elements of the bus's configuration file, e.g. <servicedir>
    explicit PrivateBus(Kind kind, const std::string& configuration = "");

    /// Where it is or would be; in the environment from now on.
    static std::string address(Kind kind);

    const std::string& address() const { return m_address; }
    pid_t pid() const { return m_daemon->pid(); }
    void kill() { m_daemon->kill(); }
    /// Starts it again at the same address after kill().
    void start();

private:
    std::string m_address;
    std::string m_configurationFile;
    std::unique_ptr<ChildProcess> m_daemon;
};

/// A folder for the files of this process's tests, gone at its end.
const std::string& testFolder();

} // namespace Bluetooth::Test

#endif
