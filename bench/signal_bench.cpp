// SPDX-License-Identifier: LGPL-2.1-or-later
// Signals: from emission to callback, and what a thread that waits for them costs. The time of a
// result is the median latency of its signals.
//
// kesbluetooth's receive thread lasts as long as the process, so what is measured here about the
// others has it idle in the background: at most ten wake-ups a second. The idle costs are measured
// in processes of their own, with a filter that picks one library.

#include "bus.h"
#include "client.h"

#include <benchmark/benchmark.h>

#include <sys/resource.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <mutex>
#include <thread>

namespace {

using namespace Bench;
using Clock = std::chrono::steady_clock; // CLOCK_MONOTONIC, as the peer reads it

/// What the callbacks report.
class Latencies {
public:
    void expect(std::size_t count) {
        const std::lock_guard<std::mutex> lock(m_mutex);
        m_expected = count;
        m_times.clear();
        m_times.reserve(count);
    }
    void add(const char* emission) {
        const long long now = Clock::now().time_since_epoch().count();
        const std::lock_guard<std::mutex> lock(m_mutex);
        m_times.push_back(static_cast<double>(now - std::strtoll(emission, nullptr, 10)) / 1e9);
        if (m_times.size() == m_expected)
            m_complete.notify_one();
    }
    /// @return the latencies in seconds, in ascending order
    std::vector<double> await() {
        std::unique_lock<std::mutex> lock(m_mutex);
        require(m_complete.wait_for(lock, std::chrono::seconds(60),
                                    [this] { return m_times.size() == m_expected; }),
                "signals are missing");
        std::sort(m_times.begin(), m_times.end());
        return m_times;
    }

private:
    std::mutex m_mutex;
    std::condition_variable m_complete;
    std::size_t m_expected = 0;
    std::vector<double> m_times;
};

Latencies latencies;

/// `count` signals, `interval` microseconds apart.
struct Traffic {
    const char* name;
    unsigned int count;
    unsigned int interval;
    bool callsMeanwhile; // another thread calls without pause on the same connection
};

constexpr Traffic traffics[] = {
    {"idle", 100, 5000, false},
    {"2000-per-second", 1000, 500, false},
    {"idle-while-calling", 100, 5000, true},
    {"2000-per-second-while-calling", 1000, 500, true},
};

void signalLatency(benchmark::State& state, const Library& library, const Traffic& traffic) {
    const auto listener = library.listener([](const char* emission) { latencies.add(emission); });
    for (auto _ : state) {
        std::atomic<bool> done{false};
        std::size_t calls = 0;
        std::thread caller;
        latencies.expect(traffic.count);
        const auto start = Clock::now();
        emitTicks(traffic.count, traffic.interval);
        if (traffic.callsMeanwhile)
            caller = std::thread([&] {
                for (; !done; ++calls)
                    listener->callText();
            });
        const std::vector<double> times = latencies.await();
        const std::chrono::duration<double> duration = Clock::now() - start;
        done = true;
        if (caller.joinable())
            caller.join();
        state.SetIterationTime(times[times.size() / 2]);
        state.counters["p99_us"] = times[times.size() * 99 / 100] * 1e6;
        state.counters["calls_per_second"] = static_cast<double>(calls) / duration.count();
    }
}

/// A blocking call with a text reply beside an idle thread that waits for signals.
void callBesideListener(benchmark::State& state, const Library& library) {
    const auto listener = library.listener([](const char*) {});
    for (auto _ : state)
        benchmark::DoNotOptimize(listener->callText());
}

double processorSeconds() {
    rusage usage = {};
    getrusage(RUSAGE_SELF, &usage);
    const auto seconds = [](const timeval& time) {
        return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
    };
    return seconds(usage.ru_utime) + seconds(usage.ru_stime);
}

/// The processor time of a minute in which a listener waits and nothing comes.
void idleListener(benchmark::State& state, const Library& library) {
    const char* length = std::getenv("KES_BENCH_IDLE_SECONDS");
    const std::chrono::seconds span(length ? std::atoi(length) : 10);
    const auto listener = library.listener([](const char*) {});
    std::this_thread::sleep_for(std::chrono::milliseconds(200)); // it has settled
    for (auto _ : state) {
        const double before = processorSeconds();
        std::this_thread::sleep_for(span);
        const double used = processorSeconds() - before;
        state.SetIterationTime(used * 60 / std::chrono::duration<double>(span).count());
    }
}

template <class... Args>
benchmark::internal::Benchmark* add(const std::string& name, Args... args) {
    return benchmark::RegisterBenchmark(name.c_str(), args...);
}

} // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    const Bus bus;
    for (const Library* library : {&libdbus, &kesbluetooth, &sdbuscpp, &gdbus}) {
        const std::string name = std::string("/") + library->name;
        for (const Traffic& traffic : traffics)
            add(std::string("signal/") + traffic.name + name, signalLatency, std::ref(*library),
                std::ref(traffic))
                ->Iterations(1)
                ->UseManualTime();
        add("call/text-beside-receive-thread" + name, callBesideListener, std::ref(*library))
            ->Iterations(200)
            ->UseRealTime();
        add("idle-processor-time-per-minute" + name, idleListener, std::ref(*library))
            ->Iterations(1)
            ->UseManualTime();
    }
    benchmark::RunSpecifiedBenchmarks();
}
