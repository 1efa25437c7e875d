// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/session/main_loop.h"

#include <glib-unix.h>

#include <csignal>

namespace Bluetooth::Serving {

namespace {

gboolean quitLoop(gpointer loop) {
    g_main_loop_quit(static_cast<GMainLoop*>(loop));
    return G_SOURCE_CONTINUE;
}

} // namespace

MainLoop::MainLoop()
    : m_loop(g_main_loop_new(nullptr, FALSE)),
      m_terminate(g_unix_signal_add(SIGTERM, quitLoop, m_loop)),
      m_interrupt(g_unix_signal_add(SIGINT, quitLoop, m_loop)) {}

MainLoop::~MainLoop() {
    g_source_remove(m_terminate);
    g_source_remove(m_interrupt);
    g_main_loop_unref(m_loop);
}

} // namespace Bluetooth::Serving
