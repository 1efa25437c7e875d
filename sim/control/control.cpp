#include "control/control.h"

#include "daemon/adapter.h"
#include "daemon/agent.h"
#include "daemon/audio_device.h"
#include "daemon/device.h"
#include "daemon/pairing.h"
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

const Interface& Control::table() {
    static const Arguments device = {{"adapter", "s"}, {"address", "s"}};
    static const Interface table = {
        controlName,
        {{"AddAdapter", {{"settings", "a{sv}"}}, {{"id", "s"}}, handle<&Control::addAdapter>},
         {"RemoveAdapter", {{"id", "s"}}, {}, handle<&Control::removeAdapter>},
         {"AddDevice", {{"address", "s"}, {"settings", "a{sv}"}}, {}, handle<&Control::addDevice>},
         {"SetDevice", {{"address", "s"}, {"settings", "a{sv}"}}, {}, handle<&Control::setDevice>},
         {"RemoveDevice", {{"address", "s"}}, {}, handle<&Control::removeDevice>},
         {"ConnectDevice", device, {}, handle<&Control::connectDevice>},
         {"StartIncomingPairing", device, {}, handle<&Control::startIncomingPairing>},
         {"ConnectService",
          {{"adapter", "s"}, {"address", "s"}, {"uuid", "s"}},
          {},
          handle<&Control::connectService>},
         {"DropLink", device, {}, handle<&Control::dropLink>},
         {"SetPlaying",
          {{"adapter", "s"}, {"address", "s"}, {"playing", "b"}},
          {},
          handle<&Control::setPlaying>},
         {"EmitSignal",
          {{"path", "o"}, {"interface", "s"}, {"member", "s"}, {"arguments", "v"}},
          {},
          handle<&Control::emitSignal>},
         {"CallAgent",
          {{"adapter", "s"}, {"interface", "s"}, {"member", "s"}, {"arguments", "v"}},
          {{"errorName", "s"}, {"errorText", "s"}, {"results", "av"}},
          handle<&Control::callAgent>},
         {"FailNext",
          {{"interface", "s"}, {"method", "s"}, {"errorName", "s"}, {"errorText", "s"}},
          {},
          handle<&Control::failNext>},
         {"DelayNext",
          {{"interface", "s"}, {"method", "s"}, {"milliseconds", "u"}},
          {},
          handle<&Control::delayNext>},
         {"ClearFaults", {}, {}, handle<&Control::clearFaults>},
         {"GetCalls", {}, {{"calls", "a(ossav)"}}, handle<&Control::getCalls>},
         {"ClearCalls", {}, {}, handle<&Control::clearCalls>},
         {"SetTimeScale", {{"scale", "d"}}, {}, handle<&Control::setTimeScale>},
         {"SetTimes", {{"milliseconds", "a{sv}"}}, {}, handle<&Control::setTimes>},
         {"DropName", {}, {}, handle<&Control::dropName>},
         {"RegainName", {}, {}, handle<&Control::regainName>},
         {"Restart", {}, {{"pid", "u"}}, handle<&Control::restart>},
         {"Quit", {}, {}, handle<&Control::quit>}},
        {{"CallReceived", {{"path", "o"}, {"interface", "s"}, {"member", "s"}, {"sender", "s"}}}}};
    return table;
}

Control::Control(World& world, const std::string& busAddress, bool verbose)
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

Control::~Control() = default;

bool Control::beforeCall(const CallPtr& call) {
    if (m_verbose)
        g_printerr("%s %s.%s%s\n", call->path().c_str(), call->interface().c_str(),
                   call->member().c_str(),
                   GlibPtr<char>(g_variant_print(call->arguments().get(), FALSE)).get());
    m_calls.add(call);
    m_bus.emit(controlPath, controlName, "CallReceived",
               tuple(pathValue(call->path()), call->interface(), call->member(), call->sender()));
    return m_faults.take(call);
}

void Control::received(const CallPtr& call) {
    const auto run = [this, call] { carryOut(call, [&] { m_objects.dispatch(call); }); };
    if (m_daemon.running())
        m_daemon.bus().afterRoundTrip(run);
    else
        run();
}

void Control::carryOut(const CallPtr& call, const std::function<void()>& what) {
    try {
        what();
    } catch (const SettingError& wrong) {
        call->fail({std::string(controlName) + ".Error.Failed", wrong.key() + ": " + wrong.what()});
    } catch (const std::exception& wrong) {
        call->fail({std::string(controlName) + ".Error.Failed", wrong.what()});
    }
}

void Control::done(const CallPtr& call, const Value& results) {
    if (!call->expectsReply() || !m_daemon.running())
        return call->reply(results);
    m_daemon.bus().afterRoundTrip([call, results] { call->reply(results); });
}

Adapter& Control::adapter(const std::string& id) {
    Adapter* found = m_daemon.find(id);
    if (!found)
        throw std::runtime_error("there is no adapter \"" + id + "\"");
    return *found;
}

std::shared_ptr<Peer> Control::peer(const std::string& address) {
    auto found = m_world.peer(upperCase(address));
    if (!found)
        throw std::runtime_error("there is no device \"" + address + "\"");
    return found;
}

std::shared_ptr<Device> Control::device(const CallPtr& call) {
    auto found = adapter(call->text(0)).find(upperCase(call->text(1)));
    if (!found)
        throw std::runtime_error("the daemon does not know \"" + call->text(1) + "\"");
    return found;
}

