// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_SERVICE_INTERFACES_H
#define KESBLUETOOTH_SERVING_BLUEZ4_SERVICE_INTERFACES_H

#include "serving/bluez4/interfaces.h"

// The interfaces of BlueZ 4.101 for services other than audio, as in interfaces.h.

namespace Bluetooth::Serving {

namespace Interfaces {

inline constexpr const char* input = "org.bluez.Input";
inline constexpr const char* network = "org.bluez.Network";
inline constexpr const char* networkServer = "org.bluez.NetworkServer";
inline constexpr const char* serial = "org.bluez.Serial";
inline constexpr const char* serialProxy = "org.bluez.SerialProxy";
inline constexpr const char* serialProxyManager = "org.bluez.SerialProxyManager";
inline constexpr const char* service = "org.bluez.Service";

} // namespace Interfaces

template <class Served>
const Interface& inputInterface() {
    static const Interface table = {Interfaces::input,
                                    {{"Connect", {}, {}, handle<&Served::connect>},
                                     {"Disconnect", {}, {}, handle<&Served::disconnect>},
                                     Entries::getProperties<&Served::getProperties>()},
                                    {Entries::propertyChanged()}};
    return table;
}

/// org.bluez.Network as 4.101 has it: its Connect takes no service, and so can connect to none.
template <class Served>
const Interface& networkInterface() {
    static const Interface table = {Interfaces::network,
                                    {{"Connect", {}, {}, handle<&Served::connectNothing>},
                                     {"Disconnect", {}, {}, handle<&Served::disconnect>},
                                     Entries::getProperties<&Served::getProperties>()},
                                    {Entries::propertyChanged()}};
    return table;
}

/// org.bluez.Network as its document describes it.
template <class Served>
const Interface& documentedNetworkInterface() {
    static const Interface table = {
        Interfaces::network,
        {{"Connect", {{"uuid", "s"}}, {{"interface", "s"}}, handle<&Served::connect>},
         {"Disconnect", {}, {}, handle<&Served::disconnect>},
         Entries::getProperties<&Served::getProperties>()},
        {Entries::propertyChanged()}};
    return table;
}

template <class Served>
const Interface& networkServerInterface() {
    static const Interface table = {
        Interfaces::networkServer,
        {{"Register", {{"uuid", "s"}, {"bridge", "s"}}, {}, handle<&Served::registerServer>},
         {"Unregister", {{"uuid", "s"}}, {}, handle<&Served::unregisterServer>}},
        {}};
    return table;
}

template <class Served>
const Interface& serialInterface() {
    static const Interface table = {
        Interfaces::serial,
        {{"Connect", {{"pattern", "s"}}, {{"tty", "s"}}, handle<&Served::connect>},
         // It returns a descriptor ("h"); the introspection data of 4.101 says a string.
         {"ConnectFD", {{"pattern", "s"}}, {{"fd", "s"}}, handle<&Served::connect>},
         {"Disconnect", {{"device", "s"}}, {}, handle<&Served::disconnect>}},
        {}};
    return table;
}

template <class Served>
const Interface& serialProxyManagerInterface() {
    static const Interface table = {
        Interfaces::serialProxyManager,
        {{"CreateProxy",
          {{"pattern", "s"}, {"address", "s"}},
          {{"path", "s"}},
          handle<&Served::createProxy>},
         {"ListProxies", {}, {{"paths", "as"}}, handle<&Served::listProxies>},
         {"RemoveProxy", {{"path", "s"}}, {}, handle<&Served::removeProxy>}},
        {{"ProxyCreated", {{"path", "s"}}}, {"ProxyRemoved", {{"path", "s"}}}}};
    return table;
}

template <class Served>
const Interface& serialProxyInterface() {
    static const Interface table = {
        Interfaces::serialProxy,
        {{"Enable", {}, {}, handle<&Served::enable>},
         {"Disable", {}, {}, handle<&Served::disable>},
         {"GetInfo", {}, {{"properties", "a{sv}"}}, handle<&Served::getInfo>},
         {"SetSerialParameters",
          {{"rate", "s"}, {"data", "y"}, {"stop", "y"}, {"parity", "s"}},
          {},
          handle<&Served::setSerialParameters>}},
        {}};
    return table;
}

template <class Served>
const Interface& serviceInterface() {
    static const Interface table = {
        Interfaces::service,
        {{"AddRecord", {{"record", "s"}}, {{"handle", "u"}}, handle<&Served::addRecord>},
         {"UpdateRecord", {{"handle", "u"}, {"record", "s"}}, {}, handle<&Served::updateRecord>},
         {"RemoveRecord", {{"handle", "u"}}, {}, handle<&Served::removeRecord>},
         {"RequestAuthorization",
          {{"address", "s"}, {"handle", "u"}},
          {},
          handle<&Served::requestAuthorization>},
         {"CancelAuthorization", {}, {}, handle<&Served::cancelAuthorization>}},
        {}};
    return table;
}

} // namespace Bluetooth::Serving

#endif
