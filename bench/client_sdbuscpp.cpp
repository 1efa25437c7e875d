// SPDX-License-Identifier: LGPL-2.1-or-later
#include "client.h"
#include "names.h"

#include <sdbus-c++/sdbus-c++.h>

#include <map>
#include <variant>

namespace Bench {

namespace {

using Properties = std::map<std::string, sdbus::Variant>;

std::string callTextOf(sdbus::IProxy& proxy) {
    std::string text;
    proxy.callMethod("Text").onInterface(peerInterface).storeResultsTo(text);
    return text;
}

class SdbusCaller : public Caller {
public:
    void callNothing() override { m_proxy->callMethod("Nothing").onInterface(peerInterface); }
    std::size_t callText() override { return callTextOf(*m_proxy).size(); }
    std::size_t callProperties() override {
        Properties properties;
        m_proxy->callMethod("Properties").onInterface(peerInterface).storeResultsTo(properties);
        return properties.size();
    }

private:
    std::unique_ptr<sdbus::IConnection> m_connection = sdbus::createSystemBusConnection();
    std::unique_ptr<sdbus::IProxy> m_proxy = sdbus::createProxy(*m_connection, peerName, peerPath);
};

class SdbusListener : public Listener {
public:
    explicit SdbusListener(Handler handler) {
        m_proxy->uponSignal("Tick")
            .onInterface(peerInterface)
            .call([handler](const std::string& text) { handler(text.c_str()); });
        m_proxy->finishRegistration();
        m_connection->enterEventLoopAsync();
    }
    ~SdbusListener() override { m_connection->leaveEventLoop(); }
    std::size_t callText() override { return callTextOf(*m_proxy).size(); }

private:
    std::unique_ptr<sdbus::IConnection> m_connection = sdbus::createSystemBusConnection();
    std::unique_ptr<sdbus::IProxy> m_proxy = sdbus::createProxy(*m_connection, peerName, peerPath);
};

/// A sdbus::Variant is a message that is read when its value is asked for, so that is part of it.
class SdbusDecoder : public Decoder {
public:
    explicit SdbusDecoder(std::size_t entries)
        : m_proxy(sdbus::createProxy(*m_connection, peerName, adapterWith(entries))) {
        sdbus::MethodCall call = m_proxy->createMethodCall(peerInterface, "Dictionary");
        m_reply = m_proxy->callMethod(call);
    }
    std::size_t decode() override {
        m_reply.rewind(true);
        Properties properties;
        m_reply >> properties;
        std::vector<std::variant<std::uint32_t, bool, std::string>> values;
        values.reserve(properties.size());
        for (const auto& [name, value] : properties) {
            switch (value.peekValueType()[0]) {
            case 'u':
                values.emplace_back(value.get<std::uint32_t>());
                break;
            case 'b':
                values.emplace_back(value.get<bool>());
                break;
            default:
                values.emplace_back(value.get<std::string>());
            }
        }
        return values.size();
    }

private:
    std::unique_ptr<sdbus::IConnection> m_connection = sdbus::createSystemBusConnection();
    std::unique_ptr<sdbus::IProxy> m_proxy;
    sdbus::MethodReply m_reply;
};

} // namespace

const Library sdbuscpp = {
    "sdbus-c++",
    []() -> std::unique_ptr<Caller> { return std::make_unique<SdbusCaller>(); },
    [](Listener::Handler handler) -> std::unique_ptr<Listener> {
        return std::make_unique<SdbusListener>(handler);
    },
    [](std::size_t entries) -> std::unique_ptr<Decoder> {
        return std::make_unique<SdbusDecoder>(entries);
    },
};

} // namespace Bench
