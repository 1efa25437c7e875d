#include "control/control_interface.h"

#include "daemon/client_agent.h"
#include "daemon/device_audio.h"
#include "daemon/device_pairing.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/address.h"
#include "serving/bus/dict_builder.h"
#include "world/settings.h"

#include <algorithm>
#include <stdexcept>

namespace Bluetooth::Sim {

namespace {

constexpr const char* controlName = "com.kestrine.bluetooth.Sim";
constexpr const char* controlPath = "/com/kestrine/bluetooth/Sim";
constexpr const char* busName = "org.freedesktop.DBus";
constexpr const char* busPath = "/org/freedesktop/DBus";

std::string asSetting(GVariant* value) {
    if (g_variant_is_of_type(value, G_VARIANT_TYPE_STRING))
        return g_variant_get_string(value, nullptr);
    if (g_variant_is_of_type(value, G_VARIANT_TYPE_STRING_ARRAY)) {
        const GlibPtr<char*> texts(g_variant_dup_strv(value, nullptr));
        const GlibPtr<char> joined(g_strjoinv(";", texts.get()));
        return joined.get();
    }
    const GlibPtr<char> printed(g_variant_print(value, FALSE));
    return printed.get();
}

/// The a{sv} at that place of a call's arguments.
Settings settingsOf(const CallPtr& call, gsize index) {
    Settings settings;
    const GlibPtr<GVariant> dict(g_variant_get_child_value(call->arguments().get(), index));
    GVariantIter entries;
    g_variant_iter_init(&entries, dict.get());
    const char* key = nullptr;
    GVariant* value = nullptr;
    while (g_variant_iter_loop(&entries, "{&sv}", &key, &value))
        settings.emplace_back(key, asSetting(value));
    return settings;
}

/// A variant argument as a message body: a tuple or an av (which may be empty, as a tuple on D-Bus
/// may not) holds all arguments, anything else is the only one.
Value bodyOf(const CallPtr& call, gsize index) {
    Value content = call->content(index);
    if (g_variant_is_of_type(content.get(), G_VARIANT_TYPE_TUPLE))
        return content;
    if (!content.is("av"))
        return tuple(content);
    const gsize count = g_variant_n_children(content.get());
    if (count == 0)
        return {};
    GVariantBuilder body;
    g_variant_builder_init(&body, G_VARIANT_TYPE_TUPLE);
    for (gsize i = 0; i < count; ++i) {
        const GlibPtr<GVariant> boxed(g_variant_get_child_value(content.get(), i));
        const GlibPtr<GVariant> argument(g_variant_get_variant(boxed.get()));
        g_variant_builder_add_value(&body, argument.get());
    }
    return g_variant_builder_end(&body);
}

} // namespace

const Interface& ControlInterface::table() {
    static const Arguments device = {{"adapter", "s"}, {"address", "s"}};
    static const Interface table = {
        controlName,
        {{"AddAdapter",
          {{"settings", "a{sv}"}},
          {{"id", "s"}},
          handle<&ControlInterface::addAdapter>},
         {"RemoveAdapter", {{"id", "s"}}, {}, handle<&ControlInterface::removeAdapter>},
         {"AddDevice",
          {{"address", "s"}, {"settings", "a{sv}"}},
          {},
          handle<&ControlInterface::addDevice>},
         {"SetDevice",
          {{"address", "s"}, {"settings", "a{sv}"}},
          {},
          handle<&ControlInterface::setDevice>},
         {"RemoveDevice", {{"address", "s"}}, {}, handle<&ControlInterface::removeDevice>},
         {"ConnectDevice", device, {}, handle<&ControlInterface::connectDevice>},
         {"StartIncomingPairing", device, {}, handle<&ControlInterface::startIncomingPairing>},
         {"ConnectService",
          {{"adapter", "s"}, {"address", "s"}, {"uuid", "s"}},
          {},
          handle<&ControlInterface::connectService>},
         {"DropLink", device, {}, handle<&ControlInterface::dropLink>},
         {"SetPlaying",
          {{"adapter", "s"}, {"address", "s"}, {"playing", "b"}},
          {},
          handle<&ControlInterface::setPlaying>},
         {"EmitSignal",
          {{"path", "o"}, {"interface", "s"}, {"member", "s"}, {"arguments", "v"}},
          {},
          handle<&ControlInterface::emitSignal>},
         {"CallAgent",
          {{"adapter", "s"}, {"interface", "s"}, {"member", "s"}, {"arguments", "v"}},
          {{"errorName", "s"}, {"errorText", "s"}, {"results", "av"}},
          handle<&ControlInterface::callAgent>},
         {"FailNext",
          {{"interface", "s"}, {"method", "s"}, {"errorName", "s"}, {"errorText", "s"}},
          {},
          handle<&ControlInterface::failNext>},
         {"DelayNext",
          {{"interface", "s"}, {"method", "s"}, {"milliseconds", "u"}},
          {},
          handle<&ControlInterface::delayNext>},
         {"ClearFaults", {}, {}, handle<&ControlInterface::clearFaults>},
         {"GetCalls", {}, {{"calls", "a(ossav)"}}, handle<&ControlInterface::getCalls>},
         {"ClearCalls", {}, {}, handle<&ControlInterface::clearCalls>},
         {"SetTimeScale", {{"scale", "d"}}, {}, handle<&ControlInterface::setTimeScale>},
         {"SetTimes", {{"milliseconds", "a{sv}"}}, {}, handle<&ControlInterface::setTimes>},
         {"DropName", {}, {}, handle<&ControlInterface::dropName>},
         {"RegainName", {}, {}, handle<&ControlInterface::regainName>},
         {"Restart", {}, {{"pid", "u"}}, handle<&ControlInterface::restart>},
         {"Quit", {}, {}, handle<&ControlInterface::quit>}},
        {{"CallReceived", {{"path", "o"}, {"interface", "s"}, {"member", "s"}, {"sender", "s"}}}}};
    return table;
}

ControlInterface::ControlInterface(World& world, const std::string& busAddress, bool verbose)
    : m_world(world),
      m_verbose(verbose),
      m_daemon(world, busAddress, [this](const CallPtr& call) { return beforeCall(call); }),
      m_faults([this](const CallPtr& call) {
          if (m_daemon.running())
              m_daemon.dispatch(call);
      }),
      m_bus(busAddress, [this](const CallPtr& call) { received(call); }) {
    m_objects.add(controlPath, table(), this);
    m_bus.own(controlName);
}

ControlInterface::~ControlInterface() = default;

bool ControlInterface::beforeCall(const CallPtr& call) {
    if (m_verbose)
        g_printerr("%s %s.%s%s\n", call->path().c_str(), call->interface().c_str(),
                   call->member().c_str(),
                   GlibPtr<char>(g_variant_print(call->arguments().get(), FALSE)).get());
    m_calls.add(call);
    m_bus.emit(controlPath, controlName, "CallReceived",
               tuple(pathValue(call->path()), call->interface(), call->member(), call->sender()));
    return m_faults.take(call);
}

void ControlInterface::received(const CallPtr& call) {
    const auto run = [this, call] { carryOut(call, [&] { m_objects.dispatch(call); }); };
    if (m_daemon.running())
        m_daemon.bus().afterRoundTrip(run);
    else
        run();
}

void ControlInterface::carryOut(const CallPtr& call, const std::function<void()>& what) {
    try {
        what();
    } catch (const SettingError& wrong) {
        call->fail({std::string(controlName) + ".Error.Failed", wrong.key() + ": " + wrong.what()});
    } catch (const std::exception& wrong) {
        call->fail({std::string(controlName) + ".Error.Failed", wrong.what()});
    }
}

void ControlInterface::done(const CallPtr& call, const Value& results) {
    if (!call->expectsReply() || !m_daemon.running())
        return call->reply(results);
    m_daemon.bus().afterRoundTrip([call, results] { call->reply(results); });
}

ServedAdapter& ControlInterface::adapter(const std::string& id) {
    ServedAdapter* found = m_daemon.find(id);
    if (!found)
        throw std::runtime_error("there is no adapter \"" + id + "\"");
    return *found;
}

std::shared_ptr<PeerDevice> ControlInterface::peer(const std::string& address) {
    auto found = m_world.peer(upperCase(address));
    if (!found)
        throw std::runtime_error("there is no device \"" + address + "\"");
    return found;
}

std::shared_ptr<ServedDevice> ControlInterface::device(const CallPtr& call) {
    auto found = adapter(call->text(0)).find(upperCase(call->text(1)));
    if (!found)
        throw std::runtime_error("the daemon does not know \"" + call->text(1) + "\"");
    return found;
}

void ControlInterface::peerChanged(const std::shared_ptr<PeerDevice>& peer) {
    for (const auto& adapter : m_daemon.adapters()) {
        adapter->discovery().peerChanged(peer);
        const auto known = adapter->find(peer->address);
        if (known && !(peer->present && peer->connectable))
            known->link().drop();
    }
}

void ControlInterface::addAdapter(const CallPtr& call) {
    auto hardware = std::make_shared<AdapterHardware>();
    hardware->index = m_world.freeIndex();
    hardware->name = hardware->id();
    const GlibPtr<char> address(g_strdup_printf("00:1A:7D:DA:72:%02X", hardware->index));
    hardware->address = address.get();
    applySettings(*hardware, settingsOf(call, 0));
    for (const auto& peer : m_world.peers)
        World::store(*hardware, *peer);
    m_world.adapters.push_back(hardware);
    if (m_daemon.running())
        m_daemon.plugIn(hardware);
    done(call, tuple(hardware->id()));
}

void ControlInterface::removeAdapter(const CallPtr& call) {
    const auto hardware = m_world.adapter(call->text(0));
    if (!hardware)
        throw std::runtime_error("there is no adapter \"" + call->text(0) + "\"");
    if (ServedAdapter* plugged = m_daemon.find(hardware->id()))
        m_daemon.pullOut(*plugged);
    auto& all = m_world.adapters;
    all.erase(std::find(all.begin(), all.end(), hardware));
    done(call);
}

void ControlInterface::addDevice(const CallPtr& call) {
    const std::string address = upperCase(call->text(0));
    if (!isAddress(address))
        throw std::runtime_error("\"" + address + "\" is not an address");
    if (m_world.peer(address))
        throw std::runtime_error("there is a device " + address + " already");
    auto peer = std::make_shared<PeerDevice>();
    peer->address = address;
    applySettings(*peer, settingsOf(call, 1));
    m_world.peers.push_back(peer);
    peerChanged(peer);
    done(call);
}

void ControlInterface::setDevice(const CallPtr& call) {
    const auto changed = peer(call->text(0));
    PeerDevice copy = *changed; // nothing changes unless everything can
    applySettings(copy, settingsOf(call, 1));
    *changed = copy;
    peerChanged(changed);
    done(call);
}

void ControlInterface::removeDevice(const CallPtr& call) {
    const auto gone = peer(call->text(0));
    auto& all = m_world.peers;
    all.erase(std::find(all.begin(), all.end(), gone));
    gone->present = false;
    peerChanged(gone);
    done(call);
}

void ControlInterface::comeIn(const CallPtr& call, bool pairing) {
    ServedAdapter& to = adapter(call->text(0));
    const auto from = peer(call->text(1));
    if (!to.mode().powered())
        throw std::runtime_error("the adapter is off");
    auto known = to.find(from->address);
    if (known && known->busy())
        throw std::runtime_error("the device is busy");
    if (!known)
        known = to.addDevice(from->address);
    known->comeIn(pairing);
    done(call);
}

void ControlInterface::connectDevice(const CallPtr& call) {
    comeIn(call, false);
}

void ControlInterface::startIncomingPairing(const CallPtr& call) {
    comeIn(call, true);
}

void ControlInterface::connectService(const CallPtr& call) {
    const std::string uuid = fullUuid(call->text(2));
    if (uuid.empty())
        throw std::runtime_error("\"" + call->text(2) + "\" is not a UUID");
    device(call)->audio().serviceConnects(uuid);
    done(call);
}

void ControlInterface::dropLink(const CallPtr& call) {
    device(call)->link().drop();
    done(call);
}

void ControlInterface::setPlaying(const CallPtr& call) {
    device(call)->audio().setPlaying(call->argument(2).flag());
    done(call);
}

void ControlInterface::emitSignal(const CallPtr& call) {
    const std::string interface = call->text(1);
    const std::string member = call->text(2);
    if (!g_dbus_is_interface_name(interface.c_str()) || !g_dbus_is_member_name(member.c_str()))
        throw std::runtime_error("\"" + interface + "." + member + "\" cannot name a signal");
    if (!m_daemon.running())
        throw std::runtime_error("the daemon is not on the bus");
    m_daemon.bus().emit(call->text(0), interface, member, bodyOf(call, 3));
    done(call);
}

void ControlInterface::callAgent(const CallPtr& call) {
    ServedAdapter& of = adapter(call->text(0));
    const ClientAgent* agent = of.currentAgent();
    if (!agent)
        throw std::runtime_error("the adapter has no agent");
    const std::string interface = call->text(1).empty() ? Interfaces::agent : call->text(1);
    const std::string member = call->text(2);
    if (!g_dbus_is_interface_name(interface.c_str()) || !g_dbus_is_member_name(member.c_str()))
        throw std::runtime_error("\"" + interface + "." + member + "\" cannot name a method");
    m_daemon.bus().call(
        agent->owner(), agent->path(), interface, member, bodyOf(call, 3),
        static_cast<int>(m_world.times.agentTimeout), nullptr, [call](const CallResult& answer) {
            call->reply(tuple(answer.error.name, answer.error.text, variantList(answer.results)));
        });
}

void ControlInterface::failNext(const CallPtr& call) {
    const BusError error = {call->text(2), call->text(3)};
    if (!g_dbus_is_interface_name(error.name.c_str()))
        throw std::runtime_error("\"" + error.name + "\" is not an error name");
    m_faults.failNext(call->text(0), call->text(1), error);
    done(call);
}

void ControlInterface::delayNext(const CallPtr& call) {
    m_faults.delayNext(call->text(0), call->text(1), call->number(2));
    done(call);
}

void ControlInterface::clearFaults(const CallPtr& call) {
    m_faults.clear();
    done(call);
}

void ControlInterface::getCalls(const CallPtr& call) {
    done(call, tuple(m_calls.list()));
}

void ControlInterface::clearCalls(const CallPtr& call) {
    m_calls.clear();
    done(call);
}

void ControlInterface::setTimeScale(const CallPtr& call) {
    double scale = 0;
    g_variant_get(call->arguments().get(), "(d)", &scale);
    if (!(scale >= 0 && scale <= 1000))
        throw std::runtime_error("a time scale is from 0 to 1000");
    m_world.times.scale = scale;
    done(call);
}

void ControlInterface::setTimes(const CallPtr& call) {
    Times copy = m_world.times;
    applySettings(copy, settingsOf(call, 0));
    m_world.times = copy;
    done(call);
}

/// The bus learns of a closed connection in its own time: what follows comes after that.
void ControlInterface::whenGone(std::function<void()> next) {
    m_bus.call(busName, busPath, busName, "NameHasOwner", tuple("org.bluez"), -1, nullptr,
               [this, next = std::move(next)](const CallResult& answer) {
                   gboolean owned = FALSE;
                   if (!answer.failed)
                       g_variant_get(answer.results.get(), "(b)", &owned);
                   if (owned)
                       whenGone(next);
                   else
                       next();
               });
}

void ControlInterface::dropName(const CallPtr& call) {
    m_daemon.vanish();
    whenGone([call] { call->reply(); });
}

void ControlInterface::regainName(const CallPtr& call) {
    if (!m_daemon.running())
        m_daemon.start(m_daemon.pid());
    done(call);
}

void ControlInterface::restart(const CallPtr& call) {
    const int pid = m_daemon.pid() + 1;
    m_daemon.stop();
    whenGone([this, call, pid] {
        carryOut(call, [&] {
            m_daemon.start(pid);
            done(call, tuple(static_cast<guint32>(pid)));
        });
    });
}

void ControlInterface::quit(const CallPtr& call) {
    call->reply();
    m_quit();
}

} // namespace Bluetooth::Sim
