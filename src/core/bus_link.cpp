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

thread_local const BusLink* leading = nullptr;     // its step() runs on this thread
thread_local const BusLink* receiving = nullptr;   // its receive() runs on this thread
thread_local const BusLink* dispatching = nullptr; // dispatched on this thread by the program

class ScopedRole {
public:
    ScopedRole(const BusLink*& role, const BusLink* link) : m_role(role), m_before(role) {
        role = link;
    }
    ~ScopedRole() { m_role = m_before; }
    ScopedRole(const ScopedRole&) = delete;
    ScopedRole& operator=(const ScopedRole&) = delete;

private:
    const BusLink*& m_role;
    const BusLink* m_before;
};

/// @return the reply; null, and none will come any more, when the call is not answered
MessagePtr takeReply(DBusPendingCall* pending) {
    if (dbus_pending_call_get_completed(pending)) // libdbus ends the process otherwise
        return MessagePtr(dbus_pending_call_steal_reply(pending));
    dbus_pending_call_cancel(pending);
    return nullptr;
}

} // namespace

std::atomic<bool> BusLink::stopRequested{false};
static_assert(std::atomic<bool>::is_always_lock_free, "set in signal handlers");

/// A thread that waits for something that dispatching brings about.
struct BusLink::Waiter {
    enum class Goal { Reply, Completion, Output, Disconnect };

    Goal goal;
    DBusConnection* connection;
    dbus_uint32_t serial = 0;           // Reply: of the call
    MessagePtr reply;                   // Reply: what the filter found for it
    DBusPendingCall* pending = nullptr; // Completion
    Clock::time_point deadline = Clock::time_point::max();
    const std::atomic<bool>* interrupted = nullptr;
    bool leadsAlways = false;
    bool woken = false;
    std::condition_variable wake;

    Waiter(Goal what, DBusConnection* where) : goal(what), connection(where) {}

    bool isFinished() const {
        switch (goal) {
        case Goal::Reply:
            return reply != nullptr;
        case Goal::Completion:
            return dbus_pending_call_get_completed(pending) || (interrupted && *interrupted);
        case Goal::Output:
            return !dbus_connection_has_messages_to_send(connection);
        case Goal::Disconnect:
            break;
        }
        return false;
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
    // libdbus's dispatch cannot be entered twice: inside it only libdbus's own wait works.
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
        // Sent without a pending call, which costs a third of the whole exchange: libdbus makes an
        // error message for each beforehand. Locked from here on, so that the filter finds the
        // waiter however soon the reply comes; sending neither dispatches nor waits.
        Lock lock(m_mutex);
        if (!dbus_connection_send(m_connection, message, &waiter.serial)) {
            dbus_set_error_const(&error, DBUS_ERROR_NO_MEMORY, "Not enough memory");
            return nullptr;
        }
        wait(waiter, lock);
    }
    if (!waiter.reply)
        dbus_set_error_const(
            &error, DBUS_ERROR_NO_REPLY,
            "Did not receive a reply. Possible causes include: the remote application did not "
            "send a reply, the message bus security policy blocked the reply, the reply "
            "timeout expired, or the network connection was broken.");
    else if (dbus_set_error_from_message(&error, waiter.reply.get()))
        return nullptr;
    return std::move(waiter.reply);
}

bool BusLink::send(DBusMessage* message) {
    // libdbus accepts messages for a closed connection and forgets them.
    if (!dbus_connection_get_is_connected(m_connection) ||
        !dbus_connection_send(m_connection, message, nullptr))
        return false;
    flush();
    return true;
}

bool BusLink::begin(DBusMessage* message, PendingPtr& pending) {
    DBusPendingCall* begun = nullptr;
    if (!dbus_connection_send_with_reply(m_connection, message, &begun, -1))
        return false;
    pending.reset(begun);
    return true;
}

MessagePtr BusLink::finish(PendingPtr pending, const std::atomic<bool>& interrupted) {
    if (!pending)
        return nullptr;
    if (dispatchesHere()) {
        dbus_pending_call_block(pending.get());
    } else {
        const ScopedRole answersRequests(receiving, nullptr);
        Waiter waiter(Waiter::Goal::Completion, m_connection);
        waiter.pending = pending.get();
        waiter.interrupted = &interrupted;
        waiter.leadsAlways = true;
        dbus_pending_call_set_notify(waiter.pending, pendingCompleted, this, nullptr);
        Lock lock(m_mutex);
        wait(waiter, lock);
    }
    return takeReply(pending.get());
}

void BusLink::flush() {
    if (!dbus_connection_has_messages_to_send(m_connection))
        return;
    if (dispatchesHere()) {
        dbus_connection_flush(m_connection);
        return;
    }
    Waiter waiter(Waiter::Goal::Output, m_connection);
    Lock lock(m_mutex);
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
        wait(waiter, lock);
    }
    return dbus_connection_get_is_connected(m_connection);
}

