// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_LOCAL_END_H
#define KESBLUETOOTH_SIM_DAEMON_LOCAL_END_H

#include <optional>
#include <string>

#include <termios.h>

namespace Bluetooth::Sim {

/// What a serial proxy connects devices to on this machine: a terminal, a Unix socket ("x00" stands
/// for the first byte of an abstract one), or a port ("localhost:1234").
class LocalEnd {
public:
    /// @return nothing for any other address, or a terminal that cannot be opened
    static std::optional<LocalEnd> at(const std::string& address);

    const std::string& address() const { return m_address; }
    /// @return a descriptor that the caller owns, or -1
    int open() const;
    /// Each sets what a terminal is opened with. @return false when that is not supported
    bool setRate(const std::string& rate);
    bool setDataBits(unsigned bits);
    bool setStopBits(unsigned bits);
    bool setParity(const std::string& parity);

private:
    enum class Kind { Terminal, Unix, Tcp };

    LocalEnd(Kind kind, std::string address) : m_kind(kind), m_address(std::move(address)) {}

    int openTerminal() const;
    int connectUnix() const;
    int connectTcp() const;

    Kind m_kind;
    std::string m_address;
    termios m_settings{};
};

} // namespace Bluetooth::Sim

#endif
