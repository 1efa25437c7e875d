// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/proxy_use.h"

#ifdef KESBLUETOOTH_CHECK_THREADS

#include <cstdio>
#include <cstdlib>
#include <mutex>

namespace Bluetooth {

namespace {

/// For the uses of all proxies.
std::mutex& mutex() {
    static auto& instance = *new std::mutex; // a receive thread may outlive main()
    return instance;
}

[[noreturn]] void fail(const char* what, const RemoteObject& proxy) {
    std::fprintf(stderr, "libkesbluetooth: %s: %s (%s)\n", what, proxy.getPath(),
                 proxy.getInterface());
    std::abort();
}

} // namespace

ProxyUse* ProxyUse::all = nullptr;

ProxyUse::ProxyUse(const RemoteObject& proxy)
    : m_proxy(&proxy), m_thread(std::this_thread::get_id()) {
    const std::lock_guard<std::mutex> lock(mutex());
    for (const ProxyUse* use = all; use; use = use->m_other) {
        if (use->m_proxy == m_proxy && use->m_thread != m_thread)
            fail("two threads use a proxy at once", proxy);
    }
    m_other = all;
    all = this;
}

ProxyUse::~ProxyUse() {
    const std::lock_guard<std::mutex> lock(mutex());
    ProxyUse** link = &all;
    while (*link != this)
        link = &(*link)->m_other;
    *link = m_other;
}

void ProxyUse::checkNone(const RemoteObject& proxy) {
    const std::lock_guard<std::mutex> lock(mutex());
    for (const ProxyUse* use = all; use; use = use->m_other) {
        if (use->m_proxy == &proxy)
            fail("a proxy is destroyed while it is used", proxy);
    }
}

} // namespace Bluetooth

#endif
