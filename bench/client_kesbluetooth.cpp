// SPDX-License-Identifier: LGPL-2.1-or-later
#include "client.h"
#include "names.h"

#include <bluetooth/remote_object.h>

namespace Bench {

namespace {

using Bluetooth::RemoteObject;

class Proxy : public RemoteObject {
public:
    explicit Proxy(const char* path = peerPath)
        : RemoteObject(peerName, path, peerInterface, DBUS_BUS_SYSTEM) {}
    void call(const char* method) {
        require(newMessage(method) == 0 && sendMessage(true, -1) == 0, "kesbluetooth: call");
    }
};

class KesCaller : public Caller {
public:
    void callNothing() override { m_proxy.call("Nothing"); }
    std::size_t callText() override {
        m_proxy.call("Text");
        std::string text;
        require(m_proxy.getReplyValue(text) == 0, "kesbluetooth: text");
        return text.size();
    }
    std::size_t callProperties() override {
        m_proxy.call("Properties");
        Bluetooth::Dict dict;
        require(m_proxy.getReplyValue(dict) == 0, "kesbluetooth: properties");
        return dict.size();
    }

private:
    Proxy m_proxy;
};

class KesListener : public Listener {
public:
    explicit KesListener(Handler handler) {
        currentHandler = handler;
        startLoopOnce();
        const auto tick = [](RemoteObject*, const char* text) { currentHandler(text); };
        require(m_subscriber.setSignalHandlerString("Tick", tick) == 0, "kesbluetooth: subscribe");
    }
    std::size_t callText() override { return m_caller.callText(); }

private:
    /// A process can have one receive thread, and it lasts as long as the process.
    static void startLoopOnce() {
        static Proxy& loop = *new Proxy;
        static const int started = loop.startLoop();
        require(started == 0, "kesbluetooth: startLoop");
    }

    static inline Handler currentHandler = nullptr;
    KesCaller m_caller;
    Proxy m_subscriber;
};

class KesDecoder : public Decoder {
public:
    explicit KesDecoder(std::size_t entries) : m_proxy(adapterWith(entries).c_str()) {
        const std::string path = adapterWith(entries);
        DBusMessage* call =
            dbus_message_new_method_call(peerName, path.c_str(), peerInterface, "Dictionary");
        m_reply =
            dbus_connection_send_with_reply_and_block(m_proxy.getConnection(), call, -1, nullptr);
        dbus_message_unref(call);
        require(m_reply, "kesbluetooth: dictionary");
    }
    ~KesDecoder() override { dbus_message_unref(m_reply); }
    std::size_t decode() override {
        Bluetooth::Dict dict;
        m_proxy.setReplyMessage(dbus_message_ref(m_reply));
        require(m_proxy.getReplyValue(dict) == 0, "kesbluetooth: decode");
        return dict.size();
    }

private:
    Proxy m_proxy;
    DBusMessage* m_reply;
};

} // namespace

const Library kesbluetooth = {
    "kesbluetooth",
    []() -> std::unique_ptr<Caller> { return std::make_unique<KesCaller>(); },
    [](Listener::Handler handler) -> std::unique_ptr<Listener> {
        return std::make_unique<KesListener>(handler);
    },
    [](std::size_t entries) -> std::unique_ptr<Decoder> {
        return std::make_unique<KesDecoder>(entries);
    },
};

} // namespace Bench
