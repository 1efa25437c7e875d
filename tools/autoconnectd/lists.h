// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_LISTS_H
#define KESBT_AUTOCONNECTD_LISTS_H

#include <bluetooth/adapter_list.h>
#include <bluetooth/auto_connect.h>
#include <bluetooth/device_list.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

namespace AutoConnectd {

/// The auto-connect files, and what a person is told of them: a file that cannot be used, once, and
/// entries that were removed because no adapter knows them.
class Lists {
public:
    /// Reads the devices to connect.
    /// @param adapters those there are, or null
    /// @return null when the daemon does not answer
    std::unique_ptr<Bluetooth::DeviceList> read(Bluetooth::AdapterList* adapters);
    /// Whether reading them has changed a file, which makes the library ask for another reading.
    bool havePruned() const { return m_havePruned; }

private:
    std::vector<std::string> entriesOf(const std::string& adapter) const;
    void noteProblem(const std::string& adapter);
    void notePruned(Bluetooth::Adapter& adapter, const std::string& address,
                    const std::vector<std::string>& before);

    Bluetooth::AutoConnect m_files;
    std::map<std::string, std::string> m_problems; // by the adapter's address, as logged
    bool m_havePruned = false;
};

} // namespace AutoConnectd

#endif
