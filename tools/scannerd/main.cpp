// SPDX-License-Identifier: LGPL-2.1-or-later
#include "service_name.h"

#include "common/daemon_program.h"
#include "common/stop_request.h"

#include <bluetooth/connection.h>
#include <bluetooth/scanner_server.h>

#include <glib-unix.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <string>

namespace Scannerd {

namespace {

using Bluetooth::ScannerServer;
using Tools::DaemonProgram;

/// Runs in the loop, so there is one to quit, and a server.
gboolean quit(void* server) {
    static_cast<std::unique_ptr<ScannerServer>*>(server)->get()->quitLoop();
    return G_SOURCE_REMOVE;
}

gboolean quitOnStop(int /*descriptor*/, GIOCondition, void* server) {
    return quit(server);
}

/// Ends the loop when the connection to a bus is lost. The connection does not come back.
class BusWatch {
public:
    BusWatch(DBusConnection* connection, std::unique_ptr<ScannerServer>& server)
        : m_connection(connection), m_server(server) {
        if (!dbus_connection_add_filter(m_connection, filter, this, nullptr))
            throw std::bad_alloc(); // nobody would notice that the bus goes
    }
    ~BusWatch() { dbus_connection_remove_filter(m_connection, filter, this); }
    BusWatch(const BusWatch&) = delete;
    BusWatch& operator=(const BusWatch&) = delete;

    bool isLost() const { return !dbus_connection_get_is_connected(m_connection); }

private:
    /// Runs on whichever thread reads the connection.
    static DBusHandlerResult filter(DBusConnection*, DBusMessage* message, void* data) {
        if (dbus_message_is_signal(message, DBUS_INTERFACE_LOCAL, "Disconnected"))
            g_idle_add(quit, &static_cast<BusWatch*>(data)->m_server);
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    }

    DBusConnection* m_connection;
    std::unique_ptr<ScannerServer>& m_server;
};

int serve(const DaemonProgram& program, ServiceName& name, DBusConnection* systemBus) {
    // Before the name is requested: from then on calls may be answered and discoveries begun.
    std::unique_ptr<ScannerServer> server;
    const BusWatch session(name.getConnection(), server);
    const BusWatch system(systemBus, server);
    g_unix_fd_add(Tools::stopDescriptor(), G_IO_IN, quitOnStop, &server);

    server = std::make_unique<ScannerServer>();
    const std::string servedBy = server->getConnectionName(); // "" without dbus-glib
    if (!servedBy.empty() && name.owner() == servedBy)
        server->startLoop();
    else if (!session.isLost())
        return program.fail(
            servedBy.empty()
                ? "cannot load libdbus-glib-1.so.2; install libdbus-glib-1-2"
                : "the session bus did not give it its name; only one can run in a session");

    // Calls that came before the name was given up are answered, the others go to the next daemon.
    // Both take a second at most: programs may call more often, and call the unique name.
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(1);
    name.release();
    while (std::chrono::steady_clock::now() < end && g_main_context_iteration(nullptr, false)) {
    }
    server->stopDiscovery();
    if (session.isLost())
        return program.fail("the session bus has gone; start again when it is back");
    if (system.isLost())
        return program.fail("the system bus has gone; start again when it is back");
    return EXIT_SUCCESS;
}

int work(const DaemonProgram& program) {
    if (!Tools::stopOnSignals())
        return program.fail(std::string("cannot make a timer: ") + strerror(errno));
    Bluetooth::Connection::checkSenders(true); // any user of the machine can send signals
    ServiceName name;
    if (!name.getConnection())
        return program.fail(
            "cannot reach the session bus; run it in a session that has one, or through "
            "dbus-run-session");
    DBusConnection* systemBus = Bluetooth::Connection::get(DBUS_BUS_SYSTEM);
    if (!systemBus)
        return program.fail("cannot reach the system bus; start dbus-daemon, or set "
                            "DBUS_SYSTEM_BUS_ADDRESS");
    const std::string owner = name.owner();
    if (!owner.empty())
        return program.fail("already running in this session, as " + owner +
                            "; one serves all programs");
    return serve(program, name, systemBus);
}

} // namespace

} // namespace Scannerd

int main(int argc, char** argv) {
    Tools::DaemonProgram program(
        "kesbt-scannerd",
        "Lets the programs of a session share the discovery of Bluetooth devices\n"
        "(com.kestrine.bluetooth on the session bus). The bus starts it when a program\n"
        "asks for devices; it ends by itself 30 seconds after the last discovery began.");
    if (const auto status = program.start(argc, argv))
        return *status;
    return Scannerd::work(program);
}
