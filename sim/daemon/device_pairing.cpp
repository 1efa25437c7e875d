// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/device_pairing.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"

namespace Bluetooth::Sim {

namespace {

constexpr BluezError pageTimeout = Errors::connectionAttemptFailed("Page Timeout");

bool usablePin(const std::string& pin) {
    return !pin.empty() && pin.size() <= 16;
}

} // namespace

std::shared_ptr<DevicePairing> DevicePairing::outgoing(ServedDevice& device, const CallPtr& call) {
    auto agent = std::make_shared<ClientAgent>(device.adapter().daemon().bus(), call->sender(),
                                               call->text(1), *parseCapability(call->text(2)));
    return std::make_shared<DevicePairing>(device, call, std::move(agent));
}

std::shared_ptr<DevicePairing> DevicePairing::incoming(ServedDevice& device) {
    return std::make_shared<DevicePairing>(device, nullptr, device.adapter().sharedAgent());
}

DevicePairing::DevicePairing(ServedDevice& device, CallPtr call, std::shared_ptr<ClientAgent> agent)
    : m_device(device),
      m_call(std::move(call)),
      m_agent(std::move(agent)),
      m_outgoing(m_call != nullptr) {}

DevicePairing::~DevicePairing() = default;

std::string DevicePairing::owner() const {
    return m_call ? m_call->sender() : "";
}

void DevicePairing::begin() {
    if (m_outgoing)
        m_device.adapter().discovery().suspend();
    m_hold = m_device.link().hold();
    m_device.link().connect(m_hold, [this](bool reached) {
        if (reached)
            negotiate();
        else
            fail(pageTimeout);
    });
}

guint DevicePairing::duration() const {
    const Times& times = m_device.adapter().daemon().times();
    const auto peer = m_device.peer();
    return times.scaled(peer && peer->pairingTime ? *peer->pairingTime : times.pairing);
}

guint32 DevicePairing::passkey() const {
    const auto peer = m_device.peer();
    if (peer && peer->passkey)
        return *peer->passkey;
    return static_cast<guint32>(g_random_int_range(0, 1000000));
}

void DevicePairing::negotiate() {
    const auto peer = m_device.peer();
    if (!peer)
        return fail(pageTimeout);
    if (!m_outgoing && !m_device.adapter().mode().pairable())
        return fail(Errors::authenticationRejected);
    if (const auto& end = peer->pairingEnd) {
        if (end->since == PairingEnd::Since::Begun)
            return failLater(*end);
        if (end->since == PairingEnd::Since::Asked)
            m_loss.start(delayOf(*end), [this] { m_device.link().drop(); });
    }
    if (peer->legacy && peer->displaysPin && m_outgoing)
        displayPin();
    else if (peer->legacy)
        askForPin();
    else
        askByCapabilities();
}

void DevicePairing::ask(const char* member, const Value& arguments, const char* results,
                        ClientAgent::OnAnswer onAnswer) {
    const Times& times = m_device.adapter().daemon().times();
    if (m_agent->busy())
        return answered(false);
    m_timeout.start(times.pairingTimeout, [this] { fail(Errors::authenticationTimeout); });
    m_asking = true;
    m_agent->ask(member, arguments, results, times.agentTimeout,
                 [this, onAnswer = std::move(onAnswer)](const CallResult& answer) {
                     m_asking = false;
                     m_timeout.stop();
                     if (!m_cancelled)
                         onAnswer(answer);
                 });
}

void DevicePairing::askForPin() {
    if (!m_agent)
        return answered(false);
    ask("RequestPinCode", tuple(pathValue(m_device.path())), "s", [this](const CallResult& answer) {
        const char* pin = "";
        if (!answer.failed)
            g_variant_get(answer.results.get(), "(&s)", &pin);
        if (!usablePin(pin))
            return fail(Errors::authenticationRejected);
        const auto peer = m_device.peer();
        answered(peer && !peer->pin.empty() && peer->pin == pin);
    });
}

void DevicePairing::displayPin() {
    const GlibPtr<char> pin(g_strdup_printf("%06u", passkey()));
    ask("DisplayPinCode", tuple(pathValue(m_device.path()), pin.get()), "",
        [this](const CallResult& answer) {
            if (!answer.failed)
                return answered(true);
            // An agent that cannot show a PIN is asked for one.
            if (answer.error.name == "org.freedesktop.DBus.Error.UnknownMethod")
                return askForPin();
            fail(Errors::authenticationRejected);
        });
}

void DevicePairing::askByCapabilities() {
    const Capability theirs = m_device.peer()->capability;
    const Capability ours = m_agent ? m_agent->capability() : Capability::NoInputNoOutput;
    if (theirs == Capability::NoInputNoOutput || ours == Capability::NoInputNoOutput)
        return answered(true);
    if (ours == Capability::KeyboardOnly)
        return enter(passkey(), theirs == Capability::KeyboardOnly);
    if (theirs == Capability::KeyboardOnly)
        return display(passkey());
    confirm(passkey());
}

void DevicePairing::confirm(guint32 passkey) {
    ask("RequestConfirmation", tuple(pathValue(m_device.path()), passkey), "",
        [this](const CallResult& answer) {
            if (answer.failed)
                return fail(Errors::authenticationFailed);
            answered(true);
        });
}

void DevicePairing::enter(guint32 passkey, bool typedOnBothSides) {
    ask("RequestPasskey", tuple(pathValue(m_device.path())), "u",
        [this, passkey, typedOnBothSides](const CallResult& answer) {
            if (answer.failed)
                return fail(Errors::authenticationFailed);
            guint32 entered = 0;
            g_variant_get(answer.results.get(), "(u)", &entered);
            answered(entered == passkey || (typedOnBothSides && entered <= 999999));
        });
}

/// The agent is not told of the keys that are typed, nor when it may stop showing.
void DevicePairing::display(guint32 passkey) {
    constexpr guint digits = 6;
    const Times& times = m_device.adapter().daemon().times();
    m_agent->show("DisplayPasskey", tuple(pathValue(m_device.path()), passkey));
    m_timer.start(times.scaled(times.keyPress * digits), [this] { answered(true); });
}

void DevicePairing::answered(bool right) {
    const auto peer = m_device.peer();
    const auto end = peer ? peer->pairingEnd : std::nullopt;
    if (!peer || (end && end->since == PairingEnd::Since::Asked))
        return; // nothing more is heard until the loss is noticed
    if (end && end->since == PairingEnd::Since::Answered)
        return failLater(*end);
    m_timer.start(duration(), [this, right] {
        if (right)
            succeed();
        else
            fail(Errors::authenticationFailed);
    });
}

guint DevicePairing::delayOf(const PairingEnd& end) const {
    return end.after ? m_device.adapter().daemon().times().lasting(end.after) : duration();
}

void DevicePairing::failLater(const PairingEnd& end) {
    m_timer.start(delayOf(end), [this, error = end.error] { fail(error); });
}

void DevicePairing::succeed() {
    ServedDevice& device = m_device;
    const bool outgoing = m_outgoing;
    const CallPtr creating = m_call;
    device.keep();
    device.setPaired(true);
    if (outgoing)
        m_agent->release();
    end();
    device.pairingSucceeded(creating);
    if (outgoing)
        device.adapter().discovery().resume();
}

void DevicePairing::stopTimers() {
    m_timer.stop();
    m_timeout.stop();
    m_loss.stop();
}

void DevicePairing::abandon() {
    stopTimers();
    m_hold.release();
}

void DevicePairing::end() {
    abandon();
    m_device.pairingEnded();
}

void DevicePairing::fail(const BusError& error) {
    const auto device = m_device.shared_from_this();
    const bool outgoing = m_outgoing;
    if (m_agent && m_asking)
        m_agent->cancel();
    if (m_call)
        m_call->fail(error);
    if (outgoing && m_agent)
        m_agent->release();
    end();
    removeFailed(device, outgoing);
}

/// The link drops; a device that nothing was known of before goes with it.
void DevicePairing::removeFailed(const std::shared_ptr<ServedDevice>& device, bool outgoing) {
    device->link().drop();
    if (device->temporary())
        device->adapter().forgetDevice(device);
    if (outgoing)
        device->adapter().discovery().resume();
}

void DevicePairing::cancel(const CallPtr& call) {
    m_cancelled = true;
    stopTimers();
    if (m_device.link().up())
        return m_device.link().requestDisconnect(call);
    linkLost();
    call->reply();
}

void DevicePairing::linkLost() {
    const auto device = m_device.shared_from_this();
    const auto agent = m_agent;
    const CallPtr creating = m_call;
    const bool outgoing = m_outgoing;
    if (agent && m_asking)
        agent->cancel();
    end();
    removeFailed(device, outgoing);
    if (agent && creating)
        agent->release();
    if (creating)
        creating->fail(pageTimeout);
}

void DevicePairing::powerLost() {
    fail(Errors::authenticationCanceled);
}

void DevicePairing::ownerGone() {
    m_device.setTemporary(!m_device.stored().known);
    m_cancelled = true;
    stopTimers();
    // Nobody is left to be told.
    m_agent.reset();
    m_call.reset();
    if (m_device.link().up())
        m_device.link().requestDisconnect(nullptr);
    else
        linkLost();
}

void DevicePairing::releaseAgent() {
    if (m_outgoing && m_agent)
        m_agent->release();
}

} // namespace Bluetooth::Sim
