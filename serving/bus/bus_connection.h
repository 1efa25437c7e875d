// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_BUS_CONNECTION_H
#define KESBLUETOOTH_SERVING_BUS_BUS_CONNECTION_H

#include "serving/bus/call.h"

#include <functional>
#include <memory>
#include <string>

namespace Bluetooth::Serving {

/// What a method call of ours was answered: results, or an error.
struct CallResult {
    Value results;
    BusError error;
    bool failed = false;
};

/// The address of the system bus: DBUS_SYSTEM_BUS_ADDRESS, or else the machine's.
/// @throw std::runtime_error  with a text for the user
std::string systemBusAddress();

/// One connection to a bus under a well-known name.
///
/// Threads: everything runs on the main loop. GDBus reads on a thread of its own; calls are handed
/// over in the order in which they came. What is sent leaves in the order in which it was sent.
class BusConnection {
public:
    using CallHandler = std::function<void(const CallPtr&)>;
    using ClientGone = std::function<void(const std::string& uniqueName)>;
    using AnswerHandler = std::function<void(const CallResult&)>;

    /// Connects and starts reading; no name is owned yet.
    /// @throw std::runtime_error  with a text for the user
    BusConnection(const std::string& address, CallHandler onCall);
    BusConnection(const BusConnection&) = delete;
    BusConnection& operator=(const BusConnection&) = delete;
    /// Sends what is queued, then closes the connection.
    ~BusConnection();

    /// Owns a name, or throws std::runtime_error when it is taken or refused.
    void own(const char* name);
    /// Called for each client that leaves the bus.
    void watchClients(ClientGone onGone);
    /// Called when the bus itself ends.
    void watchBus(std::function<void()> onEnd);

    void emit(const std::string& path, const std::string& interface, const std::string& member,
              const Value& arguments = {});
    /// Calls a method of another client.
    /// @param timeout  milliseconds
    /// @param answered  called with the answer, unless the cancellable is cancelled before
    /// @param descriptor  what the first "h" of the arguments, of value 0, stands for; -1 for none
    void call(const std::string& destination, const std::string& path, const std::string& interface,
              const std::string& member, const Value& arguments, int timeout,
              GCancellable* cancellable, AnswerHandler answered, int descriptor = -1);
    /// Sends a call whose answer nobody waits for.
    void send(const std::string& destination, const std::string& path, const std::string& interface,
              const std::string& member, const Value& arguments = {});
    /// Runs what follows once all that was sent to us or by us before has passed the bus.
    void afterRoundTrip(std::function<void()> next);

private:
    struct Inbox;

    static GDBusMessage* onMessage(GDBusConnection* connection, GDBusMessage* message,
                                   gboolean incoming, gpointer data);
    static gboolean deliver(gpointer data);

    std::shared_ptr<Inbox> m_inbox;
    GDBusConnection* m_connection = nullptr;
    guint m_filter = 0;
    guint m_clients = 0;
    ClientGone m_clientGone;
    std::function<void()> m_busEnded;
};

} // namespace Bluetooth::Serving

#endif
