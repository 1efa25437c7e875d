// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/scanner.h>

#include <bluetooth/adapter.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include "core/method_call.h"
#include "core/remote_object_private.h"
#include "scanner/names.h"

#include <memory>

namespace Bluetooth {

Scanner::Scanner()
    : RemoteObject(scannerBusName, scannerPath, scannerInterface, DBUS_BUS_SESSION) {}

Scanner::~Scanner() {
    unsubscribeAll();
}

/// Whether the Bluetooth daemon knows the adapter: otherwise the service need not be started. What
/// it says instead becomes the scanner's error; the manager has logged it.
bool Scanner::isAdapter(const char* adapterId) {
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (manager && std::unique_ptr<Adapter>(manager->findAdapter(adapterId)))
        return true;
    if (!manager || !manager->hasError() || !BluezObject::hasBluetoothd())
        recordDBusError(DBUS_ERROR_NAME_HAS_NO_OWNER, "The Bluetooth daemon is not running");
    else if (manager->getErrorNumber() == errorDBus)
        recordDBusError(manager->getErrorName(), manager->getErrorMessage().c_str());
    else
        recordError(static_cast<ErrorNumber>(manager->getErrorNumber()));
    return false;
}

std::vector<std::pair<std::string, Dict*>>* Scanner::listDevices(const char* adapterId,
                                                                 bool logErrors) {
    resetError();
    Dict reply;
    if (!isAdapter(adapterId))
        return nullptr;
    const bool answered = askFor(*this, "ListDevices", reply, adapterId);
    if (logErrors)
        logAnyError(KES_HERE, *this);
    if (!answered)
        return nullptr;

    auto devices = std::make_unique<std::vector<std::pair<std::string, Dict*>>>();
    devices->reserve(reply.size());
    for (const auto& [address, text] : reply) {
        // Null for a text without any entry, as in the pair that an empty answer consists of.
        std::unique_ptr<Dict> properties(stringDivideToDict(variantToString(text), ";"));
        if (!properties)
            continue;
        devices->emplace_back(address, properties.get());
        static_cast<void>(properties.release());
    }
    return devices.release();
}

bool Scanner::removeFinder(const char* adapterId) {
    resetError();
    // Not waited for: the program is done with the service, whatever that answers.
    return isAdapter(adapterId) && callMethod(KES_HERE, *this, "RemoveFinder", adapterId) == 0;
}

} // namespace Bluetooth
