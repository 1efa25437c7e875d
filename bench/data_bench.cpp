// SPDX-License-Identifier: LGPL-2.1-or-later
// What happens inside the process: decoding dictionaries, their text form, and dispatch.

#include "bus.h"
#include "client.h"
#include "names.h"

#include "core/dbus_ptr.h"

#include <bluetooth/dict_codec.h>
#include <bluetooth/remote_object.h>

#include <benchmark/benchmark.h>

#include <list>

namespace {

using namespace Bench;
using Bluetooth::Dict;
using Bluetooth::RemoteObject;
using Bluetooth::Variant;

void decode(benchmark::State& state, const Library& library, std::size_t entries) {
    const auto decoder = library.decoder(entries);
    for (auto _ : state)
        require(decoder->decode() == entries, "not all entries");
    state.counters["ns_per_entry"] = benchmark::Counter(
        static_cast<double>(entries) / 1e9,
        benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

/// Entries as devices have them.
Dict properties(std::size_t entries) {
    const Dict device = {
        {"Address", std::string("00:11:22:33:44:55")},
        {"Name", std::string("Headphones of the living room")},
        {"Class", std::uint32_t{0x240404}},
        {"Paired", true},
        {"RSSI", std::int32_t{-60}},
        {"UUIDs", std::vector<std::string>{"00001108-0000-1000-8000-00805f9b34fb",
                                           "0000110b-0000-1000-8000-00805f9b34fb"}},
    };
    Dict dict;
    for (std::size_t i = 0; i < entries; ++i)
        dict.push_back(device[i % device.size()]);
    return dict;
}

void format(benchmark::State& state, std::size_t entries) {
    const Dict dict = properties(entries);
    std::size_t bytes = 0;
    for (auto _ : state)
        bytes += Bluetooth::dictConquerToString(dict, ";").size();
    state.SetBytesProcessed(static_cast<std::int64_t>(bytes));
}

void parse(benchmark::State& state, std::size_t entries) {
    const std::string text = Bluetooth::dictConquerToString(properties(entries), ";");
    for (auto _ : state) {
        const std::unique_ptr<Dict> dict(Bluetooth::stringDivideToDict(text, ";"));
        require(dict && dict->size() == entries, "not all entries");
    }
    state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(text.size()));
}

/// One signal offered to so many subscriptions, none or all of which it is for.
void dispatch(benchmark::State& state, std::size_t records, bool match) {
    static std::size_t called = 0;
    std::list<RemoteObject> subscribers;
    for (std::size_t i = 0; i < records; ++i) {
        RemoteObject& subscriber =
            subscribers.emplace_back(peerName, peerPath, peerInterface, DBUS_BUS_SYSTEM);
        require(subscriber.setSignalHandlerString(
                    match ? "Tick" : "Tock", [](RemoteObject*, const char*) { ++called; }) == 0,
                "cannot subscribe");
    }
    const Bluetooth::MessagePtr signal(dbus_message_new_signal(peerPath, peerInterface, "Tick"));
    const char* text = "00:11:22:33:44:55";
    dbus_message_append_args(signal.get(), DBUS_TYPE_STRING, &text, DBUS_TYPE_INVALID);
    called = 0;
    for (auto _ : state)
        subscribers.front().signalHandlerDispatcherString(signal.get());
    require(called == (match ? records * static_cast<std::size_t>(state.iterations()) : 0),
            "not all callbacks were called");
    state.counters["ns_per_record"] = benchmark::Counter(
        static_cast<double>(records) / 1e9,
        benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

} // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    const Bus bus;
    for (const std::size_t entries : {1, 15, 100, 1000, 10000}) {
        const std::string count = std::to_string(entries);
        for (const Library* library : {&libdbus, &kesbluetooth, &sdbuscpp, &gdbus})
            benchmark::RegisterBenchmark(("decode/" + count + "/" + library->name).c_str(), decode,
                                         std::ref(*library), entries);
    }
    for (const std::size_t entries : {15, 1000}) {
        const std::string count = std::to_string(entries);
        benchmark::RegisterBenchmark(("format/" + count + "/kesbluetooth").c_str(), format,
                                     entries);
        benchmark::RegisterBenchmark(("parse/" + count + "/kesbluetooth").c_str(), parse, entries);
    }
    for (const std::size_t records : {1, 10, 100, 1000}) {
        const std::string count = std::to_string(records);
        for (const bool match : {true, false})
            benchmark::RegisterBenchmark(
                ((match ? "dispatch-to-all/" : "dispatch-to-none/") + count + "/kesbluetooth")
                    .c_str(),
                dispatch, records, match);
    }
    benchmark::RunSpecifiedBenchmarks();
}
