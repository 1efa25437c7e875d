// SPDX-License-Identifier: LGPL-2.1-or-later
#include "control/control_interface.h"

#include "control/arguments.h"
#include "daemon/client_agent.h"
#include "daemon/served_adapter.h"
#include "serving/bluez4/interfaces.h"
#include "world/settings.h"

#include <stdexcept>

namespace Bluetooth::Sim {

namespace {

constexpr const char* controlName = "com.kestrine.bluetooth.Sim";
constexpr const char* controlPath = "/com/kestrine/bluetooth/Sim";
constexpr const char* busName = "org.freedesktop.DBus";
constexpr const char* busPath = "/org/freedesktop/DBus";

} // namespace

const Interface& ControlInterface::table() {
    using Self = ControlInterface;
    static const Arguments device = {{"adapter", "s"}, {"address", "s"}};
    static const Arguments service = {{"adapter", "s"}, {"address", "s"}, {"uuid", "s"}};
    static const Arguments settings = {{"address", "s"}, {"settings", "a{sv}"}};
    static const Interface table = {
        controlName,
        {{"AddAdapter",
          {{"settings", "a{sv}"}},
          {{"id", "s"}},
          handle<&Self::inWorld<&WorldControl::addAdapter>>},
         {"RemoveAdapter", {{"id", "s"}}, {}, handle<&Self::inWorld<&WorldControl::removeAdapter>>},
         {"AddDevice", settings, {}, handle<&Self::inWorld<&WorldControl::addDevice>>},
         {"SetDevice", settings, {}, handle<&Self::inWorld<&WorldControl::setDevice>>},
         {"RemoveDevice",
          {{"address", "s"}},
          {},
          handle<&Self::inWorld<&WorldControl::removeDevice>>},
         {"ConnectDevice", device, {}, handle<&Self::inWorld<&WorldControl::connectDevice>>},
         {"StartIncomingPairing",
          device,
          {},
          handle<&Self::inWorld<&WorldControl::startIncomingPairing>>},
         {"ConnectService", service, {}, handle<&Self::inWorld<&WorldControl::connectService>>},
         {"DisconnectService",
          service,
          {},
          handle<&Self::inWorld<&WorldControl::disconnectService>>},
         {"PressHeadsetButton",
          device,
          {},
          handle<&Self::inWorld<&WorldControl::pressHeadsetButton>>},
         {"SetHeadsetGain",
          {{"adapter", "s"}, {"address", "s"}, {"name", "s"}, {"gain", "q"}},
          {},
          handle<&Self::inWorld<&WorldControl::setHeadsetGain>>},
         {"DropLink", device, {}, handle<&Self::inWorld<&WorldControl::dropLink>>},
         {"SetPlaying",
          {{"adapter", "s"}, {"address", "s"}, {"playing", "b"}},
          {},
          handle<&Self::inWorld<&WorldControl::setPlaying>>},
         {"EmitSignal",
          {{"path", "o"}, {"interface", "s"}, {"member", "s"}, {"arguments", "v"}},
          {},
          handle<&Self::emitSignal>},
         {"CallAgent",
          {{"adapter", "s"}, {"interface", "s"}, {"member", "s"}, {"arguments", "v"}},
          {{"errorName", "s"}, {"errorText", "s"}, {"results", "av"}},
          handle<&Self::callAgent>},
         {"FailNext",
          {{"interface", "s"}, {"method", "s"}, {"errorName", "s"}, {"errorText", "s"}},
          {},
          handle<&Self::failNext>},
         {"DelayNext",
          {{"interface", "s"}, {"method", "s"}, {"milliseconds", "u"}},
          {},
          handle<&Self::delayNext>},
         {"ClearFaults", {}, {}, handle<&Self::clearFaults>},
         {"GetCalls", {}, {{"calls", "a(ossav)"}}, handle<&Self::getCalls>},
         {"ClearCalls", {}, {}, handle<&Self::clearCalls>},
         {"SetTimeScale",
          {{"scale", "d"}},
          {},
          handle<&Self::inWorld<&WorldControl::setTimeScale>>},
         {"SetTimes",
          {{"milliseconds", "a{sv}"}},
          {},
          handle<&Self::inWorld<&WorldControl::setTimes>>},
         {"SetAudio", {{"settings", "a{sv}"}}, {}, handle<&Self::inWorld<&WorldControl::setAudio>>},
         {"DropName", {}, {}, handle<&Self::dropName>},
         {"RegainName", {}, {}, handle<&Self::regainName>},
         {"Restart", {}, {{"pid", "u"}}, handle<&Self::restart>},
         {"Quit", {}, {}, handle<&Self::quit>}},
        {{"CallReceived", {{"path", "o"}, {"interface", "s"}, {"member", "s"}, {"sender", "s"}}}}};
    return table;
}

ControlInterface::ControlInterface(World& world, const std::string& busAddress, bool verbose)
    : m_verbose(verbose),
      m_daemon(world, busAddress, [this](const CallPtr& call) { return beforeCall(call); }),
      m_worldControl(world, m_daemon),
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
    afterDaemonsMessages([this, call] { carryOut(call, [&] { m_objects.dispatch(call); }); });
}

/// Once all that was sent to the daemon and by it before has passed the bus.
void ControlInterface::afterDaemonsMessages(std::function<void()> next) {
    if (m_daemon.running())
        m_daemon.bus().afterRoundTrip(std::move(next));
    else
        next();
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

template <auto Function>
void ControlInterface::inWorld(const CallPtr& call) {
    done(call, (m_worldControl.*Function)(call));
}

void ControlInterface::done(const CallPtr& call, const Value& results) {
    if (call->expectsReply())
        afterDaemonsMessages([call, results] { call->reply(results); });
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
    ServedAdapter& of = m_worldControl.adapter(call->text(0));
    const ClientAgent* agent = of.currentAgent();
    if (!agent)
        throw std::runtime_error("the adapter has no agent");
    const std::string interface = call->text(1).empty() ? Interfaces::agent : call->text(1);
    const std::string member = call->text(2);
    if (!g_dbus_is_interface_name(interface.c_str()) || !g_dbus_is_member_name(member.c_str()))
        throw std::runtime_error("\"" + interface + "." + member + "\" cannot name a method");
    m_daemon.bus().call(
        agent->owner(), agent->path(), interface, member, bodyOf(call, 3),
        static_cast<int>(m_daemon.times().agentTimeout), nullptr, [call](const CallResult& answer) {
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
