// SPDX-License-Identifier: LGPL-2.1-or-later
// Signals: from emission to callback, and what a thread that waits for them costs. The time of a
// result is the median latency of its signals.
//
// kesbluetooth's receive thread lasts as long as the process, so what is measured here about the
// others has it idle in the background: one wake-up a second. The idle costs are measured in
// processes of their own, with a filter that picks one library.

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
    /// @return the latencies in seconds, in the order of arrival
    std::vector<double> await() {
        std::unique_lock<std::mutex> lock(m_mutex);
        require(m_complete.wait_for(lock, std::chrono::seconds(60),
                                    [this] { return m_times.size() == m_expected; }),
                "signals are missing");
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
        std::vector<double> times = latencies.await();
        const std::chrono::duration<double> duration = Clock::now() - start;
        done = true;
        if (caller.joinable())
            caller.join();
        std::sort(times.begin(), times.end());
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

/// Emits signals for a tenth of a second.
/// @return how many came in a second; 0 when the last quarter was late, because somebody on the way
///         has to queue
double signalsOnTime(unsigned int interval) {
    constexpr double late = 1e-3;
    const unsigned int count = 100000 / interval;
    latencies.expect(count);
    const auto start = Clock::now();
    emitTicks(count, interval);
    std::vector<double> times = latencies.await();
    const std::chrono::duration<double> duration = Clock::now() - start;
    std::sort(times.end() - static_cast<std::ptrdiff_t>(count / 4), times.end());
    return times[count - count / 8] < late ? count / duration.count() : 0;
}

/// The most signals a second that arrive as fast as they come.
void mostSignals(benchmark::State& state, const Library& library) {
    const auto listener = library.listener([](const char* emission) { latencies.add(emission); });
    for (auto _ : state) {
        double most = 0;
        double last = 1;
        for (double interval = 500; interval >= 4 && last > 0; interval /= 1.19) {
            last = signalsOnTime(static_cast<unsigned int>(interval));
            if (last == 0) // the machine may have done something else
                last = signalsOnTime(static_cast<unsigned int>(interval));
            most = std::max(most, last);
        }
        state.SetIterationTime(most > 0 ? 1 / most : 0);
        state.counters["signals_per_second"] = most;
    }
}

/// What all threads but this one have used so far.
struct Usage {
    double seconds;
    double wakeUps;
};

Usage usageOfOthers() {
    rusage all = {};
    rusage own = {};
    getrusage(RUSAGE_SELF, &all);
    getrusage(RUSAGE_THREAD, &own);
    const auto seconds = [](const rusage& usage) {
        return static_cast<double>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
               static_cast<double>(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
    };
    // Who sleeps has given up the processor: once for each time that it woke.
    return {seconds(all) - seconds(own), static_cast<double>(all.ru_nvcsw - own.ru_nvcsw)};
}

/// The processor time and wake-ups of a minute in which a listener waits and nothing comes.
void idleListener(benchmark::State& state, const Library& library) {
    const char* length = std::getenv("KES_BENCH_IDLE_SECONDS");
    const std::chrono::seconds span(length ? std::atoi(length) : 10);
    const double minutes = std::chrono::duration<double, std::ratio<60>>(span).count();
    const auto listener = library.listener([](const char*) {});
    std::this_thread::sleep_for(std::chrono::milliseconds(200)); // it has settled
    for (auto _ : state) {
        const Usage before = usageOfOthers();
        std::this_thread::sleep_for(span);
        const Usage after = usageOfOthers();
        state.SetIterationTime(std::max(after.seconds - before.seconds, 0.0) / minutes);
        state.counters["wake_ups"] = (after.wakeUps - before.wakeUps) / minutes;
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
        add("most-signals" + name, mostSignals, std::ref(*library))->Iterations(1)->UseManualTime();
        add("idle-minute" + name, idleListener, std::ref(*library))->Iterations(1)->UseManualTime();
    }
    benchmark::RunSpecifiedBenchmarks();
}
