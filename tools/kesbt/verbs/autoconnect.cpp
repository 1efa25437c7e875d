#include "command/answer_limit.h"
#include "command/verb.h"
#include "daemon/autoconnect_list.h"
#include "daemon/objects.h"
#include "show/text.h"

#include <bluetooth/auto_connect.h>

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

void show(const Options& options, const AutoConnectList& file, const std::string& adapter) {
    const Json document = {{"adapterAddress", adapter},
                           {"file", file.path()},
                           {"enabled", file.isEnabled()},
                           {"devices", file.devices()}};
    if (options.json) {
        printDocument(document);
        return;
    }
    printProperties({{"Adapter", document["adapterAddress"]},
                     {"File", document["file"]},
                     {"Enabled", document["enabled"]},
                     {"Devices", document["devices"]}});
}

void showFile(const Options& options) {
    const std::string adapter = adapterAddress(options);
    show(options, AutoConnectList(adapter), adapter);
}

void enable(const Options& options, bool enabled) {
    const std::string adapter = adapterAddress(options);
    AutoConnectList file(adapter);
    file.write(enabled);
    show(options, file, adapter);
}

void change(const Options& options, const std::string& device, bool listed) {
    const std::string adapter = adapterAddress(options);
    AutoConnectList file(adapter);
    if (!listed && !file.has(device))
        throw Failure(device + " is not in the list; see what is: kesbt autoconnect show");
    if (listed && !file.has(device))
        file.add(device);
    else if (!listed)
        file.remove(device);
    file.write(file.isEnabled());
    show(options, file, adapter);
}

void listKnown(const Options& options) {
    const AnswerLimit limit;
    openManager();
    const std::string adapter = adapterAddress(options);
    AutoConnectList file(adapter);
    file.checkWritable(); // unknown devices are taken out of an enabled list
    const std::unique_ptr<Bluetooth::DeviceList> devices(
        AutoConnect().getDeviceList(adapter.c_str()));
    if (!devices)
        throw Failure("cannot list the devices of " + adapter + "; see: kesbt adapters");
    printDevices(options, *devices);
}

void listTargets(const Options& options) {
    const AnswerLimit limit;
    openManager();
    const std::unique_ptr<Bluetooth::DeviceList> devices(AutoConnect().getAutoConnectDeviceList());
    if (!devices)
        throw daemonLost();
    printDevices(options, *devices);
}

void command(const Options& options, const char* name, bool (AutoConnect::*send)() const) {
    if (!(AutoConnect().*send)())
        throw Failure("no auto-connect daemon takes commands; start it: kesbt-autoconnectd");
    if (options.json)
        printDocument({{"command", name}, {"sent", true}});
    else
        std::cout << "Sent " << name << " to the auto-connect daemon\n";
}

void build(CLI::App& parent, const Options& options) {
    parent.require_subcommand(1);
    const auto add = [&parent](const char* name, const char* description, auto action) {
        parent.add_subcommand(name, description)->callback(action);
    };
    const auto addChange = [&](const char* name, const char* description, bool listed) {
        CLI::App* verb = parent.add_subcommand(name, description);
        const auto address = addAddress(*verb);
        verb->callback([&options, address, listed] { change(options, *address, listed); });
    };
    add("show", "Show an adapter's list as it is in the file", [&options] { showFile(options); });
    add("enable", "Connect the adapter's listed devices automatically",
        [&options] { enable(options, true); });
    add("disable", "Connect none of them automatically; the list stays",
        [&options] { enable(options, false); });
    addChange("add", "Put a device into the adapter's list", true);
    addChange("remove", "Take a device out of it", false);
    add("list", "Show the listed devices that the adapter knows;\nothers leave an enabled list",
        [&options] { listKnown(options); });
    add("targets", "Show all devices that are to be connected, of all adapters",
        [&options] { listTargets(options); });
    add("reload", "Tell the auto-connect daemon to read the lists again",
        [&options] { command(options, "reload", &AutoConnect::reload); });
    add("pause", "Tell it to connect nothing until resume",
        [&options] { command(options, "pause", &AutoConnect::pause); });
    add("resume", "End a pause", [&options] { command(options, "resume", &AutoConnect::resume); });
}

} // namespace

extern const Verb autoconnectVerb;
const Verb autoconnectVerb = {"autoconnect", "Host",
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
                              build};

} // namespace Kesbt
