#ifndef KESBLUETOOTH_SIM_WORLD_TIMER_H
#define KESBLUETOOTH_SIM_WORLD_TIMER_H

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
        m_action = std::move(action);
        m_source = g_timeout_add(milliseconds, fire, this);
    }

    void stop() {
        if (m_source)
            g_source_remove(m_source);
        m_source = 0;
        m_action = nullptr;
    }

    bool running() const { return m_source != 0; }

private:
    static gboolean fire(gpointer data) {
        auto* timer = static_cast<Timer*>(data);
        timer->m_source = 0;
        // The action may start this timer again, or destroy it.
        const std::function<void()> action = std::move(timer->m_action);
        timer->m_action = nullptr;
        action();
        return G_SOURCE_REMOVE;
    }

    guint m_source = 0;
    std::function<void()> m_action;
};

} // namespace Bluetooth::Sim

#endif
