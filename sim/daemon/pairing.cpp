#include "daemon/pairing.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/daemon.h"
#include "daemon/device.h"

namespace Bluetooth::Sim {

namespace {

BusError authentication(const char* name) {
    const std::string words = std::string("Authentication ") + name;
    return Errors::bluez((std::string("Authentication") + name).c_str(), words.c_str());
}

BusError pageTimeout() {
    return Errors::bluez("ConnectionAttemptFailed", "Page Timeout");
}

bool usablePin(const std::string& pin) {
    return !pin.empty() && pin.size() <= 16;
}

} // namespace

std::shared_ptr<Pairing> Pairing::outgoing(Device& device, const CallPtr& call) {
    auto agent = std::make_shared<Agent>(device.adapter().daemon().bus(), call->sender(),
                                         call->text(1), *parseCapability(call->text(2)));
    return std::make_shared<Pairing>(device, call, std::move(agent));
}

std::shared_ptr<Pairing> Pairing::incoming(Device& device) {
    return std::make_shared<Pairing>(device, nullptr, device.adapter().sharedAgent());
}

Pairing::Pairing(Device& device, CallPtr call, std::shared_ptr<Agent> agent)
    : device_(device),
      call_(std::move(call)),
      agent_(std::move(agent)),
      outgoing_(call_ != nullptr) {}

Pairing::~Pairing() = default;

std::string Pairing::owner() const {
    return call_ ? call_->sender() : "";
}

void Pairing::begin() {
    if (outgoing_)
        device_.adapter().discovery().suspend();
    device_.link().hold();
    device_.link().connect([this](bool reached) {
        if (reached)
            negotiate();
        else
            fail(pageTimeout());
    });
}

guint Pairing::duration() const {
    const Times& times = device_.adapter().daemon().times();
    const auto peer = device_.peer();
    return times.scaled(peer && peer->pairingTime ? *peer->pairingTime : times.pairing);
}

guint32 Pairing::passkey() const {
    const auto peer = device_.peer();
    if (peer && peer->passkey)
        return *peer->passkey;
    return static_cast<guint32>(g_random_int_range(0, 1000000));
}

void Pairing::negotiate() {
    const Times& times = device_.adapter().daemon().times();
    const auto peer = device_.peer();
    if (!outgoing_ && !device_.adapter().mode().pairable())
        return fail(authentication("Rejected"));
    switch (peer->pairingEnd) {
    case PairingEnd::Rejected:
        return timer_.start(duration(), [this] { fail(authentication("Rejected")); });
    case PairingEnd::RepeatedAttempts:
        return timer_.start(
            duration(), [this] { fail(Errors::bluez("RepeatedAttempts", "Repeated Attempts")); });
    case PairingEnd::LinkLost:
        loss_.start(times.scaled(times.linkLoss), [this] {
            fail(Errors::bluez("ConnectionAttemptFailed", "Connection Timeout"));
        });
        break;
    default:
        break;
    }
    if (peer->legacy && peer->displaysPin && outgoing_)
        displayPin();
    else if (peer->legacy)
        askForPin();
    else
        askByCapabilities();
}

void Pairing::ask(const char* member, const Value& arguments, const char* results,
                  Agent::OnAnswer onAnswer) {
    const Times& times = device_.adapter().daemon().times();
    if (agent_->busy())
        return answered(false);
    timeout_.start(times.pairingTimeout, [this] { fail(authentication("Timeout")); });
    agent_->ask(member, arguments, results, times.agentTimeout,
                [this, onAnswer = std::move(onAnswer)](const Answer& answer) {
                    timeout_.stop();
                    if (!cancelled_)
                        onAnswer(answer);
                });
}

void Pairing::askForPin() {
    if (!agent_)
        return answered(false);
    ask("RequestPinCode", tuple(pathValue(device_.path())), "s", [this](const Answer& answer) {
        const char* pin = "";
        if (!answer.failed)
            g_variant_get(answer.results.get(), "(&s)", &pin);
        if (!usablePin(pin))
            return fail(authentication("Rejected"));
        const auto peer = device_.peer();
        answered(peer && !peer->pin.empty() && peer->pin == pin);
    });
}

void Pairing::displayPin() {
    const GlibPtr<char> pin(g_strdup_printf("%06u", passkey()));
    displaying_ = true;
    ask("DisplayPinCode", g_variant_new("(os)", device_.path().c_str(), pin.get()), "",
        [this](const Answer& answer) {
            displaying_ = !answer.failed;
            if (answer.failed)
                return askForPin(); // an agent that cannot show one is asked for one
            answered(true);
        });
}

void Pairing::askByCapabilities() {
    const Capability theirs = device_.peer()->capability;
    const Capability ours = agent_ ? agent_->capability() : Capability::NoInputNoOutput;
    if (theirs == Capability::NoInputNoOutput || ours == Capability::NoInputNoOutput)
        return answered(true);
    if (ours == Capability::KeyboardOnly)
        return enter(passkey(), theirs == Capability::KeyboardOnly);
    if (theirs == Capability::KeyboardOnly) {
        displaying_ = true;
        return display(passkey(), 0);
    }
    confirm(passkey());
}

void Pairing::confirm(guint32 passkey) {
    ask("RequestConfirmation", g_variant_new("(ou)", device_.path().c_str(), passkey), "",
        [this](const Answer& answer) {
            if (answer.failed)
                return fail(authentication("Failed"));
            answered(true);
        });
}

void Pairing::enter(guint32 passkey, bool typedOnBothSides) {
    ask("RequestPasskey", tuple(pathValue(device_.path())), "u",
        [this, passkey, typedOnBothSides](const Answer& answer) {
            if (answer.failed)
                return fail(authentication("Failed"));
            guint32 entered = 0;
            g_variant_get(answer.results.get(), "(u)", &entered);
            answered(entered == passkey || (typedOnBothSides && entered <= 999999));
        });
}

void Pairing::display(guint32 passkey, guint8 entered) {
    constexpr guint8 digits = 6;
    const Times& times = device_.adapter().daemon().times();
    agent_->show("DisplayPasskey",
                 g_variant_new("(ouy)", device_.path().c_str(), passkey, entered));
    if (entered == digits)
        return answered(true);
    timer_.start(times.scaled(times.keyPress),
                 [this, passkey, entered] { display(passkey, static_cast<guint8>(entered + 1)); });
}

void Pairing::answered(bool right) {
    const auto peer = device_.peer();
    const PairingEnd how = peer ? peer->pairingEnd : PairingEnd::LinkLost;
    switch (how) {
    case PairingEnd::LinkLost:
        return; // nothing more is heard until the loss is noticed
    case PairingEnd::NeverAnswers: {
        const Times& times = device_.adapter().daemon().times();
        return timer_.start(times.pairingTimeout, [this] { fail(authentication("Timeout")); });
    }
    case PairingEnd::Refused:
        return timer_.start(duration(), [this] { fail(authentication("Failed")); });
    case PairingEnd::CancelledByPeer:
        return timer_.start(duration(), [this] { fail(authentication("Canceled")); });
    default:
        break;
    }
    timer_.start(duration(), [this, right] {
        if (right)
            finish();
        else
            fail(authentication("Failed"));
    });
}

void Pairing::finish() {
    if (cancelled_)
        return;
    const Times& times = device_.adapter().daemon().times();
    done_ = true;
    loss_.stop();
    if (displaying_)
        agent_->cancel();
    device_.setTemporary(false);
    device_.stored().known = true;
    device_.setPaired(true);
    if (outgoing_)
        agent_->release();
    timer_.start(times.scaled(outgoing_ ? times.serviceSearch : times.reverseSearch),
                 [this] { succeed(); });
}

void Pairing::succeed() {
    Adapter& adapter = device_.adapter();
    const bool outgoing = outgoing_;
    device_.learnServices();
    if (call_)
        call_->reply(tuple(pathValue(device_.path())));
    device_.link().release();
    end();
    if (outgoing)
        adapter.discovery().resume();
}

void Pairing::stopTimers() {
    timer_.stop();
    timeout_.stop();
    loss_.stop();
}

void Pairing::end() {
    stopTimers();
    device_.pairingEnded();
}

void Pairing::fail(const BusError& error) {
    const auto device = device_.shared_from_this();
    const bool outgoing = outgoing_;
    if (agent_ && (agent_->busy() || displaying_))
        agent_->cancel();
    if (call_)
        call_->fail(error);
    if (outgoing && agent_)
        agent_->release();
    end();
    removeFailed(device, outgoing);
}

/// The link drops; a device that nothing was known of before goes with it.
void Pairing::removeFailed(const std::shared_ptr<Device>& device, bool outgoing) {
    device->link().drop();
    if (device->temporary())
        device->adapter().removeDevice(device);
    if (outgoing)
        device->adapter().discovery().resume();
}

void Pairing::cancel(const CallPtr& call) {
    device_.setTemporary(true);
    cancelled_ = true;
    stopTimers();
    if (device_.link().up())
        return device_.link().requestDisconnect(call);
    linkLost();
    call->reply();
}

void Pairing::linkLost() {
    if (done_ && !cancelled_)
        return succeed(); // paired already: only the services were still being read
    if (!cancelled_)
        return fail(pageTimeout());
    const auto device = device_.shared_from_this();
    const auto agent = agent_;
    const CallPtr creating = call_;
    const bool outgoing = outgoing_;
    if (agent && (agent->busy() || displaying_))
        agent->cancel();
    end();
    removeFailed(device, outgoing);
    if (agent && creating)
        agent->release();
    if (creating)
        creating->fail(pageTimeout());
}

void Pairing::powerLost() {
    fail(authentication("Canceled"));
}

void Pairing::ownerGone() {
    if (done_)
        return;
    device_.setTemporary(!device_.stored().known);
    cancelled_ = true;
    stopTimers();
    // Nobody is left to be told.
    agent_.reset();
    call_.reset();
    if (device_.link().up())
        device_.link().requestDisconnect(nullptr);
    else
        linkLost();
}

void Pairing::releaseAgent() {
    if (outgoing_ && agent_)
        agent_->release();
}

} // namespace Bluetooth::Sim
