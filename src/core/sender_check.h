// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_SENDER_CHECK_H
#define KESBLUETOOTH_CORE_SENDER_CHECK_H

#include <dbus/dbus.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <string>

namespace Bluetooth {

class BusLink;
class RemoteObject;

/// Keeps signals of strangers from the subscriptions, when the program has asked for that
/// (Connection::checkSenders()): on a message bus anybody may send any signal to anybody.
///
/// OWNERS. A subscription is for the service that its proxy names, and so the sender has to own
/// that name. Its owner is asked for (GetNameOwner) when a proxy subscribes, and again when a
/// signal comes from a sender that is not known, since a service that was restarted has a new
/// unique name. A signal of the known owner costs a comparison. A bus never gives a unique name
/// twice, so an owner is right until another one is known; an owner that gives its name away is
/// trusted until then. Its last signals may still wait when that is known: they are let through.
///
/// STRANGERS. The last ones are remembered and ask for nothing again, except once a second: a
/// stranger may have come to own the name since. Strangers that come in ever new names find that
/// an answer is good for all signals that came before it, and that there is a pause between two
/// questions. So however many they are, they delay signals by that pause, cost 100 questions a
/// second at most and fill no memory; and no signal of a new owner is lost among theirs.
///
/// THREADS. Any function may be called on any thread. The mutex is not held while the bus is asked.
class SenderCheck {
public:
    explicit SenderCheck(BusLink& link) : m_link(link) {}
    SenderCheck(const SenderCheck&) = delete;
    SenderCheck& operator=(const SenderCheck&) = delete;

    /// Turns the check on or off for all buses of the process.
    static void turn(bool on) { isOn = on; }

    /// @return whether a signal may be delivered to a subscriber. May block while the bus is asked;
    ///         does not touch the subscriber afterwards
    static bool lets(const RemoteObject& subscriber, DBusMessage* signal);

    /// Asks for the owner of a new subscriber's service, unless it is known: a service may be gone
    /// when its first signal is delivered, if that says that it goes. Throws nothing.
    static void prepare(const RemoteObject& subscriber);

private:
    using Clock = std::chrono::steady_clock;
    struct Name {
        std::string owner;             // "": none
        std::string former;            // the last one before it
        std::uint64_t formerUntil = 0; // how many signals had come when it was known to be gone
        std::uint64_t answered = 0;    // how many signals had come before the last answer
        Clock::time_point asked;       // when the last question was
        std::array<std::string, 32> strangers;
        std::size_t nextStranger = 0;
    };

    static std::atomic<bool> isOn;

    bool isOwner(const char* name, const char* sender);
    bool isAnswered(const Name& name, const char* sender) const;
    bool hadComeBefore(std::uint64_t signals) const;
    bool ask(const std::string& text, Name& name, std::unique_lock<std::mutex>& lock);

    BusLink& m_link;
    std::mutex m_mutex; // for the names
    std::map<std::string, Name, std::less<>> m_names;
};

} // namespace Bluetooth

#endif
