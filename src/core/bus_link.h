// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_BUS_LINK_H
#define KESBLUETOOTH_CORE_BUS_LINK_H

#include "core/dbus_ptr.h"
#include "core/own_dispatch.h"
#include "core/sender_check.h"
#include "core/waking_flag.h"

#include <dbus/dbus.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <mutex>
#include <vector>

namespace Bluetooth {

/// How the calls and the signals of all proxies share the one connection of a bus.
///
/// One thread at a time leads: it waits for the socket outside libdbus, reads and dispatches.
/// Every other thread that waits for a reply sleeps until the leader has dispatched it, or takes
/// the lead. A filter sorts what is dispatched: signals go to an inbox that the receive thread
/// empties in order, replies go to the calls that wait for them. So no thread can take another's
/// reply, and no thread waits inside libdbus while others need the connection.
///
/// The receive thread leads when nobody calls. While calls are made, and shortly after, it leaves
/// the lead to the callers, which saves a change of threads in every call.
class BusLink {
public:
    using Deliver = void (*)(void* context, DBusMessage* signal);

    /// A method call and its reply.
    struct Exchange {
        MessagePtr call;
        MessagePtr reply = nullptr; // a D-Bus error counts; null when none came
        dbus_uint32_t serial = 0;   // 0 when the call could not be sent
        std::uint64_t signalsBefore =
            0; // how many signals had been kept when it came, or when none had
    };

    /// The link of a connection, made when first asked for and living as long as the connection.
    /// @return null for a null connection or without memory
    static BusLink* of(DBusConnection* connection);

    BusLink(const BusLink&) = delete;
    BusLink& operator=(const BusLink&) = delete;

    /// Sends a method call and waits for its reply.
    /// @param timeoutMs milliseconds, or -1 for libdbus's default
    /// @param signalsBefore unless null, receives how many signals had been kept when the reply
    ///                      came; on the receive thread requestStop() then ends the wait
    /// @return the reply; null with `error` set, also when the reply is a D-Bus error
    MessagePtr call(DBusMessage* message, int timeoutMs, DBusError& error,
                    std::uint64_t* signalsBefore = nullptr);

    /// Sends all calls before it waits for their replies, at most as long as one call may take.
    void callAll(std::vector<Exchange>& exchanges);
    /// Says why an exchange has no reply.
    void setNoReply(DBusError& error, const Exchange& exchange) const;

    /// Sends a message that gets no reply and waits until it is written, without a time limit.
    /// @return false when the connection is closed or refuses it
    bool send(DBusMessage* message);

    /// Sends a method call and waits for its reply without a time limit, as the leader all the
    /// while: requests to objects of this process are answered on this thread.
    /// @param interrupted ends the wait when it is raised
    /// @param sent        called when the call has been written, before the wait
    /// @param reply       receives the reply, a D-Bus error among them; null when none came, and
    ///                    none will any more
    /// @return false when the call could not be sent for want of memory
    bool converse(DBusMessage* message, WakingFlag& interrupted, void (*sent)(), MessagePtr& reply);

    /// Signals are kept for the receive thread while there are subscriptions, even before it runs.
    void addSubscription();
    void removeSubscription();

    /// How many signals have been taken out of those kept: what receive() delivers is the last.
    std::uint64_t takenSignals();

    /// The receive thread's work: delivers signals, one after the other, until requestStop().
    void receive(Deliver deliver, void* context);

    /// The link whose receive() runs on this thread; null for none.
    static BusLink* receivingHere();
    bool isOf(const DBusConnection* connection) const { return connection == m_connection; }
    SenderCheck& senders() { return m_senders; }

    /// Ends every receive() of the process, for good. Safe in a signal handler.
    static void requestStop() { stop.raise(); }
    static bool isStopRequested() { return stop.isRaised(); }

    /// Takes notice of a bus that has gone. @return whether the connection is open
    bool checkOpen();

private:
    struct Waiter;
    using Clock = std::chrono::steady_clock;
    using Milliseconds = std::chrono::milliseconds;
    using Lock = std::unique_lock<std::mutex>;

    explicit BusLink(DBusConnection* connection);
    ~BusLink();
    bool attach(); // adds the filter, or returns false

    MessagePtr takeSignal();
    std::uint64_t keptSignals(const Lock&) const;
    void join(Waiter& waiter);
    void wait(Waiter& waiter, Lock& lock);
    bool mayLead(const Waiter& waiter) const;
    bool lead(Lock& lock, Milliseconds limit, const Waiter* waiter);
    bool step(Milliseconds limit, const Waiter* waiter);
    bool awaitInput(Milliseconds limit, WakingFlag* interrupted);
    void passOnStop();
    void flush();
    void passLead();
    void wakeFinished();
    static void wakeIfFinished(Waiter& waiter);
    void wakeLeader();
    void receiveMore(Lock& lock, Milliseconds limit);
    bool dispatchesHere() const;
    void exchangeAll(Exchange* first, std::size_t count, int timeoutMs, WakingFlag* interrupted);
    static void exchangeInsideDispatch(DBusConnection* connection, Exchange* first,
                                       std::size_t count, int timeoutMs);

    static DBusHandlerResult filter(DBusConnection*, DBusMessage* message, void* data);
    DBusHandlerResult sort(DBusMessage* message);
    DBusHandlerResult keepSignal(DBusMessage* message);
    DBusHandlerResult giveReply(DBusMessage* message);

    static WakingFlag stop;

    DBusConnection* const m_connection; // not referenced: the link is the connection's data
    int m_wakeFd = -1;                  // interrupts the leader's wait for the socket
    OwnDispatch m_ownDispatch;
    std::atomic<bool> m_handedOver{false}; // a signal, to the receive thread, by who leads
    SenderCheck m_senders{*this};

    // Guards what follows. Not held while waiting for the socket, in reading and dispatching, or in
    // callbacks. libdbus's own locks may be taken under it, and a call is sent under it.
    std::mutex m_mutex;
    bool m_reading = false;      // some thread leads
    bool m_stopPassedOn = false; // a leader has seen the stop
    std::vector<Waiter*> m_waiters;
    Clock::time_point m_lastCall;
    std::condition_variable m_receiverWake;
    bool m_receiverParked = false; // the receive thread sleeps until told that no call is left
    int m_receivers = 0;
    int m_subscriptions = 0;
    std::deque<MessagePtr> m_inbox;
    std::uint64_t m_taken = 0; // signals that have left it
};

} // namespace Bluetooth

#endif
