#pragma once

#include <glib.h>

#include <functional>

namespace Bluetooth::Sim {

/// One thing that happens later on the main loop, unless the timer is stopped or destroyed before.
class Timer {
public:
    Timer() = default;
    Timer(const Timer&) = delete;
    Timer& operator=(const Timer&) = delete;
    ~Timer() { stop(); }

    /// Replaces what was set before.
    void start(guint milliseconds, std::function<void()> action) {
        stop();
        action_ = std::move(action);
        source_ = g_timeout_add(milliseconds, fire, this);
    }

    void stop() {
        if (source_)
            g_source_remove(source_);
        source_ = 0;
        action_ = nullptr;
    }

    bool running() const { return source_ != 0; }

private:
    static gboolean fire(gpointer data) {
        auto* timer = static_cast<Timer*>(data);
        timer->source_ = 0;
        // The action may start this timer again, or destroy it.
        const std::function<void()> action = std::move(timer->action_);
        timer->action_ = nullptr;
        action();
        return G_SOURCE_REMOVE;
    }

    guint source_ = 0;
    std::function<void()> action_;
};

} // namespace Bluetooth::Sim
