// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/bus_link.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <limits>
#include <new>

namespace Bluetooth {

namespace {

/// The longest sleep, and so the longest time in which a stop or an interruption is noticed.
constexpr std::chrono::milliseconds longestWait{100};
/// How soon output that the socket did not take is tried again. Waiting for the socket to become
/// writable would spin while another thread holds libdbus's I/O.
constexpr std::chrono::milliseconds outputRetry{2};
/// How long after a call the receive thread leaves the lead to the next one.
constexpr std::chrono::milliseconds callBurst{1};
/// What libdbus may hold unread of a flood of signals, in bytes, before it stops reading replies.
constexpr long receiveLimit = 1L << 30;

thread_local const BusLink* receiving = nullptr; // its receive() runs on this thread

/// While it lives, no link's receive() counts as running on this thread, or `link`'s does.
class ReceivingScope {
public:
    explicit ReceivingScope(const BusLink* link) : m_outer(receiving) { receiving = link; }
    ~ReceivingScope() { receiving = m_outer; }
    ReceivingScope(const ReceivingScope&) = delete;
    ReceivingScope& operator=(const ReceivingScope&) = delete;

private:
    const BusLink* m_outer;
};

/// While it lives, `link`'s step() runs on this thread. Steps of several links nest when a handler
/// on one bus calls on another.
class LeadingScope {
public:
    explicit LeadingScope(const BusLink* link) : m_link(link), m_outer(innermost) {
        innermost = this;
    }
    ~LeadingScope() { innermost = m_outer; }
    LeadingScope(const LeadingScope&) = delete;
    LeadingScope& operator=(const LeadingScope&) = delete;

    static bool has(const BusLink* link) {
        const LeadingScope* scope = innermost;
        while (scope && scope->m_link != link)
            scope = scope->m_outer;
        return scope;
    }

private:
    static thread_local const LeadingScope* innermost;
    const BusLink* m_link;
    const LeadingScope* m_outer;
};

thread_local const LeadingScope* LeadingScope::innermost = nullptr;

} // namespace

std::atomic<bool> BusLink::stopRequested{false};
static_assert(std::atomic<bool>::is_always_lock_free, "set in signal handlers");

/// A thread that waits for something that dispatching brings about.
struct BusLink::Waiter {
    enum class Goal { Reply, Output, Disconnect };

    Goal goal;
    DBusConnection* connection;
    dbus_uint32_t serial = 0; // Reply: of the call
    MessagePtr reply;         // Reply: what the filter found for it
    Clock::time_point deadline = Clock::time_point::max();
    const std::atomic<bool>* interrupted = nullptr;
    bool leadsAlways = false;
    bool woken = false;
    std::condition_variable wake;

    Waiter(Goal what, DBusConnection* where) : goal(what), connection(where) {}

