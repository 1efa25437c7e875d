// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/manager.h>

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>

#include "bluez/factory.h"
#include "bluez/print.h"
#include "core/method_call.h"

namespace Bluetooth {

Manager::Manager() : BluezObject("/", "org.bluez.Manager") {}

Manager::~Manager() {
    unsubscribeAll();
}

Manager* Manager::getManager() {
    return makeProxy<Manager>();
}

Adapter* Manager::defaultAdapter() {
    ObjectPath path;
    return readMethod(KES_HERE, *this, "DefaultAdapter", path) ? Adapter::getAdapter(path)
                                                               : nullptr;
}

Adapter* Manager::findAdapter(const char* pattern) {
    ObjectPath path;
    return readMethod(KES_HERE, *this, "FindAdapter", path, pattern) ? Adapter::getAdapter(path)
                                                                     : nullptr;
}

Adapter* Manager::getAdapterByIndex(unsigned int index) {
    resetError();
    Adapter* adapter = nullptr;
    std::vector<ObjectPath> paths;
    // An index past the end means the default adapter, so that a program made for several adapters
    // works with one.
    if (askFor(*this, "ListAdapters", paths))
        adapter = index < paths.size() ? Adapter::getAdapter(paths[index]) : defaultAdapter();
    // After the default adapter was tried: its error is logged again under this place, which tells
    // a failed fallback from a failed defaultAdapter().
    logAnyError(KES_HERE, *this);
    return adapter;
}

AdapterList* Manager::listAdapters() {
    // Neither forgets nor logs errors: a program may list between a failed call and the reading of
    // its error, and poll without filling the log.
    std::vector<ObjectPath> paths;
    return askFor(*this, "ListAdapters", paths) ? makeList<Adapter, AdapterList>(paths) : nullptr;
}

int Manager::setAdapterAddedHandler(ObjectPathCallback callback) {
    return setSignalHandlerObjectPath("AdapterAdded", callback ? callback : adapterAddedHandler);
}

int Manager::setAdapterRemovedHandler(ObjectPathCallback callback) {
    return setSignalHandlerObjectPath("AdapterRemoved",
                                      callback ? callback : adapterRemovedHandler);
}

int Manager::setDefaultAdapterChangedHandler(ObjectPathCallback callback) {
    return setSignalHandlerObjectPath("DefaultAdapterChanged",
                                      callback ? callback : defaultAdapterChangedHandler);
}

void Manager::adapterAddedHandler(RemoteObject* sender, const ObjectPath* adapter) {
    printLine({adapter->c_str(), " was added by ", sender->getPath()});
}

void Manager::adapterRemovedHandler(RemoteObject* sender, const ObjectPath* adapter) {
    printLine({adapter->c_str(), " was removed by ", sender->getPath()});
}

void Manager::defaultAdapterChangedHandler(RemoteObject* sender, const ObjectPath* adapter) {
    // Programs match this line: the spelling stays.
    printLine({"Default adpater is ", adapter->c_str(), " in ", sender->getPath(), " now"});
}

} // namespace Bluetooth
