// SPDX-License-Identifier: LGPL-2.1-or-later
// The scanner service under load: client programs ask on 2 adapters as fast as they are answered,
// while devices are found again and again. The time of a result is the median time of an answer.
// Each load is measured in a process of its own, with a filter that picks it.

#include "memory_of.h"
#include "processor_time.h"

#include "support/child_process.h"
#include "support/private_bus.h"

#include <bluetooth/adapter.h>
#include <bluetooth/manager.h>
#include <bluetooth/scanner.h>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <thread>

namespace {

using namespace Bluetooth;
using Bluetooth::Test::ChildProcess;
using Bluetooth::Test::PrivateBus;
using Clock = std::chrono::steady_clock;

struct Load {
    const char* name;
    int clients;
    int found;     // devices that no adapter knows
    int known;     // devices out of range that both adapters know
    int interval;  // milliseconds from one found device to the next
    int variation; // of the signal strength: who is found again with another is reported again
    int warmUp;    // seconds until all were found, so that answers have their full length
};

// The service ends 30 s after its finders were made.
constexpr Load loads[] = {
    {"found-1000", 8, 1000, 0, 3, 20, 10},
    {"known-1000", 1, 20, 1000, 3, 20, 3},
    {"found-4000", 64, 4000, 0, 1, 0, 10},
};
constexpr const char* adapterNames[] = {"hci0", "hci1"};

std::atomic<long> signalCount{0};
RemoteObject* counted = nullptr;

/// Every signal is told to each proxy: one of them counts.
void countSignal(RemoteObject* adapter, const char*, const Dict*) {
    if (adapter == counted)
        ++signalCount;
}

/// Each round finds the devices one by one and ends a second later.
std::string scenario(const Load& load) {
    std::ostringstream text;
    text << "[Times]\nInquiry=" << load.found * load.interval + 1000
         << "\nFoundInterval=" << load.interval << "\n[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\n"
         << "[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\n";
    for (int device = 0; device < load.found + load.known; ++device) {
        char address[32];
        (void)std::snprintf(address, sizeof address, "00:11:22:33:%02X:%02X", device / 256,
                            device % 256);
        text << "[Device " << address << "]\nName=Device " << device << "\nClass=0x5a020c\n"
             << "RSSIVariation=" << load.variation << "\nUUIDs=110a;110c\n";
        if (device >= load.found)
            text << "Known=true\nPresent=false\n";
    }
    return text.str();
}

/// A client program: asks until the time is over and writes how long each answer took, in
/// microseconds; a failure is -1.
int runClient(const char* adapter, int seconds) {
    Scanner scanner;
    const auto end = Clock::now() + std::chrono::seconds(seconds);
    while (Clock::now() < end) {
        const auto start = Clock::now();
        const std::unique_ptr<std::vector<std::pair<std::string, Dict*>>> devices(
            scanner.listDevices(adapter, false));
        const auto taken = Clock::now() - start;
        if (devices) {
            for (const auto& device : *devices)
                delete device.second;
        }
        printf("%ld\n", devices ? static_cast<long>(taken / std::chrono::microseconds(1)) : -1L);
    }
    return EXIT_SUCCESS;
}

struct Result {
    std::vector<long> times; ///< of the answers, ascending
    long failures = 0;
};

Result askFromAllClients(int clientCount, int seconds) {
    std::vector<std::unique_ptr<ChildProcess>> clients;
    clients.reserve(static_cast<std::size_t>(clientCount));
    for (int client = 0; client < clientCount; ++client)
        clients.push_back(std::make_unique<ChildProcess>(
            std::vector<std::string>{"/proc/self/exe", "--client", adapterNames[client % 2],
                                     std::to_string(seconds)},
            ChildProcess::Output::Capture));
    std::vector<std::string> outputs(clients.size());
    std::vector<std::thread> readers;
    readers.reserve(clients.size());
    for (std::size_t client = 0; client < clients.size(); ++client)
        readers.emplace_back([&outputs, &clients, client] {
            outputs[client] = clients[client]->readAll(std::chrono::seconds(60));
        });
    Result result;
    for (std::size_t client = 0; client < clients.size(); ++client) {
        readers[client].join();
        std::istringstream lines(outputs[client]);
        for (long time = 0; lines >> time;) {
            if (time < 0)
                ++result.failures;
            else
                result.times.push_back(time);
        }
    }
    std::sort(result.times.begin(), result.times.end());
    return result;
}

double at(const std::vector<long>& times, double part) {
    const auto place = static_cast<std::size_t>(static_cast<double>(times.size() - 1) * part);
    return static_cast<double>(times[place]);
}

void measure(benchmark::State& state, const Load& load) {
    const char* length = std::getenv("KES_BENCH_SCANNER_SECONDS");
    const int seconds = length ? std::atoi(length) : 6;
    const PrivateBus systemBus(PrivateBus::Kind::System);
    const PrivateBus sessionBus(PrivateBus::Kind::Session);
    const std::string file = Test::testFolder() + "/scenario";
    std::ofstream(file) << scenario(load);
    ChildProcess daemon({BLUEZ4_SIM, "--print-ready", "--scenario=" + file},
                        ChildProcess::Output::Capture);
    daemon.readLine();
    ChildProcess service({KESBT_SCANNERD});

    Manager manager;
    std::vector<std::unique_ptr<Adapter>> adapters;
    for (const char* name : adapterNames) {
        adapters.emplace_back(manager.findAdapter(name));
        adapters.back()->setDeviceFoundHandler(countSignal);
    }
    counted = adapters.front().get();
    manager.startLoop();

    Scanner scanner;
    std::unique_ptr<std::vector<std::pair<std::string, Dict*>>> begun;
    while (!begun && !service.hasEnded()) // until the service is there
        begun.reset(scanner.listDevices(adapterNames[0], false));
    if (!begun)
        throw std::runtime_error("the service has ended");
    for (auto _ : state) {
        askFromAllClients(load.clients, load.warmUp);
        const double memoryBefore = Bench::memoryOf(service.pid(), "status", "VmRSS:");
        const double usedBefore = Bench::processorSeconds(service.pid());
        const long signalsBefore = signalCount;
        const auto start = Clock::now();
        const Result result = askFromAllClients(load.clients, seconds);
        const double duration = std::chrono::duration<double>(Clock::now() - start).count();
        if (result.failures != 0 || result.times.empty()) {
            state.SkipWithError("an answer failed");
            break;
        }
        const auto answers = static_cast<double>(result.times.size());
        state.SetIterationTime(at(result.times, 0.5) / 1e6);
        state.counters["p99_us"] = at(result.times, 0.99);
        state.counters["longest_us"] = at(result.times, 1);
        state.counters["answers_per_second"] = answers / duration;
        state.counters["processor_us"] =
            (Bench::processorSeconds(service.pid()) - usedBefore) / answers * 1e6;
        state.counters["signals_per_second"] =
            static_cast<double>(signalCount - signalsBefore) / duration;
        state.counters["rss_before_bytes"] = memoryBefore;
        state.counters["rss_bytes"] = Bench::memoryOf(service.pid(), "status", "VmRSS:");
        state.counters["rss_peak_bytes"] = Bench::memoryOf(service.pid(), "status", "VmHWM:");
    }
    manager.stopLoop();
    manager.waitLoop();
    service.signal(SIGTERM);
    if (service.wait() != 0)
        throw std::runtime_error("the service failed");
}

} // namespace

int main(int argc, char** argv) {
    if (argc == 4 && strcmp(argv[1], "--client") == 0)
        return runClient(argv[2], std::stoi(argv[3]));
    benchmark::Initialize(&argc, argv);
    for (const Load& load : loads)
        benchmark::RegisterBenchmark(
            ("scanner/" + std::string(load.name) + "/kesbluetooth").c_str(), measure,
            std::ref(load))
            ->Iterations(1)
            ->UseManualTime();
    benchmark::RunSpecifiedBenchmarks();
}
