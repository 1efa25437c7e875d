// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_SIGNAL_DELIVERY_H
#define KESBT_DAEMON_SIGNAL_DELIVERY_H

#include "show/failure.h"

#include <bluetooth/remote_object.h>

namespace Kesbt {

/// Delivers the library's signals while it lives. A program can run it once.
class SignalDelivery {
public:
    /// @param proxy must outlive this
    explicit SignalDelivery(Bluetooth::RemoteObject& proxy) : m_proxy(proxy) {
        if (proxy.startLoop() != 0)
            throw Failure("cannot start a thread; close other programs and try again");
    }
    ~SignalDelivery() {
        m_proxy.stopLoop();
        m_proxy.waitLoop();
    }
    SignalDelivery(const SignalDelivery&) = delete;
    SignalDelivery& operator=(const SignalDelivery&) = delete;

private:
    Bluetooth::RemoteObject& m_proxy;
};

} // namespace Kesbt

#endif
