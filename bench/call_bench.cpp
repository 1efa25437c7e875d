// SPDX-License-Identifier: LGPL-2.1-or-later
// Blocking method calls, each library on its own connection to the same peer. No receive thread
// runs: that is measured beside the signals.

#include "bus.h"
#include "client.h"

#include <benchmark/benchmark.h>

namespace {

using namespace Bench;

constexpr std::size_t propertyCount = 15;

void callNothing(benchmark::State& state, Caller& caller) {
    for (auto _ : state)
        caller.callNothing();
}

void callText(benchmark::State& state, Caller& caller) {
    for (auto _ : state)
        benchmark::DoNotOptimize(caller.callText());
}

void callProperties(benchmark::State& state, Caller& caller) {
    for (auto _ : state)
        require(caller.callProperties() == propertyCount, "not all properties");
}

} // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    const Bus bus;
    std::vector<std::pair<std::string, std::unique_ptr<Caller>>> callers;
    for (const Library* library : {&libdbus, &kesbluetooth, &sdbuscpp, &gdbus, &dbusglib})
        callers.emplace_back(library->name, library->caller());

    using Measure = void (*)(benchmark::State&, Caller&);
    for (const auto& [reply, measure] : std::initializer_list<std::pair<std::string, Measure>>{
             {"nothing", callNothing}, {"text", callText}, {"properties", callProperties}}) {
        for (const auto& [name, caller] : callers)
            benchmark::RegisterBenchmark(("call/" + reply + "/" + name).c_str(), measure,
                                         std::ref(*caller))
                ->Iterations(200) // short, so that all have the same share of what disturbs
                ->UseRealTime();
    }
    benchmark::RunSpecifiedBenchmarks();
}
