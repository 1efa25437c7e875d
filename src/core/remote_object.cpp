#include <bluetooth/remote_object.h>

#include <bluetooth/connection.h>

#include "core/bus_link.h"
#include "core/dbus_ptr.h"
#include "core/log.h"
#include "core/remote_object_private.h"

#include <algorithm>
#include <cerrno>
#include <condition_variable>
#include <iostream>
#include <mutex>
#include <new>
#include <thread>

namespace Bluetooth {

namespace {

std::string textOf(const char* text) {
    return text ? text : "";
}

/// A callback that is being called.
struct Running {
    const RemoteObject* object;
    std::thread::id thread;
};

struct Guard {
    std::mutex mutex; // for the registries and for what follows; not held in callbacks
    std::vector<Running> running;
    std::condition_variable callbackDone;
};

Guard& guard() {
    static Guard& instance = *new Guard; // never destroyed: a receive thread may outlive main()
    return instance;
}

/// How many threads walk a registry. Meanwhile no record leaves it: it is only marked dead, by a
/// null object, and the last walker takes it out.
template <class Callback>
int walkers = 0;

/// One thread's walk. The guard is held when it begins and ends.
template <class Callback>
class Walk {
public:
    explicit Walk(std::list<SignalHandler<Callback>>& registry) : m_registry(registry) {
        ++walkers<Callback>;
    }
    ~Walk() {
        if (--walkers<Callback> == 0)
            m_registry.remove_if([](const auto& record) { return !record.object; });
    }
    Walk(const Walk&) = delete;
    Walk& operator=(const Walk&) = delete;

private:
    std::list<SignalHandler<Callback>>& m_registry;
};

/// While it lives, an object's callback is being called and the guard is not held.
class Calling {
public:
    Calling(std::unique_lock<std::mutex>& lock, const RemoteObject* object)
        : m_lock(lock), m_object(object) {
        guard().running.push_back({object, std::this_thread::get_id()});
        m_lock.unlock();
    }
    ~Calling() {
        m_lock.lock();
        auto& running = guard().running;
        running.erase(std::find_if(running.begin(), running.end(), [this](const Running& call) {
            return call.object == m_object && call.thread == std::this_thread::get_id();
        }));
        guard().callbackDone.notify_all();
    }
    Calling(const Calling&) = delete;
    Calling& operator=(const Calling&) = delete;

private:
    std::unique_lock<std::mutex>& m_lock;
    const RemoteObject* m_object;
};

/// Calls visit(object, callback) for the subscriptions that a signal is for, front to back, until
/// one returns false. The guard is not held in visit().
template <class Callback, class Visit>
void forEachMatch(std::list<SignalHandler<Callback>>& registry, DBusMessage* message, Visit visit) {
    if (!message)
        return; // libdbus would end the process
    std::unique_lock<std::mutex> lock(guard().mutex);
    const Walk<Callback> walk(registry);
    bool more = true;
    for (auto record = registry.begin(); more && record != registry.end(); ++record) {
        // Neither path nor sender is compared: every subscribed proxy of the interface is told.
        if (!record->object || !dbus_message_is_signal(message, record->object->getInterface(),
                                                       record->member.c_str()))
            continue;
        RemoteObject* object = record->object;
        const Callback callback = record->callback;
        const Calling calling(lock, object);
        more = visit(object, callback);
    }
}

bool isBusy(const RemoteObject* object) {
    const std::thread::id self = std::this_thread::get_id();
    const auto& running = guard().running;
    return std::any_of(running.begin(), running.end(), [&](const Running& call) {
        return call.object == object && call.thread != self;
    });
}

/// AddMatch or RemoveMatch. libdbus's own functions would hold the connection while they wait.
bool changeMatch(BusLink* link, const char* method, const std::string& rule, ScopedError& error) {
    const char* text = rule.c_str();
    if (!link || !dbus_validate_utf8(text, error)) {
        if (!link)
            dbus_set_error_const(error, DBUS_ERROR_DISCONNECTED, "Not connected to the bus");
        return false;
    }
    const MessagePtr message(dbus_message_new_method_call(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS,
                                                          DBUS_INTERFACE_DBUS, method));
    if (!message ||
        !dbus_message_append_args(message.get(), DBUS_TYPE_STRING, &text, DBUS_TYPE_INVALID)) {
        dbus_set_error_const(error, DBUS_ERROR_NO_MEMORY, "Not enough memory");
        return false;
    }
    try {
        return link->call(message.get(), -1, error.get()) != nullptr;
    } catch (const std::bad_alloc&) {
        dbus_set_error_const(error, DBUS_ERROR_NO_MEMORY, "Not enough memory");
        return false;
    }
}

/// Moves to the first argument. @return false, logged, when there is none or it has another type
bool openArguments(DBusMessage* message, DBusMessageIter& iter, int type) {
    if (!dbus_message_iter_init(message, &iter)) {
        logError(KES_HERE, "Signal has no arguments");
        return false;
    }
    if (dbus_message_iter_get_arg_type(&iter) == type)
        return true;
    if (type == DBUS_TYPE_OBJECT_PATH)
        logError(KES_HERE, "Argument is not object path");
    else
        logError(KES_HERE, "Argument is not string");
    return false;
}

const char* textAt(DBusMessageIter& iter) {
    const char* text = nullptr;
    dbus_message_iter_get_basic(&iter, &text);
    return text;
}

} // namespace

std::list<SignalHandler<NoArgumentCallback>>& RemoteObject::signalHandlerVectorNoArgument =
    *new Registry<NoArgumentCallback>;
std::list<SignalHandler<StringCallback>>& RemoteObject::signalHandlerVectorString =
    *new Registry<StringCallback>;
std::list<SignalHandler<ObjectPathCallback>>& RemoteObject::signalHandlerVectorObjectPath =
    *new Registry<ObjectPathCallback>;
std::list<SignalHandler<StringVariantCallback>>& RemoteObject::signalHandlerVectorStringVariant =
    *new Registry<StringVariantCallback>;
std::list<SignalHandler<StringDictCallback>>& RemoteObject::signalHandlerVectorStringDict =
    *new Registry<StringDictCallback>;

RemoteObject::RemoteObject(const char* destination, const char* path, const char* interface,
                           DBusBusType busType)
    : m_destination(textOf(destination)),
      m_path(textOf(path)),
      m_interface(textOf(interface)),
      m_connection(Connection::get(busType)),
      m_busType(busType),
      // libdbus ends the process on names that are none.
      m_usable(dbus_validate_bus_name(m_destination.c_str(), nullptr) &&
               dbus_validate_path(m_path.c_str(), nullptr) &&
               dbus_validate_interface(m_interface.c_str(), nullptr)) {}

RemoteObject::~RemoteObject() {
    unsubscribeAll();
    if (m_message)
        dbus_message_unref(m_message);
    if (m_reply)
        dbus_message_unref(m_reply);
}

const char* RemoteObject::getConnectionName() const {
    const char* name = m_connection ? dbus_bus_get_unique_name(m_connection) : nullptr;
    return name ? name : "";
}

std::string RemoteObject::getInfo() const {
    return "RemoteObject name: " + m_destination + "\nPath: " + m_path +
           "\nInterface: " + m_interface + "\n";
}

void RemoteObject::printInfo() const {
    std::cout << getInfo();
}

std::string RemoteObject::matchRule(const std::string& member) const {
    return "type='signal',interface='" + m_interface + "',member='" + member + "',path='" + m_path +
           "'";
}

template <class Callback>
int RemoteObject::subscribe(Registry<Callback>& registry, const char* member, Callback callback) {
    ScopedError error;
    BusLink* link = BusLink::of(m_connection);
    const bool usable = member && callback && dbus_validate_member(member, error);
    // Before AddMatch: without memory for the record the bus must not be left with a rule.
    Registry<Callback> record;
    if (usable)
        record.emplace_front(this, member, callback);
    const std::string rule = usable ? matchRule(member) : "";
    if (link)
        link->addSubscription(); // before AddMatch: its signals may come before its reply
    if (!usable || !changeMatch(link, "AddMatch", rule, error)) {
        if (link)
            link->removeSubscription();
        logError(KES_HERE, "Match error (%s)",
                 error.isSet() ? error.message() : "no member or no callback");
        return -1;
    }
    const std::lock_guard<std::mutex> lock(guard().mutex);
    registry.splice(registry.begin(), record);
    return 0;
}

int RemoteObject::setSignalHandlerNoArgument(const char* member, NoArgumentCallback callback) {
    return subscribe(signalHandlerVectorNoArgument, member, callback);
}

int RemoteObject::setSignalHandlerString(const char* member, StringCallback callback) {
    return subscribe(signalHandlerVectorString, member, callback);
}

int RemoteObject::setSignalHandlerObjectPath(const char* member, ObjectPathCallback callback) {
    return subscribe(signalHandlerVectorObjectPath, member, callback);
}

int RemoteObject::setSignalHandlerStringVariant(const char* member,
                                                StringVariantCallback callback) {
    return subscribe(signalHandlerVectorStringVariant, member, callback);
}

int RemoteObject::setSignalHandlerStringDict(const char* member, StringDictCallback callback) {
    return subscribe(signalHandlerVectorStringDict, member, callback);
}

/// Takes this proxy's records out of a registry. The guard is held.
template <class Callback>
void RemoteObject::takeMembers(Registry<Callback>& registry, std::vector<std::string>& members) {
    for (auto record = registry.begin(); record != registry.end();) {
        const auto current = record++;
        if (current->object != this)
            continue;
        try {
            members.push_back(std::move(current->member));
        } catch (const std::bad_alloc&) { // in the destructor: the rule has to stay
            logError(KES_HERE, "Remove match error (Not enough memory)");
            BusLink::of(m_connection)->removeSubscription();
        }
        if (walkers < Callback >> 0)
            current->object = nullptr;
        else
            registry.erase(current);
    }
}

void RemoteObject::unsubscribeAll() {
    std::vector<std::string> members;
    {
        std::unique_lock<std::mutex> lock(guard().mutex);
        takeMembers(signalHandlerVectorNoArgument, members);
        takeMembers(signalHandlerVectorString, members);
        takeMembers(signalHandlerVectorObjectPath, members);
        takeMembers(signalHandlerVectorStringVariant, members);
        takeMembers(signalHandlerVectorStringDict, members);
        guard().callbackDone.wait(lock, [this] { return !isBusy(this); });
    }
    if (members.empty())
        return;
    BusLink* link = BusLink::of(m_connection); // a proxy with subscriptions has one
    for (const std::string& member : members) {
        ScopedError error;
        bool removed = false;
        try {
            removed = changeMatch(link, "RemoveMatch", matchRule(member), error);
        } catch (const std::bad_alloc&) {
            dbus_set_error_const(error, DBUS_ERROR_NO_MEMORY, "Not enough memory");
        }
        // A rule that stays lets signals in that find no subscriber.
        if (!removed)
            logError(KES_HERE, "Remove match error (%s)", error.message());
        link->removeSubscription();
    }
}

void RemoteObject::signalHandlerDispatcherNoArgument(DBusMessage* message) {
    forEachMatch(signalHandlerVectorNoArgument, message,
                 [this](RemoteObject*, NoArgumentCallback callback) {
                     callback(this); // on purpose: the proxy that runs the loop
                     return true;
                 });
}

void RemoteObject::signalHandlerDispatcherString(DBusMessage* message) {
    forEachMatch(signalHandlerVectorString, message,
                 [message](RemoteObject* object, StringCallback callback) {
                     DBusMessageIter iter;
                     if (!openArguments(message, iter, DBUS_TYPE_STRING))
                         return false;
                     callback(object, textAt(iter));
                     return true;
                 });
}

void RemoteObject::signalHandlerDispatcherObjectPath(DBusMessage* message) {
    forEachMatch(signalHandlerVectorObjectPath, message,
                 [message](RemoteObject* object, ObjectPathCallback callback) {
                     DBusMessageIter iter;
                     if (!openArguments(message, iter, DBUS_TYPE_OBJECT_PATH))
                         return false;
                     const ObjectPath path(textAt(iter));
                     callback(object, &path);
                     return true;
                 });
}

void RemoteObject::signalHandlerDispatcherStringVariant(DBusMessage* message) {
    DictEntry entry;
    forEachMatch(signalHandlerVectorStringVariant, message,
                 [&](RemoteObject* object, StringVariantCallback callback) {
                     DBusMessageIter iter;
                     if (!openArguments(message, iter, DBUS_TYPE_STRING))
                         return false;
                     if (parseEntryName(iter, entry) != 0) {
                         logError(KES_HERE, "Failed to parse string in signal");
                         return false;
                     }
                     dbus_message_iter_next(&iter);
                     if (parseEntryValue(iter, entry) != 0) {
                         logError(KES_HERE, "Failed to parse variant in signal");
                         return false;
                     }
                     callback(object, entry.first.c_str(), &entry.second);
                     return true;
                 });
}

void RemoteObject::signalHandlerDispatcherStringDict(DBusMessage* message) {
    forEachMatch(signalHandlerVectorStringDict, message,
                 [&](RemoteObject* object, StringDictCallback callback) {
                     DBusMessageIter iter;
                     if (!openArguments(message, iter, DBUS_TYPE_STRING))
                         return false;
                     const char* text = textAt(iter);
                     dbus_message_iter_next(&iter);
                     Dict dict;
                     switch (parseDictionary(iter, dict)) {
                     case DictResult::Read:
                         callback(object, text, &dict);
                         return true;
                     case DictResult::NoDict:
                         logError(KES_HERE, "Argument is not dict");
                         return false;
                     case DictResult::BadName:
                         logError(KES_HERE, "Failed to parse entry name");
                         return false;
                     case DictResult::BadValue:
                         logError(KES_HERE, "Failed to parse entry value");
                         return false;
                     }
                     return false;
                 });
}

void RemoteObject::dispatch(void* proxy, DBusMessage* message) {
    constexpr void (RemoteObject::*dispatchers[])(DBusMessage*) = {
        &RemoteObject::signalHandlerDispatcherObjectPath,
        &RemoteObject::signalHandlerDispatcherStringVariant,
        &RemoteObject::signalHandlerDispatcherString,
        &RemoteObject::signalHandlerDispatcherStringDict,
        &RemoteObject::signalHandlerDispatcherNoArgument};
    for (const auto dispatcher : dispatchers) {
        try {
            (static_cast<RemoteObject*>(proxy)->*dispatcher)(message);
        } catch (const std::bad_alloc&) { // the thread goes on with the next signal
            logError(KES_HERE, "Not enough memory for a signal");
        }
    }
}

int RemoteObject::startLoop() {
    pthread_t thread = 0;
    const int error = pthread_create(&thread, nullptr, receiveSignal, this);
    if (error == 0)
        m_loopThread = thread;
    return error;
}

void RemoteObject::stopLoop() {
    BusLink::requestStop();
}

int RemoteObject::waitLoop() {
    if (m_loopThread == 0)
        return ESRCH;
    return pthread_join(std::exchange(m_loopThread, 0), nullptr);
}

void* receiveSignal(void* proxy) {
    auto* object = static_cast<RemoteObject*>(proxy);
    if (BusLink* link = BusLink::of(object->getConnection()))
        link->receive(RemoteObject::dispatch, object);
    return nullptr; // without a bus nothing can come
}

} // namespace Bluetooth
