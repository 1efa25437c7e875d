// SPDX-License-Identifier: LGPL-2.1-or-later
// Threads that call at once. The time of a result is the median time of a call.

#include "bus.h"
#include "client.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <thread>

namespace {

using namespace Bench;
using Clock = std::chrono::steady_clock;
using Seconds = std::chrono::duration<double>;

constexpr std::size_t callCount = 2000; // of all threads together

void callFromThreads(benchmark::State& state, const Library& library, std::size_t threadCount) {
    std::vector<std::unique_ptr<Caller>> callers(threadCount);
    for (auto& caller : callers) {
        caller = library.caller();
        caller->callText(); // connected
    }
    for (auto _ : state) {
        std::vector<std::vector<double>> timesOf(threadCount);
        std::vector<std::thread> threads;
        threads.reserve(threadCount);
        const auto start = Clock::now();
        for (std::size_t i = 0; i < threadCount; ++i)
            threads.emplace_back([&times = timesOf[i], &caller = *callers[i], threadCount] {
                for (std::size_t call = 0; call < callCount / threadCount; ++call) {
                    const auto begin = Clock::now();
                    caller.callText();
                    times.push_back(Seconds(Clock::now() - begin).count());
                }
            });
        for (std::thread& thread : threads)
            thread.join();
        const Seconds duration = Clock::now() - start;
        std::vector<double> times;
        for (const std::vector<double>& some : timesOf)
            times.insert(times.end(), some.begin(), some.end());
        std::sort(times.begin(), times.end());
        state.SetIterationTime(times[times.size() / 2]);
        state.counters["p99_us"] = times[times.size() * 99 / 100] * 1e6;
        state.counters["calls_per_second"] = static_cast<double>(times.size()) / duration.count();
    }
}

} // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    const Bus bus;
    for (const std::size_t count : {1, 2, 4, 8, 16}) {
        for (const Library* library : {&libdbus, &libdbusShared, &kesbluetooth, &sdbuscpp})
            benchmark::RegisterBenchmark(
                ("threads/" + std::to_string(count) + "/" + library->name).c_str(), callFromThreads,
                std::ref(*library), count)
                ->Iterations(1)
                ->UseManualTime();
    }
    benchmark::RunSpecifiedBenchmarks();
}
