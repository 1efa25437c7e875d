// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/device_serial.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "daemon/service_records.h"
#include "serving/bluez4/errors.h"

#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <optional>

namespace Bluetooth::Sim {

namespace {

bool same(const std::string& one, const std::string& other) {
    return g_ascii_strcasecmp(one.c_str(), other.c_str()) == 0;
}

/// The number that the whole text is.
std::optional<long> numberOf(const std::string& text) {
    char* end = nullptr;
    const long number = std::strtol(text.c_str(), &end, 10);
    return *end ? std::nullopt : std::make_optional(number);
}

} // namespace

void DeviceSerial::serve() {
    for (const std::string& uuid : m_device.stored().uuids) {
        const int number = rfcommChannel(uuid);
        if (number == 0 || find(uuid))
            continue;
        if (m_ports.empty())
            m_device.adapter().daemon().objects().add(m_device.path(),
                                                      serialInterface<DeviceSerial>(), this);
        m_ports.emplace_back(m_device, uuid, number);
    }
}

DeviceSerial::Port* DeviceSerial::find(const std::string& pattern) {
    const std::string service = serviceNamed(pattern);
    const auto number = numberOf(pattern);
    const auto found = std::find_if(m_ports.begin(), m_ports.end(), [&](const Port& port) {
        return number == port.number || (port.terminal && port.terminal->name() == pattern) ||
               (!port.uuid.empty() && (same(port.uuid, pattern) || same(port.uuid, service)));
    });
    return found == m_ports.end() ? nullptr : &*found;
}

DeviceSerial::Port* DeviceSerial::findOrAdd(const std::string& pattern) {
    if (Port* port = find(pattern))
        return port;
    const auto number = numberOf(pattern);
    if (!number || *number < 1 || *number > 30)
        return nullptr;
    return &m_ports.emplace_back(m_device, "", static_cast<int>(*number));
}

/// The service of the device that listens there, or "".
std::string DeviceSerial::serviceAt(const Port& port) const {
    const auto peer = m_device.peer();
    if (!port.uuid.empty() || !peer)
        return port.uuid;
    const auto found = std::find_if(peer->uuids.begin(), peer->uuids.end(), [&](const auto& uuid) {
        return rfcommChannel(uuid) == port.number;
    });
    return found == peer->uuids.end() ? "" : *found;
}

void DeviceSerial::connect(const CallPtr& call) {
    Port* port = findOrAdd(call->text(0));
    if (!port)
        return call->fail(Errors::doesNotExist);
    if (!port->owner.empty())
        return call->fail(Errors::failed("Port already in use"));
    port->owner = call->sender();
    // Without a search the system's number stands behind the text.
    const Channel::Target target =
        port->uuid.empty()
            ? Channel::Target{serviceAt(*port), false, "Input/output error", "Host is down (112)"}
            : Channel::Target{port->uuid, true, "No route to host", "Host is down"};
    port->channel.open(target, [this, port, call](const char* failure) {
        if (!failure)
            return connected(*port, call);
        port->owner.clear();
        call->fail(Errors::failed(failure));
    });
}

void DeviceSerial::connected(Port& port, const CallPtr& call) {
    if (call->member() == "ConnectFD")
        giveDescriptor(port, call);
    else
        giveTerminal(port, call);
}

void DeviceSerial::giveTerminal(Port& port, const CallPtr& call) {
    port.terminal = PseudoTerminal::make();
    if (port.terminal)
        return call->reply(tuple(port.terminal->name()));
    call->fail(Errors::failed(g_strerror(errno)));
    release(port);
}

void DeviceSerial::giveDescriptor(Port& port, const CallPtr& call) {
    int ends[2] = {-1, -1};
    if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
        call->fail(Errors::failed(g_strerror(errno)));
        return release(port);
    }
    addLine(ends[0], serviceAt(port));
    call->replyDescriptor(ends[1]);
    close(ends[1]);
    release(port); // the port is free again
}

std::shared_ptr<SerialLine> DeviceSerial::addLine(int end, const std::string& uuid) {
    auto line =
        std::make_shared<SerialLine>(SerialLine{*this, uuid, m_device.link().hold(), nullptr});
    line->device = std::make_unique<Echo>(end, [closed = line.get()] { closed->close(); });
    m_lines.push_back(line);
    return line;
}

std::weak_ptr<SerialLine> DeviceSerial::connectTo(int local, const std::string& uuid) {
    const auto line = addLine(local, uuid);
    const auto peer = m_device.peer();
    line->device->send((peer ? peer->name : m_device.address()) + "\r\n");
    return line;
}

void SerialLine::close() {
    port.closeLine(*this);
}

void DeviceSerial::closeLine(const SerialLine& line) {
    m_lines.remove_if([&](const auto& other) { return other.get() == &line; });
}

void DeviceSerial::disconnect(const CallPtr& call) {
    Port* port = find(call->text(0));
    if (!port)
        return call->fail(Errors::doesNotExist);
    if (port->owner.empty())
        return call->fail(Errors::notConnected);
    if (port->owner != call->sender())
        return call->fail(Errors::notAuthorized);
    release(*port); // a Connect that is given up is not answered
    call->reply();
}

void DeviceSerial::release(Port& port) {
    port.channel.close();
    port.terminal.reset();
    port.owner.clear();
}

bool DeviceSerial::hangUp(const std::string& uuid) {
    const std::size_t lines = m_lines.size();
    bool isAnyOpen = false;
    for (Port& port : m_ports) {
        if (!port.terminal || (!uuid.empty() && serviceAt(port) != uuid))
            continue;
        // The daemon does not notice: the port is its client's until that disconnects or leaves.
        port.terminal->hangUp();
        port.channel.close();
        isAnyOpen = true;
    }
    m_lines.remove_if([&](const auto& line) { return uuid.empty() || line->uuid == uuid; });
    return isAnyOpen || m_lines.size() < lines;
}

void DeviceSerial::linkLost() {
    hangUp("");
    for (Port& port : m_ports)
        if (port.channel.opening())
            port.channel.linkLost();
}

void DeviceSerial::clientGone(const std::string& client) {
    for (Port& port : m_ports)
        if (port.owner == client)
            release(port);
}

void DeviceSerial::abandon() {
    for (Port& port : m_ports)
        release(port);
    m_lines.clear();
}

} // namespace Bluetooth::Sim