    bool isFinished() const {
        return (goal == Goal::Reply && reply) ||
               (goal == Goal::Output && !dbus_connection_has_messages_to_send(connection));
    }
    /// Whether to leave without having reached the goal. Needs no lock.
    bool isOver() const {
        return (interrupted && *interrupted) ||
               (deadline != Clock::time_point::max() && Clock::now() >= deadline);
    }
};

BusLink* BusLink::of(DBusConnection* connection) {
    static dbus_int32_t slot = -1;
    static const bool haveSlot = dbus_connection_allocate_data_slot(&slot);
    static std::mutex creation;

    if (!connection || !haveSlot)
        return nullptr;
    if (auto* link = static_cast<BusLink*>(dbus_connection_get_data(connection, slot)))
        return link;

    const std::lock_guard<std::mutex> lock(creation);
    if (auto* link = static_cast<BusLink*>(dbus_connection_get_data(connection, slot)))
        return link;
    auto* link = new BusLink(connection);
    const auto destroy = [](void* data) { delete static_cast<BusLink*>(data); };
    if (!link->attach() || !dbus_connection_set_data(connection, slot, link, destroy)) {
        dbus_connection_remove_filter(connection, filter, link);
        delete link;
        return nullptr;
    }
    return link;
}

BusLink::BusLink(DBusConnection* connection) : m_connection(connection) {}

BusLink::~BusLink() {
    if (m_wakeFd >= 0)
        close(m_wakeFd);
}

bool BusLink::attach() {
    m_wakeFd = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    dbus_connection_set_max_received_size(m_connection, receiveLimit);
    // The filter is there whether or not this succeeds: of() removes it.
    return dbus_connection_add_filter(m_connection, filter, this, nullptr) && m_wakeFd >= 0;
}

MessagePtr BusLink::call(DBusMessage* message, int timeoutMs, DBusError& error) {
    if (dispatchesHere())
        return MessagePtr(
            dbus_connection_send_with_reply_and_block(m_connection, message, timeoutMs, &error));
    if (!dbus_connection_get_is_connected(m_connection)) {
        dbus_set_error_const(&error, DBUS_ERROR_DISCONNECTED, "Connection is closed");
        return nullptr;
    }
    Waiter waiter(Waiter::Goal::Reply, m_connection);
    if (timeoutMs != std::numeric_limits<int>::max()) {
        constexpr int defaultTimeoutMs = 25000;
        waiter.deadline = Clock::now() + Milliseconds(timeoutMs < 0 ? defaultTimeoutMs : timeoutMs);
    }
    {
        // Sent without a pending call, which is a third of the work of a raw call: libdbus makes an
        // error message for each beforehand. Locked from here on, so that the filter finds the
        // waiter however soon the reply comes; sending neither dispatches nor waits.
        Lock lock(m_mutex);
        m_waiters.reserve(m_waiters.size() + 1); // nothing is thrown once the call is on its way
        if (!dbus_connection_send(m_connection, message, &waiter.serial)) {
            dbus_set_error_const(&error, DBUS_ERROR_NO_MEMORY, "Not enough memory");
            return nullptr;
        }
        join(waiter);
        wait(waiter, lock);
    }
    if (!waiter.reply)
        setNoReply(error);
    else if (dbus_set_error_from_message(&error, waiter.reply.get()))
        return nullptr;
    return std::move(waiter.reply);
}

void BusLink::setNoReply(DBusError& error) const {
    if (dbus_connection_get_is_connected(m_connection))
        dbus_set_error_const(
            &error, DBUS_ERROR_NO_REPLY,
            "Did not receive a reply. Possible causes include: the remote application did not "
            "send a reply, the message bus security policy blocked the reply, the reply "
            "timeout expired, or the network connection was broken.");
    else
        dbus_set_error_const(&error, DBUS_ERROR_DISCONNECTED,
                             "Connection was disconnected before a reply was received");
}

bool BusLink::send(DBusMessage* message) {
    // libdbus accepts messages for a closed connection and forgets them.
    if (!dbus_connection_get_is_connected(m_connection) ||
        !dbus_connection_send(m_connection, message, nullptr))
        return false;
    flush();
    return true;
}

bool BusLink::converse(DBusMessage* message, const std::atomic<bool>& interrupted, void (*sent)(),
                       MessagePtr& reply) {
    if (dispatchesHere()) {
        sent();
        reply = callInsideDispatch(message);
        return true;
    }
    const ReceivingScope answersRequests(nullptr);
    Waiter waiter(Waiter::Goal::Reply, m_connection);
    waiter.interrupted = &interrupted;
    waiter.leadsAlways = true;

    Lock lock(m_mutex);
    // The lead is taken before the call is sent: the receive thread would drop a request that
    // comes at once.
    join(waiter);
    while (m_reading)
        waiter.wake.wait_for(lock, longestWait);
    const bool queued = dbus_connection_send(m_connection, message, &waiter.serial);
    while (queued && dbus_connection_has_messages_to_send(m_connection) &&
           lead(lock, longestWait, &waiter)) {
    }
    if (queued)
        sent();
    else
        waiter.deadline = Clock::now();
    wait(waiter, lock);
    reply = std::move(waiter.reply);
    return queued;
}

/// libdbus's dispatch cannot be entered twice: inside it only libdbus's own wait works, in which
/// no requests are answered.
MessagePtr BusLink::callInsideDispatch(DBusMessage* message) {
    DBusPendingCall* begun = nullptr;
    if (!dbus_connection_send_with_reply(m_connection, message, &begun, DBUS_TIMEOUT_INFINITE) ||
        !begun)
        return nullptr;
    const PendingPtr pending(begun);
    dbus_pending_call_block(begun);
    return MessagePtr(dbus_pending_call_steal_reply(begun));
}

/// Waits until everything sent is written or the connection closes.
void BusLink::flush() {
    if (!dbus_connection_has_messages_to_send(m_connection))
        return;
    if (dispatchesHere()) {
        dbus_connection_flush(m_connection);
        return;
    }
    Waiter waiter(Waiter::Goal::Output, m_connection);
    Lock lock(m_mutex);
    join(waiter);
    wait(waiter, lock);
}

bool BusLink::checkOpen() {
    pollfd socket{-1, POLLRDHUP, 0};
    const bool hungUp =
        !dbus_connection_get_unix_fd(m_connection, &socket.fd) || poll(&socket, 1, 0) > 0;
    if (hungUp && !dispatchesHere()) {
        // libdbus hands out a dead connection until its end has been dispatched.
        Waiter waiter(Waiter::Goal::Disconnect, m_connection);
        waiter.deadline = Clock::now() + longestWait;
        Lock lock(m_mutex);
        join(waiter);
        wait(waiter, lock);
    }
    return dbus_connection_get_is_connected(m_connection);
}

void BusLink::join(Waiter& waiter) {
    m_waiters.push_back(&waiter);
    if (m_reading && (waiter.leadsAlways || dbus_connection_has_messages_to_send(m_connection)))
        wakeLeader();
}

/// Returns when the waiter's goal is reached, its time is over or the connection is closed. The
/// waiter has joined; afterwards it has left.
void BusLink::wait(Waiter& waiter, Lock& lock) {
    while (!waiter.isFinished() && !waiter.isOver()) {
        const auto left = waiter.deadline - Clock::now();
        const auto limit =
            std::chrono::ceil<Milliseconds>(std::min<Clock::duration>(longestWait, left));
        if (mayLead(waiter)) {
            if (!lead(lock, limit, &waiter))
                break;
        } else {
            passLead();
            waiter.woken = false;
            waiter.wake.wait_for(lock, limit);
        }
    }
    m_waiters.erase(std::find(m_waiters.begin(), m_waiters.end(), &waiter));
    if (waiter.goal == Waiter::Goal::Reply)
        m_lastCall = Clock::now();
    passLead();
}

bool BusLink::mayLead(const Waiter& waiter) const {
    if (m_reading)
        return false;
    return waiter.leadsAlways ||
           std::none_of(m_waiters.begin(), m_waiters.end(),
                        [](const Waiter* other) { return other->leadsAlways; });
}

/// One round as the leader, for `waiter` or, with null, the receive thread.
/// @return whether the connection is open
bool BusLink::lead(Lock& lock, Milliseconds limit, const Waiter* waiter) {
    m_reading = true;
    lock.unlock();
    const bool open = step(limit, waiter);
    lock.lock();
    m_reading = false;
    wakeFinished();
    return open;
}

/// Waits for input, reads it and dispatches it. The mutex is not held.
bool BusLink::step(Milliseconds limit, const Waiter* waiter) {
    const LeadingScope scope(this);
    if (dbus_connection_get_dispatch_status(m_connection) != DBUS_DISPATCH_DATA_REMAINS)
        awaitInput(limit);
    const bool open = dbus_connection_read_write(m_connection, 0);
    // What a handler's delay has left is for the next leader when this one has to go.
    while (dbus_connection_dispatch(m_connection) == DBUS_DISPATCH_DATA_REMAINS &&
           !(waiter ? waiter->isOver() : stopRequested.load())) {
    }
    return open;
}

void BusLink::awaitInput(Milliseconds limit) {
    pollfd fds[] = {{-1, POLLIN, 0}, {m_wakeFd, POLLIN, 0}};
    // Asked anew each time: the descriptor of a closed connection may belong to somebody else.
    if (!dbus_connection_get_unix_fd(m_connection, &fds[0].fd))
        return;
    if (dbus_connection_has_messages_to_send(m_connection))
        limit = std::min(limit, outputRetry);
    if (poll(fds, 2, static_cast<int>(limit.count())) > 0 && fds[1].revents != 0) {
        eventfd_t count = 0;
        eventfd_read(m_wakeFd, &count);
    }
}

/// Wakes whoever leads next: the thread that always leads, else any that still waits, else the
/// receive thread.
void BusLink::passLead() {
    if (m_reading)
        return;
    const auto always = std::find_if(m_waiters.begin(), m_waiters.end(),
                                     [](const Waiter* waiter) { return waiter->leadsAlways; });
    const auto next = always != m_waiters.end()
                          ? always
                          : std::find_if(m_waiters.begin(), m_waiters.end(),
                                         [](const Waiter* waiter) { return !waiter->woken; });
    if (next != m_waiters.end()) {
        (*next)->woken = true;
        (*next)->wake.notify_one();
    } else if (m_waiters.empty() && m_receiverParked) {
        m_receiverWake.notify_one();
    }
}

void BusLink::wakeFinished() {
    for (Waiter* waiter : m_waiters) {
        if (!waiter->woken && waiter->isFinished()) {
            waiter->woken = true;
            waiter->wake.notify_one();
        }
    }
}

void BusLink::wakeLeader() {
    eventfd_write(m_wakeFd, 1);
}

bool BusLink::dispatchesHere() const {
    return LeadingScope::has(this) || m_ownDispatch.isHere();
}

void BusLink::addSubscription() {
    const Lock lock(m_mutex);
    ++m_subscriptions;
}

void BusLink::removeSubscription() {
    Lock lock(m_mutex);
    --m_subscriptions;
    while (m_subscriptions == 0 && m_receivers == 0 && !m_inbox.empty()) {
        MessagePtr unwanted = std::move(m_inbox.front()); // one by one: another deque takes memory
        m_inbox.pop_front();
        lock.unlock();
        unwanted.reset();
        lock.lock();
    }
}

void BusLink::receive(Deliver deliver, void* context) {
    const ReceivingScope scope(this);
    Lock lock(m_mutex);
    ++m_receivers;
    while (!stopRequested) {
        if (m_inbox.empty()) {
            receiveMore(lock);
            continue;
        }
        const MessagePtr message = std::move(m_inbox.front());
        m_inbox.pop_front();
        lock.unlock();
        deliver(context, message.get());
        lock.lock();
    }
    --m_receivers;
}

/// Leads, or lets the callers lead, until something may have come in; at most longestWait.
void BusLink::receiveMore(Lock& lock) {
    const auto sinceCall = Clock::now() - m_lastCall;
    if (m_reading || !m_waiters.empty() || sinceCall < callBurst) {
        // In a burst of calls nobody has to wake this thread: it looks again soon enough.
        m_receiverParked = sinceCall >= 2 * callBurst;
        m_receiverWake.wait_for(lock, m_receiverParked ? longestWait : callBurst);
        m_receiverParked = false;
    } else if (!lead(lock, longestWait, nullptr)) {
        passLead();
        m_receiverWake.wait_for(lock, longestWait); // closed: nothing will come
    } else {
        passLead();
    }
}

/// Runs on the thread that dispatches; never calls the program's callbacks.
DBusHandlerResult BusLink::filter(DBusConnection*, DBusMessage* message, void* data) {
    auto* link = static_cast<BusLink*>(data);
    const DBusHandlerResult result = link->sort(message);
    if (result == DBUS_HANDLER_RESULT_NOT_YET_HANDLED && !LeadingScope::has(link))
        link->m_ownDispatch.mark(message); // the program's handlers come next
    return result;
}

DBusHandlerResult BusLink::sort(DBusMessage* message) {
    switch (dbus_message_get_type(message)) {
    case DBUS_MESSAGE_TYPE_METHOD_CALL:
        // The receive thread serves no objects: a request that it takes is not answered.
        return receiving == this ? DBUS_HANDLER_RESULT_HANDLED
                                 : DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    case DBUS_MESSAGE_TYPE_SIGNAL:
        return keepSignal(message);
    default:
        return giveReply(message);
    }
}

/// Hands a reply to the call that waits for it; others are for libdbus's pending calls.
DBusHandlerResult BusLink::giveReply(DBusMessage* message) {
    const dbus_uint32_t serial = dbus_message_get_reply_serial(message);
    const Lock lock(m_mutex);
    const auto waiter =
        std::find_if(m_waiters.begin(), m_waiters.end(), [serial](const Waiter* candidate) {
            return candidate->goal == Waiter::Goal::Reply && candidate->serial == serial;
        });
    if (waiter == m_waiters.end() || serial == 0)
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    (*waiter)->reply.reset(dbus_message_ref(message));
    if (!LeadingScope::has(this))
        wakeLeader();
    return DBUS_HANDLER_RESULT_HANDLED;
}

DBusHandlerResult BusLink::keepSignal(DBusMessage* message) {
    const Lock lock(m_mutex);
    if ((m_receivers == 0 && m_subscriptions == 0) || stopRequested)
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    // Without a receive thread the signal may be meant for handlers of the program as well, and
    // libdbus itself has to see the end of the connection.
    const bool keptFromOthers =
        m_receivers > 0 && !dbus_message_is_signal(message, DBUS_INTERFACE_LOCAL, "Disconnected");
    MessagePtr kept(keptFromOthers ? dbus_message_ref(message) : dbus_message_copy(message));
    if (!kept)
        return DBUS_HANDLER_RESULT_NEED_MEMORY;
    try {
        m_inbox.push_back(std::move(kept));
    } catch (const std::bad_alloc&) {
        return DBUS_HANDLER_RESULT_NEED_MEMORY;
    }
    m_receiverWake.notify_one();
    if (!LeadingScope::has(this))
        wakeLeader(); // the receive thread may be waiting for the socket
    return keptFromOthers ? DBUS_HANDLER_RESULT_HANDLED : DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
}

} // namespace Bluetooth
