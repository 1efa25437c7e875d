// SPDX-License-Identifier: LGPL-2.1-or-later
// Listing devices with all that it takes: ListDevices, and for each device the factory's question
// to the bus whether the daemon is there. Raw libdbus sends the very same messages, one by one.

#include "bus.h"
#include "client.h"
#include "names.h"

#include "core/dbus_ptr.h"

#include <bluetooth/adapter.h>
#include <bluetooth/bluez_object.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstring>
#include <functional>

namespace {

using namespace Bench;
using Bluetooth::MessagePtr;

/// The array of texts or paths in a reply, freed with this object.
class Texts {
public:
    Texts(DBusConnection* connection, int elementType, const char* destination, const char* path,
          const char* interface, const char* method) {
        const MessagePtr call(dbus_message_new_method_call(destination, path, interface, method));
        const MessagePtr reply(
            dbus_connection_send_with_reply_and_block(connection, call.get(), -1, nullptr));
        require(reply && dbus_message_get_args(reply.get(), nullptr, DBUS_TYPE_ARRAY, elementType,
                                               &m_texts, &m_count, DBUS_TYPE_INVALID),
                "libdbus: list");
    }
    ~Texts() { dbus_free_string_array(m_texts); }
    Texts(const Texts&) = delete;
    Texts& operator=(const Texts&) = delete;
    char** begin() const { return m_texts; }
    char** end() const { return m_texts + m_count; }

private:
    char** m_texts = nullptr;
    int m_count = 0;
};

bool hasDaemon(DBusConnection* connection) {
    const Texts names(connection, DBUS_TYPE_STRING, DBUS_SERVICE_DBUS, DBUS_PATH_DBUS,
                      DBUS_INTERFACE_DBUS, "ListNames");
    return std::any_of(names.begin(), names.end(),
                       [](const char* name) { return std::strcmp(name, peerName) == 0; });
}

class Connection {
public:
    ~Connection() {
        dbus_connection_close(m_connection);
        dbus_connection_unref(m_connection);
    }
    Connection() = default;
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;
    operator DBusConnection*() const { return m_connection; }

private:
    DBusConnection* m_connection = dbus_bus_get_private(DBUS_BUS_SYSTEM, nullptr);
};

/// Counts what the bus daemon works for each iteration: no client can be faster than that.
class BusShare {
public:
    BusShare(benchmark::State& state, const Bus& bus)
        : m_state(state), m_bus(bus), m_before(bus.processorSeconds()) {}
    ~BusShare() {
        m_state.counters["bus_us"] = benchmark::Counter((m_bus.processorSeconds() - m_before) * 1e6,
                                                        benchmark::Counter::kAvgIterations);
    }
    BusShare(const BusShare&) = delete;
    BusShare& operator=(const BusShare&) = delete;

private:
    benchmark::State& m_state;
    const Bus& m_bus;
    const double m_before;
};

void listThroughLibdbus(benchmark::State& state, const Bus& bus, std::size_t count) {
    const std::string adapter = adapterWith(count);
    const Connection connection;
    const BusShare share(state, bus);
    for (auto _ : state) {
        const Texts paths(connection, DBUS_TYPE_OBJECT_PATH, peerName, adapter.c_str(),
                          peerInterface, "ListDevices");
        std::vector<std::string> devices;
        for (const char* path : paths) {
            require(hasDaemon(connection), "libdbus: the daemon is not there");
            devices.emplace_back(path);
        }
        require(devices.size() == count, "libdbus: not all devices");
    }
}

void listThroughKesbluetooth(benchmark::State& state, const Bus& bus, std::size_t count) {
    Bluetooth::Adapter adapter(adapterWith(count).c_str());
    const BusShare share(state, bus);
    for (auto _ : state) {
        const std::unique_ptr<Bluetooth::DeviceList> devices(adapter.listDevices());
        require(devices && devices->size() == count && devices->back(),
                "kesbluetooth: not all devices");
    }
}

/// Gives the bus so many names more while it lives.
class Names {
public:
    explicit Names(std::size_t count) {
        for (std::size_t i = 0; i < count; ++i)
            require(dbus_bus_request_name(m_connection,
                                          ("com.example.n" + std::to_string(i)).c_str(), 0,
                                          nullptr) > 0,
                    "libdbus: no name");
    }

private:
    Connection m_connection;
};

void checkThroughLibdbus(benchmark::State& state, const Bus& bus, std::size_t count) {
    const Names names(count);
    const Connection connection;
    const BusShare share(state, bus);
    for (auto _ : state)
        require(hasDaemon(connection), "libdbus: the daemon is not there");
}

void checkThroughKesbluetooth(benchmark::State& state, const Bus& bus, std::size_t count) {
    const Names names(count);
    const BusShare share(state, bus);
    for (auto _ : state)
        require(Bluetooth::BluezObject::hasBluetoothd(), "kesbluetooth: the daemon is not there");
}

using Measure = void (*)(benchmark::State&, const Bus&, std::size_t);

void add(const Bus& bus, const char* group, std::size_t count, Measure libdbusWay,
         Measure kesbluetoothWay, std::size_t iterations) {
    for (const auto& [library, measure] :
         {std::pair(libdbus.name, libdbusWay), std::pair(kesbluetooth.name, kesbluetoothWay)}) {
        const std::string name = std::string(group) + "/" + std::to_string(count) + "/" + library;
        benchmark::RegisterBenchmark(name.c_str(), measure, std::ref(bus), count)
            ->Iterations(static_cast<benchmark::IterationCount>(iterations))
            ->UseRealTime();
    }
}

} // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    const Bus bus;
    for (const std::size_t count : {1, 10, 100, 1000}) // the same number of devices in each
        add(bus, "list", count, listThroughLibdbus, listThroughKesbluetooth,
            std::min<std::size_t>(1000 / count, 100));
    for (const std::size_t count : {10, 1000})
        add(bus, "presence-check", count, checkThroughLibdbus, checkThroughKesbluetooth, 50);
    benchmark::RunSpecifiedBenchmarks();
}
