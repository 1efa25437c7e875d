// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/bus_link.h"

#include <poll.h>
#include <sched.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <limits>
#include <new>

namespace Bluetooth {

namespace {

/// The longest sleep of who reads. What a blocking call of the program itself, on the shared
/// connection, has read past this file is noticed then at the latest.
constexpr std::chrono::milliseconds longestWait{1000};
/// The same for a thread that waits for a reply and has not waited longer; and for a receive thread
/// that no descriptor tells of a stop.
constexpr std::chrono::milliseconds shortWait{100};
/// How soon output that the socket did not take is tried again. Waiting for the socket to become
/// writable would spin while another thread holds libdbus's I/O.
constexpr std::chrono::milliseconds outputRetry{2};
/// How long after a call the receive thread leaves the lead to the next one.
constexpr std::chrono::milliseconds callBurst{1};
constexpr int defaultTimeoutMs = 25000; // libdbus's
/// What libdbus may hold unread of a flood of signals, in bytes, before it stops reading replies.
constexpr long receiveLimit = 1L << 30;

thread_local BusLink* receiving = nullptr; // its receive() runs on this thread

/// While it lives, no link's receive() counts as running on this thread, or `link`'s does.
class ReceivingScope {
public:
    explicit ReceivingScope(BusLink* link) : m_outer(receiving) { receiving = link; }
    ~ReceivingScope() { receiving = m_outer; }
    ReceivingScope(const ReceivingScope&) = delete;
    ReceivingScope& operator=(const ReceivingScope&) = delete;

private:
    BusLink* m_outer;
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

WakingFlag BusLink::stop;

/// A thread that waits for something that dispatching brings about.
struct BusLink::Waiter {
    enum class Goal { Reply, Output, Disconnect };

    Goal goal;
    DBusConnection* connection;
    Exchange* exchanges = nullptr; // Reply: what to wait for
    std::size_t count = 0;
    std::size_t missing = 0; // replies
    const Clock::time_point begin = Clock::now();
    Clock::time_point deadline = Clock::time_point::max();
    WakingFlag* interrupted = nullptr;
    bool leadsAlways = false;
    bool woken = false;
    std::condition_variable wake;

    Waiter(Goal what, DBusConnection* where) : goal(what), connection(where) {}
    Waiter(Exchange* first, std::size_t number, DBusConnection* where)
        : goal(Goal::Reply), connection(where), exchanges(first), count(number), missing(number) {}

