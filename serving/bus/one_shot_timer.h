// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_ONE_SHOT_TIMER_H
#define KESBLUETOOTH_SERVING_BUS_ONE_SHOT_TIMER_H

#include <glib.h>

#include <functional>
#include <utility>

namespace Bluetooth::Serving {

/// One thing that happens later on the main loop, unless the timer is stopped or destroyed before.
class OneShotTimer {
public:
    OneShotTimer() = default;
    OneShotTimer(const OneShotTimer&) = delete;
    OneShotTimer& operator=(const OneShotTimer&) = delete;
    ~OneShotTimer() { stop(); }

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
        auto* timer = static_cast<OneShotTimer*>(data);
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

} // namespace Bluetooth::Serving

#endif
