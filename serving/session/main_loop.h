// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_SESSION_MAIN_LOOP_H
#define KESBLUETOOTH_SERVING_SESSION_MAIN_LOOP_H

#include <glib.h>

namespace Bluetooth::Serving {

/// The main loop of a program that serves in the foreground: SIGTERM and SIGINT end it.
class MainLoop {
public:
    MainLoop();
    MainLoop(const MainLoop&) = delete;
    MainLoop& operator=(const MainLoop&) = delete;
    ~MainLoop();

    /// Returns after quit() or a signal.
    void run() { g_main_loop_run(m_loop); }
    void quit() { g_main_loop_quit(m_loop); }

private:
    GMainLoop* m_loop;
    guint m_terminate;
    guint m_interrupt;
};

} // namespace Bluetooth::Serving

#endif
