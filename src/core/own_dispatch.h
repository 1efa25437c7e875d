// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_OWN_DISPATCH_H
#define KESBLUETOOTH_CORE_OWN_DISPATCH_H

#include <dbus/dbus.h>

#include <memory>

namespace Bluetooth {

/// Tells whether this thread is inside a handler that the program's own dispatching of a connection
/// runs, for example its GLib main loop's. libdbus tells when such a dispatch begins and not when
/// it ends; but it lets go of the message then, and so the message carries the mark.
class OwnDispatch {
public:
    OwnDispatch();

    /// This thread has begun to dispatch a message.
    void mark(DBusMessage* message);

    /// What this thread has dispatched is over: a handler may have kept the message, to answer it
    /// later. Called when the thread dispatches the next one, for dispatches do not nest.
    void end();

    bool isHere() const;

private:
    struct Threads;
    struct Mark;
    static bool isOfThisThread(const Mark* mark);
    std::shared_ptr<Threads> m_threads; // messages may outlive the connection
};

} // namespace Bluetooth

#endif
