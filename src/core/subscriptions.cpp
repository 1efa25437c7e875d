// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/subscriptions.h"

#include <bluetooth/remote_object.h>

#include "core/sender_check.h"

#include <utility>

namespace Bluetooth {

Subscriptions::Subscriptions() = default;

Subscriptions& Subscriptions::all() {
    static auto& instance = *new Subscriptions;
    return instance;
}

Subscriptions::RecordsOfAllKinds Subscriptions::remove(const RemoteObject* proxy) {
    RecordsOfAllKinds taken;
    std::unique_lock<std::mutex> lock(m_mutex);
    std::apply([&](auto&... kinds) { (take(kinds, proxy, taken), ...); }, m_kinds);
    m_callbackDone.wait(lock, [&] { return !isCalling(proxy); });
    return taken;
}

template <class Callback>
void Subscriptions::take(Kind<Callback>& kind, const RemoteObject* proxy,
                         RecordsOfAllKinds& taken) {
    for (Walk<Callback>* walk = kind.walks; walk; walk = walk->m_other) {
        if (walk->m_proxy == proxy && walk->m_thread == std::this_thread::get_id())
            walk->m_proxy = nullptr; // its callback is what destroys it: not waited for
    }
    auto& takenOfKind = std::get<Records<Callback>>(taken);
    for (auto record = kind.records.begin(); record != kind.records.end();) {
        const auto current = record++;
        if (current->object != proxy)
            continue;
        for (Walk<Callback>* walk = kind.walks; walk; walk = walk->m_other) {
            if (walk->m_next == current)
                ++walk->m_next;
        }
        takenOfKind.splice(takenOfKind.end(), kind.records, current);
    }
}

bool Subscriptions::isCalling(const RemoteObject* proxy) const {
    const auto isCalledInKind = [proxy](const auto& kind) {
        auto* walk = kind.walks;
        while (walk && walk->m_proxy != proxy)
            walk = walk->m_other;
        return walk != nullptr;
    };
    return std::apply([&](const auto&... kinds) { return (isCalledInKind(kinds) || ...); },
                      m_kinds);
}

template <class Callback>
Subscriptions::Walk<Callback>::Walk(DBusMessage* signal)
    : m_lock(m_all.m_mutex),
      m_kind(m_all.of<Callback>()),
      m_signal(signal),
      m_next(m_kind.records.begin()) {}

template <class Callback>
void Subscriptions::Walk<Callback>::leave() {
    endCall();
    if (m_thread == std::thread::id())
        return;
    Walk** link = &m_kind.walks;
    while (*link != this)
        link = &(*link)->m_other;
    *link = m_other;
}

template <class Callback>
bool Subscriptions::Walk<Callback>::next() {
    endCall();
    while (m_next != m_kind.records.end()) {
        const SignalHandler<Callback>& record = *m_next++;
        if (!matches(record))
            continue;
        beginCall(record); // before the check, which may ask the bus: so the proxy stays meanwhile
        if (SenderCheck::lets(*m_proxy, m_signal) && m_proxy)
            return true;
        endCall();
    }
    return false;
}

template <class Callback>
bool Subscriptions::Walk<Callback>::matches(const SignalHandler<Callback>& record) const {
    return m_signal &&
           dbus_message_is_signal(m_signal, record.object->getInterface(), record.member.c_str());
}

template <class Callback>
void Subscriptions::Walk<Callback>::beginCall(const SignalHandler<Callback>& record) {
    if (m_thread == std::thread::id()) {
        m_thread = std::this_thread::get_id();
        m_other = std::exchange(m_kind.walks, this);
    }
    m_proxy = record.object;
    m_callback = record.callback;
    m_lock.unlock();
}

template <class Callback>
void Subscriptions::Walk<Callback>::endCall() {
    if (m_lock.owns_lock())
        return;
    m_lock.lock();
    m_proxy = nullptr;
    m_all.m_callbackDone.notify_all();
}

template class Subscriptions::Walk<NoArgumentCallback>;
template class Subscriptions::Walk<StringCallback>;
template class Subscriptions::Walk<ObjectPathCallback>;
template class Subscriptions::Walk<StringVariantCallback>;
template class Subscriptions::Walk<StringDictCallback>;

} // namespace Bluetooth
