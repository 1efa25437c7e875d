// SPDX-License-Identifier: LGPL-2.1-or-later
// Whole processes: how soon a command line has its answer, what a program with a receive thread
// takes of memory, and how soon the thread ends.

#include "memory_of.h"

#include "support/child_process.h"
#include "support/private_bus.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <stdexcept>
#include <thread>

namespace {

using Bluetooth::Test::ChildProcess;
using Bluetooth::Test::PrivateBus;
using Output = ChildProcess::Output;

void require(bool done, const char* what) {
    if (!done)
        throw std::runtime_error(what);
}

void command(benchmark::State& state, const std::vector<std::string>& words) {
    for (auto _ : state) {
        ChildProcess process(words, Output::Capture);
        require(process.readAll().find("hci0") != std::string::npos && process.wait() == 0,
                "no answer to a command");
    }
}

void memory(benchmark::State& state, const char* program) {
    for (auto _ : state) {
        ChildProcess process({program}, Output::Capture);
        require(process.readLine() == "ready", "a program does not start");
        state.counters["rss_bytes"] = Bench::memoryOf(process.pid(), "status", "VmRSS:");
        state.counters["pss_bytes"] = Bench::memoryOf(process.pid(), "smaps_rollup", "Pss:");
    }
}

/// From stopLoop() in a signal handler to the return of waitLoop().
void stop(benchmark::State& state) {
    unsigned int milliseconds = 0; // how long the thread has slept before
    for (auto _ : state) {
        ChildProcess process({KES_BENCH_LOOP}, Output::Capture);
        require(process.readLine() == "ready", "a program does not start");
        std::this_thread::sleep_for(std::chrono::milliseconds(20 + milliseconds));
        milliseconds = (milliseconds + 37) % 100;
        process.signal(SIGTERM);
        state.SetIterationTime(std::strtod(process.readLine().c_str(), nullptr));
    }
}

} // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    const PrivateBus bus(PrivateBus::Kind::System);
    ChildProcess daemon({BLUEZ4_SIM, "--print-ready"}, Output::Capture);
    require(daemon.readLine() == "ready", "the simulated daemon does not start");

    using Words = std::vector<std::string>;
    benchmark::RegisterBenchmark("command/adapters/kesbluetooth", command, Words{KESBT, "adapters"})
        ->Iterations(5)
        ->UseRealTime();
    benchmark::RegisterBenchmark("command/adapters/GDBus", command,
                                 Words{"gdbus", "call", "--system", "--dest", "org.bluez",
                                       "--object-path", "/", "--method",
                                       "org.bluez.Manager.ListAdapters"})
        ->Iterations(5)
        ->UseRealTime();
    benchmark::RegisterBenchmark("memory/loop/kesbluetooth", memory, KES_BENCH_LOOP)
        ->Iterations(1)
        ->UseRealTime();
    benchmark::RegisterBenchmark("memory/loop/libdbus", memory, KES_BENCH_LIBDBUS_LOOP)
        ->Iterations(1)
        ->UseRealTime();
    benchmark::RegisterBenchmark("stop/loop/kesbluetooth", stop)->Iterations(5)->UseManualTime();
    benchmark::RunSpecifiedBenchmarks();
}
