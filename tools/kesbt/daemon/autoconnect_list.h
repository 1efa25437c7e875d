// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_AUTOCONNECT_LIST_H
#define KESBT_DAEMON_AUTOCONNECT_LIST_H

#include <bluetooth/auto_connect.h>

#include <functional>
#include <string>
#include <vector>

namespace Kesbt {

/// An adapter's auto-connect list as it is in its file: unlike the library's lists with the devices
/// that no adapter knows, and without the daemon.
class AutoConnectList {
public:
    using List = Bluetooth::AutoConnect::List;

    /// @param adapter the adapter's address
    /// A Failure when there is a file that cannot be read. A missing one is disabled and empty.
    explicit AutoConnectList(const std::string& adapter);

    std::string path() const;
    const std::string& adapter() const { return m_adapter; }
    bool isEnabled() const { return m_list.isEnabled; }
    const std::vector<std::string>& devices() const { return m_list.devices; }

    /// A Failure that says what is missing when the file cannot be written or created.
    void checkWritable() const;
    /// Changes it, as it is now, in one step. A Failure when that is not possible.
    void change(const std::function<void(List&)>& change);

private:
    std::string m_adapter;
    List m_list;
};

} // namespace Kesbt

#endif
