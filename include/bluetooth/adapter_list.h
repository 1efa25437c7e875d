// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_ADAPTER_LIST_H
#define KESBLUETOOTH_ADAPTER_LIST_H

#include <bluetooth/export.h>

#include <vector>

namespace Bluetooth {

class Adapter;

/// Adapters in the daemon's order. The list owns them and deletes them with itself: to keep one,
/// set its element to null or take it out of the list.
///
/// An element is null when the daemon left the bus while the list was being made.
class KESBLUETOOTH_API AdapterList : public std::vector<Adapter*> {
public:
    AdapterList() = default;
    AdapterList(const AdapterList&) = delete;
    AdapterList& operator=(const AdapterList&) = delete;
    virtual ~AdapterList();
};

} // namespace Bluetooth

#endif
