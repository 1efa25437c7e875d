// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERIAL_PROXY_H
#define KESBLUETOOTH_SIM_DAEMON_SERIAL_PROXY_H

#include "daemon/device_serial.h"
#include "daemon/local_end.h"
#include "serving.h"
#include "serving/bluez4/service_interfaces.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class SerialProxies;
class ServedDevice;

/// org.bluez.SerialProxy: a serial port of ours, which devices connect to something on this
/// machine.
class SerialProxy {
public:
    SerialProxy(SerialProxies& proxies, std::string path, std::string owner, std::string uuid,
                LocalEnd local);
    SerialProxy(const SerialProxy&) = delete;
    SerialProxy& operator=(const SerialProxy&) = delete;
    ~SerialProxy();

    const std::string& path() const { return m_path; }
    const std::string& owner() const { return m_owner; }
    const std::string& uuid() const { return m_uuid; }
    const std::string& address() const { return m_local.address(); }
    bool enabled() const { return m_enabled; }
    int channel() const { return m_channel; }
    /// A device has connected to it, and may.
    void connect(ServedDevice& device);

private:
    template <class Served>
    friend const Interface& Serving::serialProxyInterface();

    void enable(const CallPtr& call);
    void disable(const CallPtr& call);
    void getInfo(const CallPtr& call);
    void setSerialParameters(const CallPtr& call);

    void disconnect();

    SerialProxies& m_proxies;
    std::string m_path;
    std::string m_owner;
    std::string m_uuid;
    LocalEnd m_local;
    bool m_enabled = false;
    guint32 m_record = 0; ///< its handle while enabled
    int m_channel = 0;    ///< the last one, also when it is no longer enabled
    std::string m_device; ///< the address of the device that connected last
    std::weak_ptr<SerialLine> m_line;
};

} // namespace Bluetooth::Sim

#endif
