// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/sender_check.h"

#include <bluetooth/remote_object.h>

#include "core/bus_driver.h"

#include <algorithm>
#include <cstring>
#include <new>
#include <thread>

namespace Bluetooth {

namespace {

/// How long after a question a stranger that is known may cause another.
constexpr std::chrono::seconds strangersPause{1};
/// The least time between two questions for the owner of a name.
constexpr std::chrono::milliseconds shortestPause{10};

/// Only a well-known name has an owner that is to be asked for.
bool isWellKnown(const char* name) {
    return name[0] != ':' && dbus_validate_bus_name(name, nullptr);
}

} // namespace

std::atomic<bool> SenderCheck::isOn{false};

bool SenderCheck::lets(const RemoteObject& subscriber, DBusMessage* signal) {
    if (!isOn)
        return true;
    const char* sender = dbus_message_get_sender(signal);
    // Without a sender it has not come through a bus, which fills that in.
    if (!sender || std::strcmp(sender, DBUS_SERVICE_DBUS) == 0)
        return true;
    const char* name = subscriber.getDestination();
    // Unique names of one bus say nothing about another's.
    DBusConnection* connection = subscriber.getConnection();
    BusLink* link = BusLink::receivingHere();
    if (link ? !link->isOf(connection) : !(link = BusLink::of(connection)))
        return false;
    return name[0] == ':' ? std::strcmp(name, sender) == 0 : link->senders().isOwner(name, sender);
}

void SenderCheck::prepare(const RemoteObject& subscriber) {
    BusLink* link = BusLink::of(subscriber.getConnection());
    const char* name = subscriber.getDestination();
    if (!isOn || !link || !isWellKnown(name))
        return;
    SenderCheck& check = link->senders();
    std::unique_lock<std::mutex> lock(check.m_mutex);
    try {
        Name& known = check.m_names[name];
        if (known.owner.empty())
            check.ask(name, known, lock);
    } catch (const std::bad_alloc&) {
        // Then the first signal asks.
    }
}

bool SenderCheck::isOwner(const char* name, const char* sender) {
    std::unique_lock<std::mutex> lock(m_mutex);
    auto known = m_names.find(name);
    if (known != m_names.end() && known->second.owner == sender)
        return true; // nearly every signal
    if (!isWellKnown(name))
        return false;
    if (known == m_names.end())
        known = m_names.try_emplace(name).first;
    Name& owned = known->second;
    if (owned.former == sender && hadComeBefore(owned.formerUntil))
        return true;
    if (isAnswered(owned, sender))
        return false;
    const Clock::time_point due = std::max(Clock::now(), owned.asked + shortestPause);
    lock.unlock();
    std::this_thread::sleep_until(due);
    lock.lock();
    const bool isSaid = ask(known->first, owned, lock);
    if (owned.owner == sender)
        return true;
    if (isSaid)
        owned.strangers[owned.nextStranger++ % owned.strangers.size()] = sender;
    return false;
}

/// Whether it is known that a sender is not the owner.
bool SenderCheck::isAnswered(const Name& name, const char* sender) const {
    const bool isStranger =
        std::find(name.strangers.begin(), name.strangers.end(), sender) != name.strangers.end();
    return (isStranger && Clock::now() < name.asked + strangersPause) ||
           hadComeBefore(name.answered);
}

/// Whether the signal that is delivered is one of the first `signals`.
bool SenderCheck::hadComeBefore(std::uint64_t signals) const {
    return BusLink::receivingHere() == &m_link && m_link.takenSignals() <= signals;
}

/// Asks the bus who owns a name. The mutex is not held meanwhile.
/// @return whether the bus has said; otherwise the owner stays as it was
bool SenderCheck::ask(const std::string& text, Name& name, std::unique_lock<std::mutex>& lock) {
    name.asked = Clock::now();
    lock.unlock();
    ScopedError error;
    std::uint64_t answered = 0;
    const MessagePtr reply = callBusDriver(&m_link, "GetNameOwner", text, error, &answered);
    const char* owner = nullptr;
    if (reply)
        dbus_message_get_args(reply.get(), nullptr, DBUS_TYPE_STRING, &owner, DBUS_TYPE_INVALID);
    else if (std::strcmp(error.name(), DBUS_ERROR_NAME_HAS_NO_OWNER) == 0)
        owner = "";
    lock.lock();
    if (answered >= name.answered) { // no other thread has asked since
        name.answered = answered;
        if (owner && !name.owner.empty() && name.owner != owner) {
            name.former = name.owner;
            name.formerUntil = answered;
        }
        if (owner)
            name.owner = owner;
    }
    return owner;
}

} // namespace Bluetooth
