// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_MEDIA_SOCKET_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_MEDIA_SOCKET_H

#include <glib.h>

namespace Bluetooth::Sim {

/// A socket that a client gets, and the device's end of it, which takes in what is sent and says
/// nothing.
class MediaSocket {
public:
    /// @param type  SOCK_SEQPACKET for sound, SOCK_STREAM for a serial channel
    explicit MediaSocket(int type);
    MediaSocket(const MediaSocket&) = delete;
    MediaSocket& operator=(const MediaSocket&) = delete;
    /// The client sees the end of the connection.
    ~MediaSocket();

    /// The client's end, of which it gets a copy; -1 when there are too many open files.
    int clientEnd() const { return m_ends[0]; }

private:
    static gboolean drain(gint descriptor, GIOCondition condition, gpointer data);

    int m_ends[2] = {-1, -1};
    guint m_source = 0;
};

} // namespace Bluetooth::Sim

#endif
