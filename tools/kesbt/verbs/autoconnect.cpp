// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/autoconnect_list.h"
#include "daemon/autoconnect_pipe.h"
#include "daemon/objects.h"
#include "show/text.h"
#include "verbs/list.h"

#include <bluetooth/adapter_list.h>
#include <bluetooth/auto_connect.h>

#include <algorithm>
#include <cstring>
#include <iostream>

namespace Kesbt {

namespace {

using Bluetooth::AutoConnect;

/// An adapter that is given by its address need not be there.
std::string adapterAddress(const Options& options) {
    if (isAddress(options.adapter))
        return options.adapter;
    const auto adapter = openAdapter(options);
    return readProperties(*adapter).value("Address", "");
}

/// Whether an entry is a device: people may have written it in small letters.
auto isDevice(const std::string& device) {
    return [&device](const std::string& entry) { return upperCase(entry) == device; };
}

/// Whether an entry is meant to be one: an editor may have put a line end behind it, with which no
/// adapter knows it.
auto isMeantAs(const std::string& device) {
    return [&device](const std::string& entry) {
        return isDevice(device)(entry.substr(0, entry.find_last_not_of("\r\n") + 1));
    };
}

void show(const Options& options, const AutoConnectList& list) {
    const Json document = {{"adapterAddress", list.adapter()},
                           {"file", list.path()},
                           {"enabled", list.isEnabled()},
                           {"devices", list.devices()}};
    if (options.json) {
        printDocument(document);
        return;
    }
    printProperties({{"Adapter", document["adapterAddress"]},
                     {"File", document["file"]},
                     {"Enabled", document["enabled"]},
                     {"Devices", document["devices"]}});
}

void showList(const Options& options) {
    show(options, AutoConnectList(adapterAddress(options)));
}

std::vector<std::string> listedDevices(const Options& options) {
    return AutoConnectList(adapterAddress(options)).devices();
}

void enable(const Options& options, bool enabled) {
    AutoConnectList list(adapterAddress(options));
    list.change([=](AutoConnectList::List& now) { now.isEnabled = enabled; });
    show(options, list);
}

/// A list takes any device. One that the adapter does not know leaves it when it is read.
bool isUnknown(const std::string& adapterAddress, const std::string& device) {
    const std::unique_ptr<Bluetooth::Manager> manager(
        withinLimit([] { return Bluetooth::Manager::getManager(); }));
    const std::unique_ptr<Bluetooth::Adapter> adapter(withinLimit(
        [&] { return manager ? manager->findAdapter(adapterAddress.c_str()) : nullptr; }));
    return adapter && !findDevice(*adapter, device) &&
           std::strcmp(adapter->getErrorName(), "org.bluez.Error.DoesNotExist") == 0;
}

/// Names on standard error what has left the list since: mostly since the adapter does not know it,
/// and another program may have changed it too.
void nameRemoved(const AutoConnectList& before) {
    const std::vector<std::string> left = AutoConnectList(before.adapter()).devices();
    for (const std::string& device : before.devices()) {
        if (std::find(left.begin(), left.end(), device) != left.end())
            continue;
        if (isUnknown(before.adapter(), device))
            std::cerr << before.adapter() << " does not know " << quoted(device)
                      << ", which has left its list; pair it and add it again\n";
        else
            std::cerr << quoted(device) << " has left the list of " << before.adapter() << '\n';
    }
}

void addDevice(const Options& options, const std::string& device) {
    AutoConnectList list(adapterAddress(options));
    const bool leaves = isUnknown(list.adapter(), device);
    list.change([&](AutoConnectList::List& now) {
        if (std::none_of(now.devices.begin(), now.devices.end(), isDevice(device)))
            now.devices.push_back(device);
    });
    if (leaves)
        std::cerr << list.adapter() << " does not know " << device
                  << ", which leaves an enabled list when that is read; pair it\n";
    show(options, list);
}

void removeDevice(const Options& options, const std::string& device) {
    AutoConnectList list(adapterAddress(options));
    list.change([&](AutoConnectList::List& now) {
        auto& devices = now.devices;
        const auto kept = std::remove_if(devices.begin(), devices.end(), isMeantAs(device));
        if (kept == devices.end())
            throw Failure(device + " is not in the list; see what is: " + kesbtOn(list.adapter()) +
                          " autoconnect show");
        devices.erase(kept, devices.end());
    });
    show(options, list);
}

void listKnown(const Options& options) {
    openManager();
    const AutoConnectList list(adapterAddress(options));
    list.checkWritable(); // unknown devices are taken out of an enabled list
    const std::unique_ptr<Bluetooth::DeviceList> devices(
        AutoConnect().getDeviceList(list.adapter().c_str()));
    if (!devices)
        throw Failure("cannot list the devices of " + list.adapter() + "; see: kesbt adapters");
    nameRemoved(list);
    printDevices(options, *devices);
}

/// The lists of the adapters that are on. A Failure for one that cannot be used, which the library
/// passes over.
std::vector<AutoConnectList> listsInUse() {
    const auto manager = openManager();
    const std::unique_ptr<Bluetooth::AdapterList> adapters(manager->listAdapters());
    if (!adapters)
        throw refusal("cannot list the adapters", *manager);
    std::vector<AutoConnectList> lists;
    for (Bluetooth::Adapter* adapter : *adapters) {
        if (!adapter)
            throw daemonLost();
        const Json properties = readProperties(*adapter);
        if (properties.value("Powered", false)) {
            lists.emplace_back(properties.value("Address", ""));
            lists.back().checkWritable();
        }
    }
    return lists;
}

void listTargets(const Options& options) {
    const std::vector<AutoConnectList> lists = listsInUse();
    const std::unique_ptr<Bluetooth::DeviceList> devices(AutoConnect().getAutoConnectDeviceList());
    if (!devices)
        throw daemonLost();
    for (const AutoConnectList& list : lists)
        nameRemoved(list);
    printDevices(options, *devices);
}

Build command(const char* name, bool (AutoConnect::*send)() const) {
    return [name, send](const Syntax& syntax) {
        return [name, send, &options = syntax.options] {
            sendToDaemon(send);
            if (options.json)
                printDocument({{"command", name}, {"sent", true}});
            else
                std::cout << "Sent " << name << " to the auto-connect daemon\n";
        };
    };
}

} // namespace

const Verb autoconnectVerb = {
    "autoconnect",
    "Host",
    "Say which devices are connected by themselves",
    "kesbt autoconnect add 00:11:22:33:44:55\n"
    "kesbt autoconnect enable\n"
    "kesbt autoconnect list\n"
    "kesbt autoconnect targets --json\n"
    "kesbt --adapter hci1 autoconnect show --json\n"
    "kesbt autoconnect disable\n"
    "kesbt autoconnect remove 00:11:22:33:44:55\n"
    "kesbt autoconnect reload\n"
    "kesbt autoconnect pause\n"
    "kesbt autoconnect resume",
    {{"show", "Show an adapter's list as it is in the file", Limit::Steps, noArguments(showList)},
     {"enable", "Connect the adapter's listed devices automatically", Limit::Steps,
      noArguments([](const Options& options) { enable(options, true); })},
     {"disable", "Connect none of them automatically; the list stays", Limit::Steps,
      noArguments([](const Options& options) { enable(options, false); })},
     {"add", "Put a device into the adapter's list", Limit::Steps,
      oneDevice(addDevice, knownDevices)},
     {"remove", "Take a device out of it", Limit::Steps, oneDevice(removeDevice, listedDevices)},
     {"list", "Show the listed devices that the adapter knows; others leave an enabled list",
      Limit::Whole, noArguments(listKnown)},
     {"targets", "Show all devices that are to be connected, of all adapters", Limit::Whole,
      noArguments(listTargets)},
     {"reload", "Tell the auto-connect daemon to read the lists again", Limit::Steps,
      command("reload", &AutoConnect::reload)},
     {"pause", "Tell it to connect nothing until resume", Limit::Steps,
      command("pause", &AutoConnect::pause)},
     {"resume", "End a pause", Limit::Steps, command("resume", &AutoConnect::resume)}}};

} // namespace Kesbt
