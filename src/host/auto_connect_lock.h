// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_AUTO_CONNECT_LOCK_H
#define KESBLUETOOTH_HOST_AUTO_CONNECT_LOCK_H

#include "core/descriptor.h"

namespace Bluetooth {

/// Held from reading a list to replacing it, so that no other change comes in between. The daemon
/// may not be called meanwhile: one that hangs would keep every program from its lists.
///
/// It is a lock of the file .lock in the folder of the lists, which only its owner can open: any
/// user who can read the folder could lock that for ever.
class AutoConnectLock {
public:
    /// Waits for the lock. Goes without where it cannot be had, as in a folder that is read-only.
    AutoConnectLock();
    AutoConnectLock(const AutoConnectLock&) = delete;
    AutoConnectLock& operator=(const AutoConnectLock&) = delete;
    ~AutoConnectLock();

    bool isHeld() const { return m_isHeld; }

private:
    const Descriptor m_file;
    bool m_isHeld = false;
};

} // namespace Bluetooth

#endif