/// Returns when the waiter's goal is reached, its time is over or the connection is closed.
void BusLink::wait(Waiter& waiter, Lock& lock) {
    m_waiters.push_back(&waiter);
    if (m_reading && (waiter.leadsAlways || dbus_connection_has_messages_to_send(m_connection)))
        wakeLeader();
    while (!waiter.isFinished()) {
        const auto now = Clock::now();
        if (now >= waiter.deadline)
            break;
        const auto limit = std::min<Clock::duration>(longestWait, waiter.deadline - now);
        if (!mayLead(waiter)) {
            passLead();
            waiter.wake.wait_for(lock, limit);
            waiter.woken = false;
        } else if (!lead(lock, std::chrono::ceil<Milliseconds>(limit))) {
            break;
        }
    }
    m_waiters.erase(std::find(m_waiters.begin(), m_waiters.end(), &waiter));
    if (waiter.goal == Waiter::Goal::Reply || waiter.goal == Waiter::Goal::Completion)
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

/// One round as the leader. @return whether the connection is open
bool BusLink::lead(Lock& lock, Milliseconds limit) {
    m_reading = true;
    lock.unlock();
    const bool open = step(limit);
    lock.lock();
    m_reading = false;
    wakeFinished();
    return open;
}

/// Waits for input, reads it and dispatches all of it. The mutex is not held.
bool BusLink::step(Milliseconds limit) {
    const ScopedRole role(leading, this);
    if (dbus_connection_get_dispatch_status(m_connection) != DBUS_DISPATCH_DATA_REMAINS)
        awaitInput(limit);
    const bool open = dbus_connection_read_write(m_connection, 0);
    while (dbus_connection_dispatch(m_connection) == DBUS_DISPATCH_DATA_REMAINS) {
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
    Waiter* next = nullptr;
    for (Waiter* waiter : m_waiters) {
        if (!waiter->woken && (!next || waiter->leadsAlways))
            next = waiter;
    }
    if (next) {
        next->woken = true;
        next->wake.notify_one();
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
    return leading == this || dispatching == this;
}

void BusLink::addSubscription() {
    const Lock lock(m_mutex);
    ++m_subscriptions;
}

void BusLink::removeSubscription() {
    std::deque<MessagePtr> unwanted;
    const Lock lock(m_mutex);
    if (--m_subscriptions == 0 && m_receivers == 0)
        unwanted.swap(m_inbox);
}

void BusLink::receive(Deliver deliver, void* context) {
    const ScopedRole role(receiving, this);
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
    } else if (!lead(lock, longestWait)) {
        passLead();
        m_receiverWake.wait_for(lock, longestWait); // closed: nothing will come
    } else {
        passLead();
    }
}

/// Runs on the thread that dispatches; never calls the program's callbacks.
DBusHandlerResult BusLink::filter(DBusConnection*, DBusMessage* message, void* data) {
    auto* link = static_cast<BusLink*>(data);
    if (leading != link)
        dispatching = link; // by the program's own main loop, in which this thread's calls may be
    switch (dbus_message_get_type(message)) {
    case DBUS_MESSAGE_TYPE_METHOD_CALL:
        // The receive thread serves no objects: a request that it takes is not answered.
        return receiving == link ? DBUS_HANDLER_RESULT_HANDLED
                                 : DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    case DBUS_MESSAGE_TYPE_SIGNAL:
        return link->keepSignal(message);
    default:
        return link->giveReply(message);
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
    if (waiter == m_waiters.end())
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    (*waiter)->reply.reset(dbus_message_ref(message));
    if (leading != this)
        wakeLeader();
    return DBUS_HANDLER_RESULT_HANDLED;
}

DBusHandlerResult BusLink::keepSignal(DBusMessage* message) {
    const Lock lock(m_mutex);
    if ((m_receivers == 0 && m_subscriptions == 0) || stopRequested)
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    try {
        m_inbox.emplace_back(dbus_message_ref(message));
    } catch (const std::bad_alloc&) {
        dbus_message_unref(message);
        return DBUS_HANDLER_RESULT_NEED_MEMORY;
    }
    m_receiverWake.notify_one();
    if (leading != this)
        wakeLeader(); // the receive thread may be waiting for the socket
    // Without a receive thread the signal may be meant for handlers of the program as well, and
    // libdbus itself has to see the end of the connection.
    const bool keptFromOthers =
        m_receivers > 0 && !dbus_message_is_signal(message, DBUS_INTERFACE_LOCAL, "Disconnected");
    return keptFromOthers ? DBUS_HANDLER_RESULT_HANDLED : DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
}

/// Only the link is touched: whoever waits for the reply may have left already.
void BusLink::pendingCompleted(DBusPendingCall*, void* data) {
    auto* link = static_cast<BusLink*>(data);
    if (leading != link)
        link->wakeLeader();
}

} // namespace Bluetooth
