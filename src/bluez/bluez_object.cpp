// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/bluez_object.h>

#include <bluetooth/dict_codec.h>

#include "bluez/factory.h"
#include "bluez/print.h"
#include "core/method_call.h"

namespace Bluetooth {

BluezObject::BluezObject(const char* path, const char* interface)
    : RemoteObject(daemonName, path, interface, DBUS_BUS_SYSTEM) {}

BluezObject::~BluezObject() {
    unsubscribeAll();
}

Dict* BluezObject::getProperties() {
    return readDict(KES_HERE, *this, "GetProperties");
}

int BluezObject::setProperty(const char* name, const Variant& value) {
    return callMethod(KES_HERE, *this, "SetProperty", name, value);
}

int BluezObject::setPropertyChangedHandler(StringVariantCallback callback) {
    return setSignalHandlerStringVariant("PropertyChanged",
                                         callback ? callback : propertyChangedHandler);
}

void BluezObject::propertyChangedHandler(RemoteObject* sender, const char* name,
                                         const Variant* value) {
    printLine({name, " was changed in ", sender->getPath(), " with ", variantToString(*value)});
}

bool BluezObject::hasBluetoothd() {
    return askWhetherOwned(daemonName, 1).front();
}

} // namespace Bluetooth
