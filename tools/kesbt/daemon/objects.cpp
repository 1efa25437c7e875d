// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"

#include "command/limit.h"
#include "show/table.h"
#include "show/text.h"

#include <bluetooth/adapter_list.h>
#include <bluetooth/commandlib.h>

#include <cstdlib>

namespace Kesbt {

using Bluetooth::Adapter;
using Bluetooth::Device;
using Bluetooth::Manager;

namespace {

std::string addressOf(const Device& device) {
    const std::unique_ptr<char, decltype(&std::free)> address(
        Bluetooth::getAddressFromPath(device.getPath()), std::free);
    return address ? address.get() : "";
}

template <class List, class Name>
std::vector<std::string> namesOf(const List& objects, const Name& name) {
    std::vector<std::string> names;
    for (const auto* object : objects) {
        if (object)
            names.push_back(name(*object));
    }
    return names;
}

} // namespace

std::unique_ptr<Manager> openManager() {
    std::unique_ptr<Manager> manager(withinLimit([] { return Manager::getManager(); }));
    if (!manager)
        throw daemonAbsent();
    return manager;
}

std::unique_ptr<Adapter> openAdapter(Manager& manager, const Options& options) {
    const bool chosen = !options.adapter.empty();
    std::unique_ptr<Adapter> adapter(withinLimit([&] {
        return chosen ? manager.findAdapter(options.adapter.c_str()) : manager.defaultAdapter();
    }));
    if (adapter)
        return adapter;
    if (failedWith(manager, "NoSuchAdapter"))
        throw Failure(chosen
                          ? "there is no adapter " + options.adapter +
                                "; see which there are: kesbt adapters"
                          : "there is no Bluetooth adapter; plug one in and see: kesbt adapters");
    throw refusal("cannot find the adapter", manager);
}

Failure adapterLost(Adapter& adapter) {
    const std::unique_ptr<Bluetooth::Dict> properties(
        withinLimit([&adapter] { return adapter.BluezObject::getProperties(); }));
    const std::string name = adapterName(adapter);
    return !properties && lacksObject(adapter) ? adapterRemoved(name) : adapterOff(name);
}

std::unique_ptr<Adapter> openAdapter(const Options& options) {
    return openAdapter(*openManager(), options);
}

std::vector<std::string> adapterNames(const Options&) {
    const auto manager = openManager();
    const std::unique_ptr<Bluetooth::AdapterList> adapters(
        withinLimit([&manager] { return manager->listAdapters(); }));
    return adapters ? namesOf(*adapters, adapterName) : std::vector<std::string>();
}

std::vector<std::string> knownDevices(const Options& options) {
    const auto adapter = openAdapter(options);
    const std::unique_ptr<Bluetooth::DeviceList> devices(
        withinLimit([&adapter] { return adapter->listDevices(); }));
    return devices ? namesOf(*devices, addressOf) : std::vector<std::string>();
}

std::string defaultAdapterPath(Manager& manager) {
    const std::unique_ptr<Adapter> adapter(
        withinLimit([&manager] { return manager.defaultAdapter(); }));
    return adapter ? adapter->getPath() : "";
}

std::unique_ptr<Device> findDevice(Adapter& adapter, const std::string& address) {
    return std::unique_ptr<Device>(
        withinLimit([&] { return adapter.findDevice(address.c_str(), false); }));
}

std::unique_ptr<Device> openDevice(Adapter& adapter, const std::string& address) {
    std::unique_ptr<Device> device = findDevice(adapter, address);
    if (device)
        return device;
    if (failedWith(adapter, "DoesNotExist"))
        throw unknownDevice(adapterName(adapter), address);
    throw refusal("cannot find " + address, adapter);
}

std::unique_ptr<Device> openDevice(const Options& options, const std::string& address) {
    return openDevice(*openAdapter(options), address);
}

std::string adapterName(const Bluetooth::RemoteObject& object) {
    const std::string path = object.getPath();
    const std::size_t device = path.find("/dev_");
    return lastComponent(path.substr(0, device));
}

Bluetooth::Dict readDict(Bluetooth::BluezObject& object) {
    const std::unique_ptr<Bluetooth::Dict> properties(
        withinLimit([&object] { return object.Bluetooth::BluezObject::getProperties(); }));
    if (!properties)
        throw refusal("cannot read the properties of " + lastComponent(object.getPath()), object);
    return *properties;
}

Json readProperties(Bluetooth::BluezObject& object) {
    return toJson(readDict(object));
}

Json readIfKnown(Adapter& adapter, const std::string& address) {
    return withinLimit([&] {
        const auto device = findDevice(adapter, address);
        return device ? readProperties(*device) : Json();
    });
}

Json readOptional(Bluetooth::BluezObject& object) {
    const std::unique_ptr<Bluetooth::Dict> properties(
        withinLimit([&object] { return object.getProperties(); }));
    if (properties)
        return toJson(*properties);
    if (!lacksObject(object))
        throw refusal("cannot read the properties of " + lastComponent(object.getPath()), object);
    return nullptr;
}

Json describe(const Adapter& adapter, bool isDefault, Json properties) {
    return {{"adapter", adapterName(adapter)},
            {"path", adapter.getPath()},
            {"default", isDefault},
            {"properties", std::move(properties)}};
}

Json describe(const Device& device, Json properties) {
    return {{"address", addressOf(device)},
            {"adapter", adapterName(device)},
            {"path", device.getPath()},
            {"properties", std::move(properties)}};
}

void printDevices(const Options& options, const Bluetooth::DeviceList& devices) {
    Json list = Json::array();
    for (Device* device : devices) {
        if (!device)
            throw daemonLost();
        list.push_back(describe(*device, readProperties(*device)));
    }
    if (options.json) {
        printDocument(list);
        return;
    }
    Table table({"ADDRESS", "PAIRED", "TRUSTED", "CONNECTED", "KIND", "NAME"});
    for (const Json& device : list) {
        const Json& properties = device["properties"];
        table.add({{display(device["address"]), Colour::Bold},
                   yesNo(field(properties, "Paired")),
                   yesNo(field(properties, "Trusted")),
                   yesNo(field(properties, "Connected")),
                   field(properties, "Icon"),
                   field(properties, "Alias")});
    }
    table.print();
}

void printDevice(const Options& options, Device& device) {
    const Json document = describe(device, readProperties(device));
    if (options.json) {
        printDocument(document);
        return;
    }
    Json lines = {{"Path", document["path"]}};
    lines.update(document["properties"]);
    printProperties(lines);
}

} // namespace Kesbt
