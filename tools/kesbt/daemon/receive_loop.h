#ifndef KESBT_DAEMON_RECEIVE_LOOP_H
#define KESBT_DAEMON_RECEIVE_LOOP_H

#include "show/failure.h"

#include <bluetooth/remote_object.h>

namespace Kesbt {

/// Delivers the library's signals while it lives. A program can run it once.
class ReceiveLoop {
public:
    /// @param proxy must outlive the loop
    explicit ReceiveLoop(Bluetooth::RemoteObject& proxy) : m_proxy(proxy) {
        if (proxy.startLoop() != 0)
            throw Failure("cannot start a thread; close other programs and try again");
    }
    ~ReceiveLoop() {
        m_proxy.stopLoop();
        m_proxy.waitLoop();
    }
    ReceiveLoop(const ReceiveLoop&) = delete;
    ReceiveLoop& operator=(const ReceiveLoop&) = delete;

private:
    Bluetooth::RemoteObject& m_proxy;
};

} // namespace Kesbt

#endif
