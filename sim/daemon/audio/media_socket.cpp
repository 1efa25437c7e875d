// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/media_socket.h"

#include <glib-unix.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>

namespace Bluetooth::Sim {

MediaSocket::MediaSocket(int type) {
    if (socketpair(AF_UNIX, type | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, m_ends) != 0)
        m_ends[0] = m_ends[1] = -1;
    else
        m_source = g_unix_fd_add(m_ends[1], G_IO_IN, drain, this);
}

MediaSocket::~MediaSocket() {
    if (m_source)
        g_source_remove(m_source);
    if (m_ends[0] < 0)
        return;
    shutdown(m_ends[1], SHUT_RDWR);
    close(m_ends[0]);
    close(m_ends[1]);
}

gboolean MediaSocket::drain(gint descriptor, GIOCondition condition, gpointer data) {
    std::array<char, 4096> dropped;
    if ((condition & G_IO_IN) != 0 && read(descriptor, dropped.data(), dropped.size()) > 0)
        return G_SOURCE_CONTINUE;
    static_cast<MediaSocket*>(data)->m_source = 0; // the client has shut it down
    return G_SOURCE_REMOVE;
}

} // namespace Bluetooth::Sim
