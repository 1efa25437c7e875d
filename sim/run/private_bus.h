#ifndef KESBLUETOOTH_SIM_RUN_PRIVATE_BUS_H
#define KESBLUETOOTH_SIM_RUN_PRIVATE_BUS_H

#include <string>
#include <vector>

#include <sys/types.h>

namespace Bluetooth::Sim {

/// A dbus-daemon of our own that allows everything to everyone who can reach its socket.
class PrivateBus {
public:
    /// Starts it and waits until it listens.
    /// @param folder  where its configuration and its socket go
    /// @param type  "system" or "session", which also names the files
    /// @param serviceFolders  where it looks for services that it can start
    /// @param environment  what those services find set
    /// @throw std::runtime_error  with a text for the user
    PrivateBus(const std::string& folder, const std::string& type,
               const std::vector<std::string>& serviceFolders,
               const std::vector<std::string>& environment);
    PrivateBus(const PrivateBus&) = delete;
    PrivateBus& operator=(const PrivateBus&) = delete;
    /// Stops it and waits for its end.
    ~PrivateBus();

    const std::string& address() const { return m_address; }
    pid_t pid() const { return m_pid; }

private:
    std::string m_address;
    pid_t m_pid = 0;
};

} // namespace Bluetooth::Sim

#endif