void Control::peerChanged(const std::shared_ptr<Peer>& peer) {
    for (const auto& adapter : m_daemon.adapters()) {
        adapter->discovery().peerChanged(peer);
        const auto known = adapter->find(peer->address);
        if (known && !(peer->present && peer->connectable))
            known->link().drop();
    }
}

void Control::addAdapter(const CallPtr& call) {
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

void Control::removeAdapter(const CallPtr& call) {
    const auto hardware = m_world.adapter(call->text(0));
    if (!hardware)
        throw std::runtime_error("there is no adapter \"" + call->text(0) + "\"");
    if (Adapter* plugged = m_daemon.find(hardware->id()))
        m_daemon.pullOut(*plugged);
    auto& all = m_world.adapters;
    all.erase(std::find(all.begin(), all.end(), hardware));
    done(call);
}

void Control::addDevice(const CallPtr& call) {
    const std::string address = upperCase(call->text(0));
    if (!isAddress(address))
        throw std::runtime_error("\"" + address + "\" is not an address");
    if (m_world.peer(address))
        throw std::runtime_error("there is a device " + address + " already");
    auto peer = std::make_shared<Peer>();
    peer->address = address;
    applySettings(*peer, settingsOf(call, 1));
    m_world.peers.push_back(peer);
    peerChanged(peer);
    done(call);
}

void Control::setDevice(const CallPtr& call) {
    const auto changed = peer(call->text(0));
    Peer copy = *changed; // nothing changes unless everything can
    applySettings(copy, settingsOf(call, 1));
    *changed = copy;
    peerChanged(changed);
    done(call);
}

void Control::removeDevice(const CallPtr& call) {
    const auto gone = peer(call->text(0));
    auto& all = m_world.peers;
    all.erase(std::find(all.begin(), all.end(), gone));
    gone->present = false;
    peerChanged(gone);
    done(call);
}

void Control::comeIn(const CallPtr& call, bool pairing) {
    Adapter& to = adapter(call->text(0));
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

void Control::connectDevice(const CallPtr& call) {
    comeIn(call, false);
}

void Control::startIncomingPairing(const CallPtr& call) {
    comeIn(call, true);
}

void Control::connectService(const CallPtr& call) {
    const std::string uuid = fullUuid(call->text(2));
    if (uuid.empty())
        throw std::runtime_error("\"" + call->text(2) + "\" is not a UUID");
    device(call)->audio().serviceConnects(uuid);
    done(call);
}

void Control::dropLink(const CallPtr& call) {
    device(call)->link().drop();
    done(call);
}

void Control::setPlaying(const CallPtr& call) {
    device(call)->audio().setPlaying(call->argument(2).flag());
    done(call);
}

void Control::emitSignal(const CallPtr& call) {
    const std::string interface = call->text(1);
    const std::string member = call->text(2);
    if (!g_dbus_is_interface_name(interface.c_str()) || !g_dbus_is_member_name(member.c_str()))
        throw std::runtime_error("\"" + interface + "." + member + "\" cannot name a signal");
    if (!m_daemon.running())
        throw std::runtime_error("the daemon is not on the bus");
    m_daemon.bus().emit(call->text(0), interface, member, bodyOf(call, 3));
    done(call);
}

void Control::callAgent(const CallPtr& call) {
    Adapter& of = adapter(call->text(0));
    const Agent* agent = of.currentAgent();
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

void Control::failNext(const CallPtr& call) {
    const BusError error = {call->text(2), call->text(3)};
    if (!g_dbus_is_interface_name(error.name.c_str()))
        throw std::runtime_error("\"" + error.name + "\" is not an error name");
    m_faults.failNext(call->text(0), call->text(1), error);
    done(call);
}

void Control::delayNext(const CallPtr& call) {
    m_faults.delayNext(call->text(0), call->text(1), call->number(2));
    done(call);
}

void Control::clearFaults(const CallPtr& call) {
    m_faults.clear();
    done(call);
}

void Control::getCalls(const CallPtr& call) {
    done(call, tuple(m_calls.list()));
}

void Control::clearCalls(const CallPtr& call) {
    m_calls.clear();
    done(call);
}

void Control::setTimeScale(const CallPtr& call) {
    double scale = 0;
    g_variant_get(call->arguments().get(), "(d)", &scale);
    if (!(scale >= 0 && scale <= 1000))
        throw std::runtime_error("a time scale is from 0 to 1000");
    m_world.times.scale = scale;
    done(call);
}

void Control::setTimes(const CallPtr& call) {
    Times copy = m_world.times;
    applySettings(copy, settingsOf(call, 0));
    m_world.times = copy;
    done(call);
}

/// The bus learns of a closed connection in its own time: what follows comes after that.
void Control::whenGone(std::function<void()> next) {
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

void Control::dropName(const CallPtr& call) {
    m_daemon.vanish();
    whenGone([call] { call->reply(); });
}

void Control::regainName(const CallPtr& call) {
    if (!m_daemon.running())
        m_daemon.start(m_daemon.pid());
    done(call);
}

void Control::restart(const CallPtr& call) {
    const int pid = m_daemon.pid() + 1;
    m_daemon.stop();
    whenGone([this, call, pid] {
        carryOut(call, [&] {
            m_daemon.start(pid);
            done(call, tuple(static_cast<guint32>(pid)));
        });
    });
}

void Control::quit(const CallPtr& call) {
    call->reply();
    m_quit();
}

} // namespace Bluetooth::Sim
