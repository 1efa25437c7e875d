// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_DEVICE_SERIAL_H
#define KESBLUETOOTH_SIM_DAEMON_DEVICE_SERIAL_H

#include "daemon/channel.h"
#include "daemon/echo.h"
#include "daemon/pseudo_terminal.h"
#include "serving.h"
#include "serving/bluez4/service_interfaces.h"

#include <list>
#include <memory>
#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

class DeviceSerial;

/// A line from a descriptor to a simulated device, which echoes, until either side closes it.
struct SerialLine {
    DeviceSerial& port;
    std::string uuid; ///< of the service
    Link::Hold hold;
    std::unique_ptr<Echo> device;

    /// Closes it, which destroys it.
    void close();
};

/// org.bluez.Serial of a device with serial ports. What a client writes to one comes back.
class DeviceSerial {
public:
    explicit DeviceSerial(ServedDevice& device) : m_device(device) {}

    /// Serves the interface and the ports that the device's UUIDs call for.
    void serve();
    /// The device closes what is open to a service of it, or to any for "".
    /// @return whether something was
    bool hangUp(const std::string& uuid);
    /// The device has opened a service of ours, and says its name first.
    /// @param local  what it is connected to; owned from now on
    std::weak_ptr<SerialLine> connectTo(int local, const std::string& uuid);
    void closeLine(const SerialLine& line);
    void linkLost();
    void clientGone(const std::string& client);
    void abandon();

private:
    /// A port that a client may hold: one of a service, or of a channel that was asked for.
    struct Port {
        Port(ServedDevice& device, std::string portUuid, int portNumber)
            : uuid(std::move(portUuid)), number(portNumber), channel(device) {}
        std::string uuid; ///< "" for a channel
        int number;
        std::string owner; ///< the client that connects or has it, or ""
        Channel channel;
        std::unique_ptr<PseudoTerminal> terminal;
    };

    template <class Served>
    friend const Interface& Serving::serialInterface();

    void connect(const CallPtr& call);
    void disconnect(const CallPtr& call);

    Port* find(const std::string& pattern);
    Port* findOrAdd(const std::string& pattern);
    std::string serviceAt(const Port& port) const;
    void connected(Port& port, const CallPtr& call);
    void giveTerminal(Port& port, const CallPtr& call);
    void giveDescriptor(Port& port, const CallPtr& call);
    std::shared_ptr<SerialLine> addLine(int end, const std::string& uuid);
    static void release(Port& port);

    ServedDevice& m_device;
    std::list<Port> m_ports;
    std::list<std::shared_ptr<SerialLine>> m_lines;
};

} // namespace Bluetooth::Sim

#endif
