// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_WAIT_WAITING_H
#define KESBT_WAIT_WAITING_H

#include "command/limit.h"
#include "show/failure.h"

#include <chrono>
#include <deque>
#include <functional>
#include <initializer_list>
#include <mutex>
#include <optional>
#include <string>
#include <utility>

namespace Kesbt {

/// A file descriptor, closed in the end.
class FileDescriptor {
public:
    explicit FileDescriptor(int fd) : m_fd(fd) {}
    ~FileDescriptor();
    FileDescriptor(const FileDescriptor&) = delete;
    FileDescriptor& operator=(const FileDescriptor&) = delete;
    int fd() const { return m_fd; }

private:
    int m_fd;
};

/// Makes SIGINT and SIGTERM something to wait for instead of the program's end, while it lives.
/// Threads that are started meanwhile do not see the signals either.
class Interrupt {
public:
    Interrupt();
    ~Interrupt();
    Interrupt(const Interrupt&) = delete;
    Interrupt& operator=(const Interrupt&) = delete;
    int fd() const { return m_descriptor.fd(); }
    /// Whether a signal has come since the last call.
    bool take();
    /// Whether a signal has ever come.
    bool came() { return m_came = take() || m_came; }

private:
    FileDescriptor m_descriptor;
    bool m_came = false;
};

/// Something to wait for that any thread can bring about.
class Wakeup {
public:
    Wakeup();
    int fd() const { return m_descriptor.fd(); }
    void raise();
    void clear();

private:
    FileDescriptor m_descriptor;
};

/// Hands events from the receive thread to the thread that prints them.
template <class Event>
class EventQueue {
public:
    int fd() const { return m_wakeup.fd(); }

    void push(Event event) {
        const std::lock_guard<std::mutex> lock(m_mutex);
        m_events.push_back(std::move(event));
        m_wakeup.raise();
    }

    std::optional<Event> pop() {
        const std::lock_guard<std::mutex> lock(m_mutex);
        if (m_events.empty()) {
            m_wakeup.clear();
            return std::nullopt;
        }
        std::optional<Event> event(std::move(m_events.front()));
        m_events.pop_front();
        return event;
    }

private:
    std::mutex m_mutex; // for the events
    std::deque<Event> m_events;
    Wakeup m_wakeup;
};

/// Waits until one of the descriptors can be read or the deadline has come.
void waitForInput(std::initializer_list<int> descriptors,
                  Clock::time_point deadline = Clock::time_point::max());

/// Asks again and again, more rarely with time. @return whether the answer became true in time
bool waitUntil(const std::function<bool()>& isTrue, std::chrono::milliseconds limit);

/// A call went well, but what it should have changed has not changed within the time-out.
Failure notConfirmed(const std::string& what);

} // namespace Kesbt

#endif
