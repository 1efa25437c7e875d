// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_AUTOCONNECT_LIST_H
#define KESBT_DAEMON_AUTOCONNECT_LIST_H

#include <string>
#include <vector>

namespace Kesbt {

/// An adapter's auto-connect list as it is in its file: unlike the library's lists with the devices
/// that no adapter knows, and without the daemon.
class AutoConnectList {
public:
    /// @param adapter the adapter's address
    /// A Failure when there is a file that cannot be read. A missing one is disabled and empty.
    explicit AutoConnectList(const std::string& adapter);

    const std::string& path() const { return m_path; }
    bool isEnabled() const;
    std::vector<std::string> devices() const;

    bool has(const std::string& device) const;
    void add(const std::string& device);
    void remove(const std::string& device);

    /// A Failure that says what is missing when the file cannot be written or created.
    void checkWritable() const;
    /// Writes it, with the flag given, and reads it back. A Failure when that is not possible.
    void write(bool enable);

private:
    std::string list() const { return m_content.substr(m_content.empty() ? 0 : 1); }
    void read();

    std::string m_adapter;
    std::string m_path;
    std::string m_content = "0";
};

} // namespace Kesbt

#endif
