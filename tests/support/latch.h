// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_LATCH_H
#define KESBLUETOOTH_TESTS_LATCH_H

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace Bluetooth::Test {

using Milliseconds = std::chrono::milliseconds;

#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
inline constexpr bool isSanitized = true;
#else
inline constexpr bool isSanitized = false;
#endif

using Texts = std::vector<std::string>;

/// How long tests wait for what must come. Only a failing test waits this long.
inline constexpr Milliseconds patience{20000};

/// Asks again and again, for what nobody reports. @return whether it became true in time
template <class Condition>
bool becomesTrue(Condition isTrue, Milliseconds pause = Milliseconds(1)) {
    const auto end = std::chrono::steady_clock::now() + patience;
    while (!isTrue()) {
        if (std::chrono::steady_clock::now() >= end)
            return false;
        std::this_thread::sleep_for(pause);
    }
    return true;
}

/// What callbacks report, in order, awaited by the test. Plain function pointers carry no data, so
/// the tests' callbacks write into one of these with static lifetime.
template <class Event>
class Recorder {
public:
    void add(Event event) {
        const std::lock_guard<std::mutex> lock(m_mutex);
        m_events.push_back(std::move(event));
        m_changed.notify_all();
    }

    /// @return whether at least `count` events have come
    bool waitFor(std::size_t count, Milliseconds limit = patience) const {
        return waitUntil([count](const auto& events) { return events.size() >= count; }, limit);
    }

    template <class Condition>
    bool waitUntil(Condition condition, Milliseconds limit = patience) const {
        std::unique_lock<std::mutex> lock(m_mutex);
        return m_changed.wait_for(lock, limit, [&] { return condition(m_events); });
    }

    std::vector<Event> events() const {
        const std::lock_guard<std::mutex> lock(m_mutex);
        return m_events;
    }

    std::size_t count() const {
        const std::lock_guard<std::mutex> lock(m_mutex);
        return m_events.size();
    }

    void clear() {
        const std::lock_guard<std::mutex> lock(m_mutex);
        m_events.clear();
    }

private:
    mutable std::mutex m_mutex;
    mutable std::condition_variable m_changed;
    std::vector<Event> m_events;
};

/// What the callbacks of a test say.
inline Recorder<std::string>& seen() {
    static auto& recorder = *new Recorder<std::string>; // written to until the very end
    return recorder;
}

/// Opens once and stays open.
class Latch {
public:
    void open() { m_opened.add(true); }
    bool wait(Milliseconds limit = patience) const { return m_opened.waitFor(1, limit); }
    bool isOpen() const { return m_opened.count() > 0; }

private:
    Recorder<bool> m_opened;
};

/// Does a task in several threads at once, which are numbered from 0, and waits for their ends.
template <class Task>
void inThreads(int count, const Task& task) {
    std::vector<std::thread> threads;
    threads.reserve(static_cast<std::size_t>(count));
    for (int number = 0; number < count; ++number)
        threads.emplace_back(task, number);
    for (std::thread& thread : threads)
        thread.join();
}

} // namespace Bluetooth::Test

#endif
