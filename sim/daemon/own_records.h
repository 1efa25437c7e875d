// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_OWN_RECORDS_H
#define KESBLUETOOTH_SIM_DAEMON_OWN_RECORDS_H

#include <glib.h>

#include <functional>
#include <map>
#include <set>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// The service records of the daemon itself: one list, with handles of their own, for all adapters.
class OwnRecords {
public:
    /// @param changed  called with the id of an adapter that has got or lost a record
    explicit OwnRecords(std::function<void(const std::string& adapter)> changed);

    struct Record {
        std::string adapter; ///< "hci0"; "" when all adapters have it
        std::string uuid;    ///< its service class, in full, or ""
        std::string owner;   ///< the unique name of the client that added it; "" for the daemon's
    };

    /// An adapter comes, or goes with its records.
    void plugIn(const std::string& adapter);
    void pullOut(const std::string& adapter);

    /// @param handle  a free one; 0 for the lowest that is
    /// @return the handle
    guint32 add(const Record& record, guint32 handle = 0);
    void remove(guint32 handle);
    /// The record with that handle, or null.
    const Record* find(guint32 handle) const;

    /// The bits for services in a class of device that clients' records bring with them.
    guint32 classBits(const std::string& adapter) const;
    /// The service classes of an adapter's records in the order of their handles.
    std::vector<std::string> uuids(const std::string& adapter) const;

private:
    void insert(guint32 handle, const std::string& adapter);

    std::function<void(const std::string& adapter)> m_changed;
    std::map<guint32, Record> m_records;
    std::map<std::string, std::multiset<guint32>> m_handles; ///< of each adapter
};

} // namespace Bluetooth::Sim

#endif
