// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/remote_object.h>

#include <bluetooth/connection.h>

#include "core/bus_link.h"
#include "core/dbus_ptr.h"
#include "core/log.h"
#include "core/match_rule.h"
#include "core/proxy_use.h"
#include "core/remote_object_private.h"
#include "core/sender_check.h"
#include "core/subscriptions.h"

#include <cerrno>
#include <cstring>
#include <iostream>
#include <new>

namespace Bluetooth {

namespace {

std::string textOf(const char* text) {
    return text ? text : "";
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

thread_local const RemoteObject* loopHere = nullptr; // whose receive thread this is

const char* textAt(DBusMessageIter& iter) {
    const char* text = nullptr;
    dbus_message_iter_get_basic(&iter, &text);
    return text;
}

} // namespace

// The library does not use these, but exports them: the lists are guarded.
std::list<SignalHandler<NoArgumentCallback>>& RemoteObject::signalHandlerVectorNoArgument =
    Subscriptions::all().records<NoArgumentCallback>();
std::list<SignalHandler<StringCallback>>& RemoteObject::signalHandlerVectorString =
    Subscriptions::all().records<StringCallback>();
std::list<SignalHandler<ObjectPathCallback>>& RemoteObject::signalHandlerVectorObjectPath =
    Subscriptions::all().records<ObjectPathCallback>();
std::list<SignalHandler<StringVariantCallback>>& RemoteObject::signalHandlerVectorStringVariant =
    Subscriptions::all().records<StringVariantCallback>();
std::list<SignalHandler<StringDictCallback>>& RemoteObject::signalHandlerVectorStringDict =
    Subscriptions::all().records<StringDictCallback>();

RemoteObject::RemoteObject(const char* destination, const char* path, const char* interface,
                           DBusBusType busType)
    : m_destination(textOf(destination)),
      m_path(textOf(path)),
      m_interface(textOf(interface)),
      m_connection(Connection::get(busType)),
      m_busType(busType),
      // libdbus ends the process on invalid names.
      m_usable(dbus_validate_bus_name(m_destination.c_str(), nullptr) &&
               dbus_validate_path(m_path.c_str(), nullptr) &&
               dbus_validate_interface(m_interface.c_str(), nullptr)) {}

RemoteObject::~RemoteObject() {
    unsubscribeAll();
    ProxyUse::checkNone(*this); // its callbacks may have used it until now
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
    return signalRule(m_interface, member, m_path);
}

template <class Callback>
int RemoteObject::subscribe(const char* member, Callback callback) {
    ScopedError error;
    // The bus refuses what is no member, but a quote would end the text in its rule.
    const bool isText =
        member && (!std::strchr(member, '\'') || dbus_validate_member(member, error));
    if (isText && callback) {
        // Before AddMatch: without memory for the record the bus must not be left with a rule, and
        // the first signal may come before the reply.
        Subscriptions::Records<Callback> record;
        record.emplace_front(this, member, callback);
        const std::string rule = matchRule(member);
        BusLink* link = BusLink::of(m_connection);
        if (link)
            link->addSubscription();
        if (addMatch(link, rule, error)) {
            Subscriptions::all().add(record);
            SenderCheck::prepare(*this);
            return 0;
        }
        if (link)
            link->removeSubscription();
    }
    logError(KES_HERE, "Match error (%s)",
             error.isSet() ? error.message() : "no member or no callback");
    return -1;
}

int RemoteObject::setSignalHandlerNoArgument(const char* member, NoArgumentCallback callback) {
    return subscribe(member, callback);
}

int RemoteObject::setSignalHandlerString(const char* member, StringCallback callback) {
    return subscribe(member, callback);
}

int RemoteObject::setSignalHandlerObjectPath(const char* member, ObjectPathCallback callback) {
    return subscribe(member, callback);
}

int RemoteObject::setSignalHandlerStringVariant(const char* member,
                                                StringVariantCallback callback) {
    return subscribe(member, callback);
}

int RemoteObject::setSignalHandlerStringDict(const char* member, StringDictCallback callback) {
    return subscribe(member, callback);
}

void RemoteObject::unsubscribeAll() {
    const auto removeRules = [this](const auto& records) {
        for (const auto& record : records) {
            ScopedError error;
            BusLink* link = BusLink::of(m_connection); // a proxy with subscriptions has one
            try {
                removeMatch(link, matchRule(record.member), error);
            } catch (const std::bad_alloc&) {
                error.setNoMemory();
            }
            // A rule that stays lets signals in that find no subscriber.
            if (error.isSet())
                logError(KES_HERE, "Remove match error (%s)", error.message());
            link->removeSubscription();
        }
    };
    std::apply([&](const auto&... records) { (removeRules(records), ...); },
               Subscriptions::all().remove(this));
}

void RemoteObject::signalHandlerDispatcherNoArgument(DBusMessage* message) {
    for (Subscriptions::Walk<NoArgumentCallback> walk(message); walk.next();)
        walk.callback()(this); // on purpose: the proxy that runs the loop
}

void RemoteObject::signalHandlerDispatcherString(DBusMessage* message) {
    for (Subscriptions::Walk<StringCallback> walk(message); walk.next();) {
        DBusMessageIter iter;
        if (!openArguments(message, iter, DBUS_TYPE_STRING))
            return;
        walk.callback()(walk.proxy(), textAt(iter));
    }
}

void RemoteObject::signalHandlerDispatcherObjectPath(DBusMessage* message) {
    for (Subscriptions::Walk<ObjectPathCallback> walk(message); walk.next();) {
        DBusMessageIter iter;
        if (!openArguments(message, iter, DBUS_TYPE_OBJECT_PATH))
            return;
        const ObjectPath path(textAt(iter));
        walk.callback()(walk.proxy(), &path);
    }
}

void RemoteObject::signalHandlerDispatcherStringVariant(DBusMessage* message) {
    DictEntry entry;
    for (Subscriptions::Walk<StringVariantCallback> walk(message); walk.next();) {
        DBusMessageIter iter;
        if (!openArguments(message, iter, DBUS_TYPE_STRING))
            return;
        if (parseEntryName(iter, entry) != 0) {
            logError(KES_HERE, "Failed to parse string in signal");
            return;
        }
        dbus_message_iter_next(&iter);
        if (parseEntryValue(iter, entry) != 0) {
            logError(KES_HERE, "Failed to parse variant in signal");
            return;
        }
        walk.callback()(walk.proxy(), entry.first.c_str(), &entry.second);
    }
}

void RemoteObject::signalHandlerDispatcherStringDict(DBusMessage* message) {
    for (Subscriptions::Walk<StringDictCallback> walk(message); walk.next();) {
        DBusMessageIter iter;
        if (!openArguments(message, iter, DBUS_TYPE_STRING))
            return;
        const char* text = textAt(iter);
        dbus_message_iter_next(&iter);
        Dict dict;
        switch (parseDictionary(iter, dict)) {
        case DictResult::Read:
            walk.callback()(walk.proxy(), text, &dict);
            break;
        case DictResult::NoDict:
            logError(KES_HERE, "Argument is not dict");
            return;
        case DictResult::BadName:
            logError(KES_HERE, "Failed to parse entry name");
            return;
        case DictResult::BadValue:
            logError(KES_HERE, "Failed to parse entry value");
            return;
        }
    }
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
    if (loopHere == this) // startLoop() may not have noted the thread yet
        return EDEADLK;   // and it stays there for another one to wait for
    const pthread_t thread = m_loopThread.exchange(0);
    return thread == 0 ? ESRCH : pthread_join(thread, nullptr);
}

void* receiveSignal(void* proxy) {
    auto* object = static_cast<RemoteObject*>(proxy);
    loopHere = object;
    if (BusLink* link = BusLink::of(object->getConnection()))
        link->receive(RemoteObject::dispatch, object);
    loopHere = nullptr;
    return nullptr; // without a bus nothing can come
}

} // namespace Bluetooth
