#include "run/foreground.h"

#include "control/control.h"
#include "serving/bus/glib_ptr.h"
#include "world/scenario.h"

#include <glib-unix.h>

#include <cerrno>
#include <stdexcept>
#include <unistd.h>

namespace Bluetooth::Sim {

namespace {

std::string systemBusAddress() {
    ErrorOut error;
    const GlibPtr<char> address(
        g_dbus_address_get_for_bus_sync(G_BUS_TYPE_SYSTEM, nullptr, error.out()));
    if (!address)
        throw std::runtime_error(std::string("no system bus: ") + error->message);
    return address.get();
}

void tellReady(const Options& options) {
    constexpr char line[] = "ready\n";
    const auto tell = [&](int fd) {
        if (write(fd, line, sizeof line - 1) < 0)
            g_printerr("bluez4-sim: cannot tell that the daemon is ready: %s\n", g_strerror(errno));
    };
    if (options.readyFd >= 0) {
        tell(options.readyFd);
        close(options.readyFd);
    }
    if (options.printReady)
        tell(STDOUT_FILENO);
}

} // namespace

int serveInForeground(const Options& options) {
    World world = options.scenario.empty() ? loadDefaultScenario() : loadScenario(options.scenario);
    world.times.scale = options.timeScale;

    GMainLoop* loop = g_main_loop_new(nullptr, FALSE);
    const auto quit = [](gpointer data) -> gboolean {
        g_main_loop_quit(static_cast<GMainLoop*>(data));
        return G_SOURCE_CONTINUE;
    };
    g_unix_signal_add(SIGTERM, quit, loop);
    g_unix_signal_add(SIGINT, quit, loop);

    bool busLost = false;
    try {
        Control control(world, systemBusAddress(), options.verbose);
        control.watchQuit([loop] { g_main_loop_quit(loop); });
        control.daemon().watchBus([&] {
            busLost = true;
            g_main_loop_quit(loop);
        });
        control.daemon().start(static_cast<int>(getpid()));
        control.daemon().bus().afterRoundTrip([&] { tellReady(options); });
        g_main_loop_run(loop);
        if (control.daemon().running() && !busLost)
            control.daemon().stop();
    } catch (const std::exception& reason) { // most users do not want the machine's bus
        throw std::runtime_error(std::string(reason.what()) +
                                 "; or give it buses of its own: bluez4-sim -- COMMAND");
    }
    g_main_loop_unref(loop);
    if (busLost)
        throw std::runtime_error("the system bus has ended");
    return 0;
}

} // namespace Bluetooth::Sim