    bool isFinished() const {
        return (goal == Goal::Reply && missing == 0) ||
               (goal == Goal::Output && !dbus_connection_has_messages_to_send(connection));
    }
    /// Takes a reply to one of the calls.
    bool take(dbus_uint32_t serial, DBusMessage* reply, std::uint64_t signalsBefore) {
        Exchange* const end = exchanges + count;
        Exchange* const exchange = std::find_if(
            exchanges, end, [serial](const Exchange& each) { return each.serial == serial; });
        if (exchange == end || exchange->reply)
            return false;
        exchange->reply.reset(dbus_message_ref(reply));
        exchange->signalsBefore = signalsBefore;
        --missing;
        return true;
    }
    /// How long to sleep next. Longer the longer it has waited: of a reply that was read past this
    /// file it learns after twice the time of its call, or after shortWait.
    Milliseconds nextWait() const {
        const auto now = Clock::now();
        const auto wait = std::clamp<Clock::duration>(now - begin, shortWait, longestWait);
        const auto left =
            std::max(deadline - now, Clock::duration::zero()); // poll() takes -1 as for ever
        return std::chrono::ceil<Milliseconds>(std::min<Clock::duration>(wait, left));
    }
    /// Whether to leave without having reached the goal. Needs no lock.
    bool isOver() const {
        return (interrupted && interrupted->isRaised()) ||
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
    if (link->attach()) {
        if (dbus_connection_set_data(connection, slot, link, destroy))
            return link;
        dbus_connection_remove_filter(connection, filter, link);
    }
    delete link;
    return nullptr;
}

BusLink::BusLink(DBusConnection* connection) : m_connection(connection) {}

BusLink::~BusLink() {
    if (m_wakeFd >= 0)
        close(m_wakeFd);
}

bool BusLink::attach() {
    m_wakeFd = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    dbus_connection_set_max_received_size(m_connection, receiveLimit);
    return m_wakeFd >= 0 && dbus_connection_add_filter(m_connection, filter, this, nullptr);
}

MessagePtr BusLink::call(DBusMessage* message, int timeoutMs, DBusError& error,
                         std::uint64_t* signalsBefore) {
    Exchange exchange{MessagePtr(dbus_message_ref(message))};
    exchangeAll(&exchange, 1, timeoutMs, signalsBefore && receiving == this ? &stop : nullptr);
    if (signalsBefore)
        *signalsBefore = exchange.signalsBefore;
    if (!exchange.reply)
        setNoReply(error, exchange);
    else if (dbus_set_error_from_message(&error, exchange.reply.get()))
        return nullptr;
    return std::move(exchange.reply);
}

void BusLink::callAll(std::vector<Exchange>& exchanges) {
    exchangeAll(exchanges.data(), exchanges.size(), -1, nullptr);
}

void BusLink::exchangeAll(Exchange* first, std::size_t count, int timeoutMs,
                          WakingFlag* interrupted) {
    if (dispatchesHere()) {
        exchangeInsideDispatch(m_connection, first, count, timeoutMs);
        const Lock lock(m_mutex);
        for (Exchange* exchange = first; exchange != first + count; ++exchange)
            exchange->signalsBefore = keptSignals(lock); // without what libdbus read meanwhile
        return;
    }
    if (!dbus_connection_get_is_connected(m_connection))
        return;
    Waiter waiter(first, count, m_connection);
    waiter.interrupted = interrupted;
    if (timeoutMs != std::numeric_limits<int>::max())
        waiter.deadline = waiter.begin + Milliseconds(timeoutMs < 0 ? defaultTimeoutMs : timeoutMs);
    // Sent without pending calls, which are a third of the work of a raw call: libdbus makes an
    // error message for each beforehand. Locked from here on, so that the filter finds the waiter
    // however soon a reply comes; sending neither dispatches nor waits.
    Lock lock(m_mutex);
    m_waiters.reserve(m_waiters.size() + 1); // nothing is thrown once a call is on its way
    for (Exchange* exchange = first; exchange != first + count; ++exchange)
        if (!dbus_connection_send(m_connection, exchange->call.get(), &exchange->serial))
            --waiter.missing;
    join(waiter);
    wait(waiter, lock);
    for (Exchange* exchange = first; exchange != first + count; ++exchange)
        if (!exchange->reply)
            exchange->signalsBefore = keptSignals(lock);
}

/// libdbus's dispatch cannot be entered twice: inside it only libdbus's own wait works, in which
/// no requests are answered.
void BusLink::exchangeInsideDispatch(DBusConnection* connection, Exchange* first, std::size_t count,
                                     int timeoutMs) {
    std::vector<PendingPtr> pending(count);
    for (std::size_t i = 0; i < count; ++i) {
        DBusPendingCall* begun = nullptr;
        if (!dbus_connection_send_with_reply(connection, first[i].call.get(), &begun, timeoutMs) ||
            !begun)
            continue;
        first[i].serial = dbus_message_get_serial(first[i].call.get());
        pending[i].reset(begun);
    }
    for (std::size_t i = 0; i < count; ++i) {
        if (!pending[i])
            continue;
        dbus_pending_call_block(pending[i].get());
        first[i].reply.reset(dbus_pending_call_steal_reply(pending[i].get()));
    }
}

void BusLink::setNoReply(DBusError& error, const Exchange& exchange) const {
    const bool isOpen = dbus_connection_get_is_connected(m_connection);
    if (exchange.serial == 0 && isOpen)
        dbus_set_error_const(&error, DBUS_ERROR_NO_MEMORY, "Not enough memory");
    else if (exchange.serial == 0)
        dbus_set_error_const(&error, DBUS_ERROR_DISCONNECTED, "Connection is closed");
    else if (isOpen)
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

bool BusLink::converse(DBusMessage* message, WakingFlag& interrupted, void (*sent)(),
                       MessagePtr& reply) {
    Exchange exchange{MessagePtr(dbus_message_ref(message))};
    if (dispatchesHere()) {
        sent();
        exchangeInsideDispatch(m_connection, &exchange, 1, DBUS_TIMEOUT_INFINITE);
        reply = std::move(exchange.reply);
        return true;
    }
    const ReceivingScope answersRequests(nullptr);
    interrupted.open(); // without it an interruption is noticed at the next look
    Waiter waiter(&exchange, 1, m_connection);
    waiter.leadsAlways = true;

    Lock lock(m_mutex);
    // The lead is taken before the call is sent: the receive thread would drop a request that
    // comes at once.
    join(waiter);
    while (m_reading)
        waiter.wake.wait_for(lock, longestWait);
    const bool queued = dbus_connection_send(m_connection, message, &exchange.serial);
    while (queued && dbus_connection_has_messages_to_send(m_connection) &&
           lead(lock, longestWait, &waiter)) {
    }
    if (queued)
        sent();
    else
        waiter.deadline = waiter.begin;
    waiter.interrupted = &interrupted; // the call goes out all the same
    wait(waiter, lock);
    reply = std::move(exchange.reply);
    return queued;
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
        waiter.deadline = waiter.begin + shortWait;
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
        if (mayLead(waiter)) {
            if (!lead(lock, waiter.nextWait(), &waiter))
                break;
        } else {
            passLead();
            waiter.woken = false;
            if (waiter.wake.wait_for(lock, waiter.nextWait()) == std::cv_status::timeout)
                wakeLeader(); // to look at what was read past it
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
    passOnStop();
    return open;
}

/// A receive thread that leaves the lead to the callers sleeps where no descriptor wakes it.
void BusLink::passOnStop() {
    if (m_stopPassedOn || !stop.isRaised())
        return;
    m_stopPassedOn = true;
    m_receiverWake.notify_all();
    for (Waiter* waiter : m_waiters)
        if (waiter->interrupted == &stop)
            waiter->wake.notify_one();
}

/// Waits for input, reads it and dispatches it. The mutex is not held.
bool BusLink::step(Milliseconds limit, const Waiter* waiter) {
    const LeadingScope scope(this);
    // Each tick of an idle thread comes past here: only what there is to do is done.
    const bool isQuiet =
        dbus_connection_get_dispatch_status(m_connection) != DBUS_DISPATCH_DATA_REMAINS &&
        !awaitInput(limit, waiter ? waiter->interrupted : nullptr) &&
        !dbus_connection_has_messages_to_send(m_connection);
    const bool open = isQuiet ? dbus_connection_get_is_connected(m_connection)
                              : dbus_connection_read_write(m_connection, 0);
    // What a handler's delay has left is for the next leader when this one has to go.
    while (dbus_connection_dispatch(m_connection) == DBUS_DISPATCH_DATA_REMAINS &&
           !(waiter ? waiter->isOver() : stop.isRaised())) {
    }
    const bool handedOver = m_handedOver.exchange(false, std::memory_order_relaxed);
    if (waiter && handedOver)
        sched_yield(); // where processors are few it is the receive thread's turn
    return open;
}

/// @return whether something has happened before the time was over
bool BusLink::awaitInput(Milliseconds limit, WakingFlag* interrupted) {
    // Once passed on, the stop would only keep callers from sleeping.
    pollfd fds[] = {{-1, POLLIN, 0},
                    {m_wakeFd, POLLIN, 0},
                    {m_stopPassedOn ? -1 : stop.descriptor(), POLLIN, 0},
                    {interrupted ? interrupted->descriptor() : -1, POLLIN, 0}};
    // Asked anew each time: the descriptor of a closed connection may belong to somebody else.
    if (!dbus_connection_get_unix_fd(m_connection, &fds[0].fd))
        return true;
    if (dbus_connection_has_messages_to_send(m_connection))
        limit = std::min(limit, outputRetry);
    const int ready = poll(fds, interrupted ? 4 : 3, static_cast<int>(limit.count()));
    if (ready <= 0)
        return ready < 0;
    if (fds[1].revents != 0) {
        eventfd_t count = 0;
        eventfd_read(m_wakeFd, &count);
    }
    if (fds[2].revents != 0)
        stop.calm();
    if (fds[3].revents != 0)
        interrupted->calm();
    return true;
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
    for (Waiter* waiter : m_waiters)
        wakeIfFinished(*waiter);
}

void BusLink::wakeIfFinished(Waiter& waiter) {
    if (waiter.woken || !waiter.isFinished())
        return;
    waiter.woken = true;
    waiter.wake.notify_one();
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
        MessagePtr unwanted = takeSignal(); // one by one: another deque takes memory
        lock.unlock();
        unwanted.reset();
        lock.lock();
    }
}

MessagePtr BusLink::takeSignal() {
    MessagePtr signal = std::move(m_inbox.front());
    m_inbox.pop_front();
    ++m_taken;
    return signal;
}

std::uint64_t BusLink::keptSignals(const Lock&) const {
    return m_taken + m_inbox.size();
}

std::uint64_t BusLink::takenSignals() {
    const Lock lock(m_mutex);
    return m_taken;
}

BusLink* BusLink::receivingHere() {
    return receiving;
}

void BusLink::receive(Deliver deliver, void* context) {
    const ReceivingScope scope(this);
    const Milliseconds limit = stop.open() ? longestWait : shortWait;
    Lock lock(m_mutex);
    if (m_reading)
        wakeLeader(); // to sleep on the stop too
    ++m_receivers;
    while (!stop.isRaised()) {
        if (m_inbox.empty()) {
            receiveMore(lock, limit);
            continue;
        }
        const MessagePtr message = takeSignal();
        lock.unlock();
        deliver(context, message.get());
        lock.lock();
    }
    --m_receivers;
}

/// Leads, or lets the callers lead, until something may have come in; at most `limit`.
void BusLink::receiveMore(Lock& lock, Milliseconds limit) {
    const auto sinceCall = Clock::now() - m_lastCall;
    if (m_reading || !m_waiters.empty() || sinceCall < callBurst) {
        // In a burst of calls nobody has to wake this thread, which would take a tenth to a third
        // of each call's time: it looks again soon enough.
        m_receiverParked = sinceCall >= 2 * callBurst;
        m_receiverWake.wait_for(lock, m_receiverParked ? limit : callBurst);
        m_receiverParked = false;
    } else {
        const bool open = lead(lock, limit, nullptr);
        passLead();
        if (open || !m_inbox.empty())
            return;
        lock.unlock(); // closed: nothing will come
        pollfd stopped{stop.descriptor(), POLLIN, 0};
        if (poll(&stopped, 1, static_cast<int>(limit.count())) > 0)
            stop.calm();
        lock.lock();
    }
}

/// Runs on the thread that dispatches; never calls the program's callbacks.
DBusHandlerResult BusLink::filter(DBusConnection*, DBusMessage* message, void* data) {
    auto* link = static_cast<BusLink*>(data);
    const DBusHandlerResult result = link->sort(message);
    link->m_ownDispatch.end(); // of what this thread has dispatched before
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
    const auto taker = std::find_if(m_waiters.begin(), m_waiters.end(), [&](Waiter* waiter) {
        return serial != 0 && waiter->take(serial, message, keptSignals(lock));
    });
    if (taker == m_waiters.end())
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    wakeIfFinished(**taker); // now: a handler that takes its time may come next
    if (!LeadingScope::has(this))
        wakeLeader();
    return DBUS_HANDLER_RESULT_HANDLED;
}

DBusHandlerResult BusLink::keepSignal(DBusMessage* message) {
    Lock lock(m_mutex);
    if ((m_receivers == 0 && m_subscriptions == 0) || stop.isRaised())
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
    lock.unlock(); // or the receive thread would wake only to wait for it
    m_handedOver.store(true, std::memory_order_relaxed);
    m_receiverWake.notify_one();
    if (!LeadingScope::has(this))
        wakeLeader(); // the receive thread may be waiting for the socket
    return keptFromOthers ? DBUS_HANDLER_RESULT_HANDLED : DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
}

} // namespace Bluetooth
