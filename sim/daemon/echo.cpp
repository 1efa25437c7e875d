// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/echo.h"

#include <glib-unix.h>
#include <unistd.h>

#include <cerrno>

namespace Bluetooth::Sim {

Echo::Echo(int descriptor, std::function<void()> onHangUp)
    : m_descriptor(descriptor), m_onHangUp(std::move(onHangUp)) {
    g_unix_set_fd_nonblocking(m_descriptor, TRUE, nullptr);
    watch();
}

Echo::~Echo() {
    if (m_source)
        g_source_remove(m_source);
    close(m_descriptor);
}

void Echo::send(const std::string& text) {
    m_unsent += text;
    watch();
}

/// Either sends or receives: a reader that does not read is not drowned.
void Echo::watch() {
    if (m_source)
        g_source_remove(m_source);
    m_source = g_unix_fd_add(m_descriptor, m_unsent.empty() ? G_IO_IN : G_IO_OUT, ready, this);
}

gboolean Echo::ready(gint, GIOCondition, gpointer data) {
    auto* self = static_cast<Echo*>(data);
    self->m_source = 0;
    if (self->m_unsent.empty() ? self->receive() : self->flush()) {
        self->watch();
        return G_SOURCE_REMOVE;
    }
    const auto onHangUp = std::move(self->m_onHangUp);
    onHangUp();
    return G_SOURCE_REMOVE;
}

bool Echo::receive() {
    char data[4096];
    const ssize_t count = read(m_descriptor, data, sizeof data);
    if (count > 0)
        m_unsent.assign(data, static_cast<std::size_t>(count));
    return count > 0 || (count < 0 && (errno == EAGAIN || errno == EINTR));
}

bool Echo::flush() {
    // GLib's sockets have made the process ignore SIGPIPE.
    const ssize_t count = write(m_descriptor, m_unsent.data(), m_unsent.size());
    if (count > 0)
        m_unsent.erase(0, static_cast<std::size_t>(count));
    return count > 0 || (count < 0 && (errno == EAGAIN || errno == EINTR));
}

} // namespace Bluetooth::Sim
