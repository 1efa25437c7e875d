// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_SESSION_SESSION_H
#define KESBLUETOOTH_SERVING_SESSION_SESSION_H

#include "serving/session/process.h"
#include "serving/session/signal_relay.h"
#include "serving/session/temporary_folder.h"

#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Serving {

/// A kind of bus, and the variable by which programs find theirs.
struct BusKind {
    const char* name;
    const char* variable;
};

inline constexpr BusKind systemBus = {"system", "DBUS_SYSTEM_BUS_ADDRESS"};
inline constexpr BusKind sessionBus = {"session", "DBUS_SESSION_BUS_ADDRESS"};

/// A command on private buses with whatever serves there: `PROGRAM -- COMMAND`.
///
/// Buses and helpers are started one by one; each finds the buses that were started before it, and
/// no other. With the session everything goes, the last started first, and so does what the command
/// left running. A process has one session at a time, since it becomes the parent of all orphans.
class Session {
public:
    /// The descriptor on which a helper reports that it is ready.
    static constexpr int readyFd = 3;

    /// @param program  our name, for messages and for the folder with the sockets
    /// @throw std::runtime_error  when that folder cannot be made
    explicit Session(std::string program);
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;
    ~Session();

    /// Starts a bus that allows everything, and waits until it listens.
    /// @param serviceFolders  where it looks for services that it can start
    /// @throw std::runtime_error  with a text for the user
    void startBus(const BusKind& kind, const std::vector<std::string>& serviceFolders = {});

    /// Starts a program that serves on the buses, and waits until it has reported that it is ready.
    /// @param arguments  its command line, by which it learns of `readyFd`
    /// @param description  what it is, for the user
    /// @throw std::runtime_error  with a text for the user
    void startHelper(const std::vector<std::string>& arguments, const std::string& description);

    /// Runs the command and waits for its end. It keeps the caller's address of a bus that was not
    /// started.
    /// @return its exit status; 128 + the signal that ended it; 126 or 127 when it cannot be run
    int run(const std::vector<std::string>& command);

private:
    std::vector<std::string> helperEnvironment() const;
    int cannotRun(const std::string& command) const;
    int spawnAndWait(const std::vector<std::string>& command);
    void endOrphans() const;

    std::string m_program;
    SignalRelay m_relay;
    TemporaryFolder m_folder;
    std::vector<std::string> m_addresses; ///< of the buses, as "VARIABLE=ADDRESS"
    std::vector<std::unique_ptr<HelperProcess>> m_helpers;
};

} // namespace Bluetooth::Serving

#endif
