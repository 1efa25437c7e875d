// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_SUBSCRIPTIONS_H
#define KESBLUETOOTH_CORE_SUBSCRIPTIONS_H

#include <bluetooth/signal_handler.h>

#include <dbus/dbus.h>

#include <condition_variable>
#include <list>
#include <mutex>
#include <thread>
#include <tuple>

namespace Bluetooth {

/// The subscriptions of all proxies of the process: who is called when a signal arrives.
///
/// RECORDS. A subscription is a record of its proxy, the signal's name and the callback. There is
/// a list of records for each of the five kinds of callbacks, the newest in front.
///
/// WALKS. To deliver a signal is to walk each list from front to back and to call what matches by
/// interface and name. The path is not compared, on purpose: a signal of one object reaches the
/// subscribed proxies of all objects of its interface. Nor is the sender, unless the program has
/// asked for that (SenderCheck). Several threads may walk a list
/// at once (each bus has its receive thread), and a callback may begin a walk inside the one that
/// called it. Records come and go meanwhile:
/// - One that is added is put in front of every walk: it sees the next signal, not this one.
/// - One that is removed is gone at once, and no walk comes to it any more. A walk remembers which
///   record is next, and removing that one moves the walk on; the record whose callback runs may
///   go too, since the walk does not need it again.
/// So whoever stays subscribed gets every signal once, whatever others do.
///
/// THREADS. Any function may be called on any thread. One mutex guards the lists, where the walks
/// stand and what they call. It is never held while a callback runs or a message is sent:
/// callbacks may subscribe, destroy proxies and make calls.
///
/// DESTRUCTION. Once remove() has taken out a proxy's records, no callback begins for it. remove()
/// then waits for those that run on other threads, and so a proxy may be destroyed afterwards. It
/// does not wait for those of its own thread: a callback may destroy its own proxy. Two callbacks
/// on two threads that destroy each other's proxies wait for ever.
///
/// MEMORY. Nothing here allocates, so nothing is thrown: add() is given the record ready made.
class Subscriptions {
public:
    template <class Callback>
    using Records = std::list<SignalHandler<Callback>>;
    using RecordsOfAllKinds =
        std::tuple<Records<NoArgumentCallback>, Records<StringCallback>,
                   Records<ObjectPathCallback>, Records<StringVariantCallback>,
                   Records<StringDictCallback>>;
    template <class Callback>
    class Walk;

    static Subscriptions& all();

    ~Subscriptions() = delete; // a receive thread may outlive main()
    Subscriptions(const Subscriptions&) = delete;
    Subscriptions& operator=(const Subscriptions&) = delete;

    /// Takes the one record from `record`.
    template <class Callback>
    void add(Records<Callback>& record) {
        const std::lock_guard<std::mutex> lock(m_mutex);
        auto& records = of<Callback>().records;
        records.splice(records.begin(), record);
    }

    /// Takes out the records of a proxy, each kind's in their order, and waits until no other
    /// thread runs one of its callbacks.
    RecordsOfAllKinds remove(const RemoteObject* proxy);

    /// The list itself, which programs know by RemoteObject's static members: not to be touched,
    /// for it is guarded.
    template <class Callback>
    Records<Callback>& records() {
        return of<Callback>().records;
    }

private:
    template <class Callback>
    struct Kind {
        Records<Callback> records;
        Walk<Callback>* walks = nullptr; // those under way
    };

    Subscriptions();

    template <class Callback>
    Kind<Callback>& of() {
        return std::get<Kind<Callback>>(m_kinds);
    }
    template <class Callback>
    static void take(Kind<Callback>& kind, const RemoteObject* proxy, RecordsOfAllKinds& taken);
    bool isCalling(const RemoteObject* proxy) const;

    std::mutex m_mutex; // for all that follows
    std::tuple<Kind<NoArgumentCallback>, Kind<StringCallback>, Kind<ObjectPathCallback>,
               Kind<StringVariantCallback>, Kind<StringDictCallback>>
        m_kinds;
    std::condition_variable m_callbackDone;
};

/// One signal on its way along the records of a kind:
/// @code
///     for (Subscriptions::Walk<StringCallback> walk(signal); walk.next();)
///         walk.callback()(walk.proxy(), text);
/// @endcode
/// From a next() that returns true until the following one, or the end of the walk, the callback
/// counts as running. Only to be used in this way, for outside the loop's body the mutex is
/// held.
template <class Callback>
class Subscriptions::Walk {
public:
    /// @param signal anything else matches nothing, null too
    explicit Walk(DBusMessage* signal);
    ~Walk() { leave(); }
    Walk(const Walk&) = delete;
    Walk& operator=(const Walk&) = delete;

    /// Goes on to the next record that the signal is for. @return false when there is none
    bool next();

    RemoteObject* proxy() const { return m_proxy; }
    Callback callback() const { return m_callback; }

private:
    friend class Subscriptions;

    bool matches(const SignalHandler<Callback>& record) const;
    void beginCall(const SignalHandler<Callback>& record);
    void endCall();
    void leave();

    Subscriptions& m_all = all();
    std::unique_lock<std::mutex> m_lock; // not held while a callback runs
    Kind<Callback>& m_kind;
    DBusMessage* const m_signal;
    typename Records<Callback>::iterator m_next;
    RemoteObject* m_proxy = nullptr; // whose callback runs; null: none
    Callback m_callback = nullptr;
    std::thread::id m_thread; // none before the first callback; then the walk is one of m_kind
    Walk* m_other = nullptr;  // another walk along the same records
};

} // namespace Bluetooth

#endif
