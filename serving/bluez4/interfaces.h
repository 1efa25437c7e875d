// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_INTERFACES_H
#define KESBLUETOOTH_SERVING_BLUEZ4_INTERFACES_H

#include "serving/bus/interface.h"

// The interfaces of BlueZ 4.101, each member at the place where its introspection data has it.
// A table is a template of the class that carries the methods out, which has a member function
// for each entry, and befriends the table where these are private.

namespace Bluetooth::Serving {

namespace Interfaces {

inline constexpr const char* manager = "org.bluez.Manager";
inline constexpr const char* adapter = "org.bluez.Adapter";
inline constexpr const char* device = "org.bluez.Device";
inline constexpr const char* agent = "org.bluez.Agent"; ///< what clients serve

} // namespace Interfaces

namespace Entries {

template <auto Function>
MethodEntry getProperties() {
    return {"GetProperties", {}, {{"properties", "a{sv}"}}, handle<Function>};
}

template <auto Function>
MethodEntry setProperty() {
    return {"SetProperty", {{"name", "s"}, {"value", "v"}}, {}, handle<Function>};
}

inline SignalEntry propertyChanged() {
    return {"PropertyChanged", {{"name", "s"}, {"value", "v"}}};
}

} // namespace Entries

template <class Served>
const Interface& managerInterface() {
    static const Interface table = {
        Interfaces::manager,
        {Entries::getProperties<&Served::getProperties>(),
         {"DefaultAdapter", {}, {{"adapter", "o"}}, handle<&Served::defaultAdapter>},
         {"FindAdapter", {{"pattern", "s"}}, {{"adapter", "o"}}, handle<&Served::findAdapter>},
         {"ListAdapters", {}, {{"adapters", "ao"}}, handle<&Served::listAdapters>}},
        {Entries::propertyChanged(),
         {"AdapterAdded", {{"adapter", "o"}}},
         {"AdapterRemoved", {{"adapter", "o"}}},
         {"DefaultAdapterChanged", {{"adapter", "o"}}}}};
    return table;
}

template <class Served>
const Interface& adapterInterface() {
    static const Interface table = {
        Interfaces::adapter,
        {Entries::getProperties<&Served::getProperties>(),
         Entries::setProperty<&Served::setProperty>(),
         {"RequestSession", {}, {}, handle<&Served::requestSession>},
         {"ReleaseSession", {}, {}, handle<&Served::releaseSession>},
         {"StartDiscovery", {}, {}, handle<&Served::startDiscovery>},
         {"StopDiscovery", {}, {}, handle<&Served::stopDiscovery>},
         {"ListDevices", {}, {{"devices", "ao"}}, handle<&Served::listDevices>, true},
         {"CreateDevice", {{"address", "s"}}, {{"device", "o"}}, handle<&Served::createDevice>},
         {"CreatePairedDevice",
          {{"address", "s"}, {"agent", "o"}, {"capability", "s"}},
          {{"device", "o"}},
          handle<&Served::createPairedDevice>},
         {"CancelDeviceCreation", {{"address", "s"}}, {}, handle<&Served::cancelDeviceCreation>},
         {"RemoveDevice", {{"device", "o"}}, {}, handle<&Served::removeDevice>},
         {"FindDevice", {{"address", "s"}}, {{"device", "o"}}, handle<&Served::findDevice>},
         {"RegisterAgent",
          {{"agent", "o"}, {"capability", "s"}},
          {},
          handle<&Served::registerAgent>},
         {"UnregisterAgent", {{"agent", "o"}}, {}, handle<&Served::unregisterAgent>}},
        {Entries::propertyChanged(),
         {"DeviceCreated", {{"device", "o"}}},
         {"DeviceRemoved", {{"device", "o"}}},
         {"DeviceFound", {{"address", "s"}, {"values", "a{sv}"}}},
         {"DeviceDisappeared", {{"address", "s"}}}}};
    return table;
}

template <class Served>
const Interface& deviceInterface() {
    static const Interface table = {"org.bluez.Device",
                                    {Entries::getProperties<&Served::getProperties>(),
                                     Entries::setProperty<&Served::setProperty>(),
                                     {"DiscoverServices",
                                      {{"pattern", "s"}},
                                      {{"services", "a{us}"}},
                                      handle<&Served::discoverServices>},
                                     {"CancelDiscovery", {}, {}, handle<&Served::cancelDiscovery>},
                                     {"Disconnect", {}, {}, handle<&Served::disconnect>}},
                                    {Entries::propertyChanged(), {"DisconnectRequested", {}}}};
    return table;
}

} // namespace Bluetooth::Serving

#endif
