// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/dbus_object.h>

#include "core/bus_link.h"
#include "core/bus_names.h"
#include "core/dbus_ptr.h"
#include "core/method_call.h"
#include "core/method_call_message.h"

#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <utility>

namespace Bluetooth {

namespace {

/// Searches a list of names where it lies: on a desktop it has hundreds. What is no such list is
/// read as any reply, for its error.
bool lists(MessagePtr reply, const char* name) {
    if (!dbus_message_has_signature(reply.get(), "as")) {
        DBusObject bus;
        std::vector<std::string> none;
        bus.setReplyMessage(reply.release());
        bus.getReplyValue(none);
        logAnyError(KES_HERE, bus);
        return false;
    }
    DBusMessageIter reader;
    DBusMessageIter names;
    dbus_message_iter_init(reply.get(), &reader);
    for (dbus_message_iter_recurse(&reader, &names);
         dbus_message_iter_get_arg_type(&names) == DBUS_TYPE_STRING;
         dbus_message_iter_next(&names)) {
        const char* owned = nullptr;
        dbus_message_iter_get_basic(&names, &owned);
        if (std::strcmp(owned, name) == 0)
            return true;
    }
    return false;
}

} // namespace

DBusObject::DBusObject()
    : RemoteObject(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS, DBUS_INTERFACE_DBUS, DBUS_BUS_SYSTEM) {}

DBusObject::~DBusObject() {
    unsubscribeAll();
}

std::vector<std::string>* DBusObject::listNames() {
    auto names = std::make_unique<std::vector<std::string>>();
    readMethod(KES_HERE, *this, "ListNames", *names);
    return names.release();
}

std::vector<bool> askWhetherOwned(const char* name, std::size_t times) {
    DBusObject bus;
    BusLink* const link = BusLink::of(bus.getConnection());
    std::vector<BusLink::Exchange> exchanges(times);
    for (BusLink::Exchange& exchange : exchanges) {
        exchange.call =
            newMethodCall(bus.getDestination(), bus.getPath(), bus.getInterface(), "ListNames");
        if (!exchange.call)
            throw std::bad_alloc();
    }
    if (link)
        link->callAll(exchanges);

    std::vector<bool> answers;
    answers.reserve(times);
    for (BusLink::Exchange& exchange : exchanges) {
        ScopedError error;
        if (!link)
            dbus_set_error_const(error, DBUS_ERROR_DISCONNECTED, "Not connected to the bus");
        else if (!exchange.reply)
            link->setNoReply(error.get(), exchange);
        else
            dbus_set_error_from_message(error, exchange.reply.get());
        if (error.isSet())
            logError(KES_HERE, "%s", error.message());
        answers.push_back(!error.isSet() && lists(std::move(exchange.reply), name));
    }
    return answers;
}

} // namespace Bluetooth
