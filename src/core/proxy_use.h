// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_PROXY_USE_H
#define KESBLUETOOTH_CORE_PROXY_USE_H

#include <bluetooth/remote_object.h>

#include <thread>

namespace Bluetooth {

/// While it lives, this thread uses a proxy. One thread at a time may: a debug build ends the
/// program when two do at once. Threads that use a proxy one after the other are fine.
///
/// What other threads may do meanwhile is no use: reading what never changes; startLoop() and
/// subscribing, whose callbacks may run before they return, stopLoop() and waitLoop(); running the
/// proxy's callbacks; recording in the loop's proxy that a signal could not be decoded. Nor is the
/// part of the destructor that waits for callbacks, which may still use the proxy.
#ifndef KESBLUETOOTH_CHECK_THREADS

class [[maybe_unused]] ProxyUse {
public:
    explicit ProxyUse(const RemoteObject&) {}
    static void checkNone(const RemoteObject&) {}
};

#else

class ProxyUse {
public:
    explicit ProxyUse(const RemoteObject& proxy);
    ~ProxyUse();
    ProxyUse(const ProxyUse&) = delete;
    ProxyUse& operator=(const ProxyUse&) = delete;

    /// Ends the program when the proxy, which is about to go, is used on any thread.
    static void checkNone(const RemoteObject& proxy);

private:
    static ProxyUse* all;

    const RemoteObject* const m_proxy;
    const std::thread::id m_thread;
    ProxyUse* m_other = nullptr; // of any proxy
};

#endif

} // namespace Bluetooth

#endif
