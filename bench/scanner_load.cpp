// SPDX-License-Identifier: LGPL-2.1-or-later
// The scanner service under load: 8 client programs ask on 2 adapters as fast as they are answered,
// while 1,000 devices are found again and again at about 500 signals a second.
//
//   kesbluetooth-bench-scanner [SECONDS]

#include "support/child_process.h"
#include "support/private_bus.h"

#include <bluetooth/adapter.h>
#include <bluetooth/manager.h>
#include <bluetooth/scanner.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <memory>
#include <sstream>
#include <thread>

namespace {

using namespace Bluetooth;
using Bluetooth::Test::ChildProcess;
using Bluetooth::Test::PrivateBus;
using Clock = std::chrono::steady_clock;

constexpr int deviceCount = 1000;
constexpr int clientCount = 8;
constexpr const char* adapterNames[] = {"hci0", "hci1"};

std::atomic<long> signalCount{0};
RemoteObject* counted = nullptr;

/// Every signal is told to each proxy: one of them counts.
void countSignal(RemoteObject* adapter, const char*, const Dict*) {
    if (adapter == counted)
        ++signalCount;
}

/// Each round takes 4 s, of which 3 s find one device every 3 ms; each with another signal strength
/// than before, so that it is reported again.
std::string scenario() {
    std::ostringstream text;
    text << "[Times]\nInquiry=4000\nFoundInterval=3\n"
         << "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\n"
         << "[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\n";
    for (int device = 0; device < deviceCount; ++device) {
        // 1000 to 1999 as digits of an address
        const std::string digits = std::to_string(1000 + device);
        text << "[Device 00:11:22:33:" << digits.substr(0, 2) << ':' << digits.substr(2)
             << "]\nName=Device " << device
             << "\nClass=0x5a020c\nRSSIVariation=20\nUUIDs=110a;110c\n";
    }
    return text.str();
}

/// What /proc tells of a process's memory, in KiB: "VmRSS:" now, "VmHWM:" at most.
long memoryOf(pid_t pid, const char* kind) {
    std::ifstream status("/proc/" + std::to_string(pid) + "/status");
    std::string word;
    long amount = 0;
    while (status >> word && word != kind) {
    }
    status >> amount;
    return amount;
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

Result askFromAllClients(const char* program, int seconds) {
    std::vector<std::unique_ptr<ChildProcess>> clients;
    clients.reserve(clientCount);
    for (int client = 0; client < clientCount; ++client)
        clients.push_back(std::make_unique<ChildProcess>(
            std::vector<std::string>{program, "--client", adapterNames[client % 2],
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

double milliseconds(const std::vector<long>& times, double part) {
    if (times.empty())
        return 0;
    const auto place = static_cast<std::size_t>(static_cast<double>(times.size() - 1) * part);
    return static_cast<double>(times[place]) / 1000;
}

int run(const char* program, int seconds) {
    const PrivateBus systemBus(PrivateBus::Kind::System);
    const PrivateBus sessionBus(PrivateBus::Kind::Session);
    const std::string file = Test::testFolder() + "/scenario";
    std::ofstream(file) << scenario();
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
        return EXIT_FAILURE;   // it has said why
    constexpr int warmUp = 10; // all devices found twice, answers at their full length
    askFromAllClients(program, warmUp);
    const long memoryThen = memoryOf(service.pid(), "VmRSS:");
    const long signalsThen = signalCount;
    const Result result = askFromAllClients(program, seconds);
    const long signalsNow = signalCount;
    manager.stopLoop();
    manager.waitLoop();

    printf("answers       %zu (%.0f a second), failed %ld\n", result.times.size(),
           static_cast<double>(result.times.size()) / seconds, result.failures);
    printf("time          median %.1f ms, 99th percentile %.1f ms, longest %.1f ms\n",
           milliseconds(result.times, 0.5), milliseconds(result.times, 0.99),
           milliseconds(result.times, 1));
    printf("signals       %.0f a second\n",
           static_cast<double>(signalsNow - signalsThen) / seconds);
    printf("memory        %ld KiB before, %ld KiB after, at most %ld KiB\n", memoryThen,
           memoryOf(service.pid(), "VmRSS:"), memoryOf(service.pid(), "VmHWM:"));
    service.signal(SIGTERM);
    return service.wait() == 0 && result.failures == 0 ? EXIT_SUCCESS : EXIT_FAILURE;
}

} // namespace

int main(int argc, char** argv) {
    if (argc == 4 && strcmp(argv[1], "--client") == 0)
        return runClient(argv[2], std::stoi(argv[3]));
    const int seconds = argc > 1 ? static_cast<int>(strtol(argv[1], nullptr, 10)) : 15;
    // The service ends 30 s after its finders were made.
    if (argc > 2 || seconds < 1 || seconds > 15) {
        std::cerr << "usage: " << argv[0] << " [SECONDS, 1 to 15]\n";
        return 2;
    }
    return run("/proc/self/exe", seconds);
}
