#include "daemon/audio_device.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/agent.h"
#include "daemon/daemon.h"
#include "daemon/device.h"
#include "world/settings.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr const char* kHeadset = "1108";
constexpr const char* kAudioSource = "110a";
constexpr const char* kAudioSink = "110b";
constexpr const char* kRemoteTarget = "110c";
constexpr const char* kAdvancedAudio = "110d";
constexpr const char* kRemoteControl = "110e";
constexpr const char* kHeadsetGateway = "1112";
constexpr const char* kHandsFree = "111e";
constexpr const char* kHandsFreeGateway = "111f";

const Signal kPropertyChanged = {"PropertyChanged", {{"name", "s"}, {"value", "v"}}};

} // namespace

const Interface& AudioDevice::audioTable() {
    static const Interface table = {
        "org.bluez.Audio",
        {{"Connect", {}, {}, handle<&AudioDevice::connectAudio>},
         {"Disconnect", {}, {}, handle<&AudioDevice::disconnectAudio>},
         {"GetProperties", {}, {{"properties", "a{sv}"}}, handle<&AudioDevice::audioProperties>}},
        {kPropertyChanged}};
    return table;
}

const Interface& AudioDevice::sinkTable() {
    static const Interface table = {
        "org.bluez.AudioSink",
        {{"Connect", {}, {}, handle<&AudioDevice::connectSink>},
         {"Disconnect", {}, {}, handle<&AudioDevice::disconnectSink>},
         {"IsConnected", {}, {{"connected", "b"}}, handle<&AudioDevice::sinkIsConnected>, true},
         {"GetProperties", {}, {{"properties", "a{sv}"}}, handle<&AudioDevice::sinkProperties>}},
        {{"Connected", {}, true},
         {"Disconnected", {}, true},
         {"Playing", {}, true},
         {"Stopped", {}, true},
         kPropertyChanged}};
    return table;
}

const Interface& AudioDevice::controlTable() {
    static const Interface table = {
        "org.bluez.Control",
        {{"IsConnected", {}, {{"connected", "b"}}, handle<&AudioDevice::controlIsConnected>},
         {"GetProperties", {}, {{"properties", "a{sv}"}}, handle<&AudioDevice::controlProperties>},
         {"VolumeUp", {}, {}, handle<&AudioDevice::volume>},
         {"VolumeDown", {}, {}, handle<&AudioDevice::volume>}},
        {{"Connected", {}, true}, {"Disconnected", {}, true}, kPropertyChanged}};
    return table;
}

const char* AudioDevice::text(State state) {
    switch (state) {
    case State::Connecting:
        return "connecting";
    case State::Connected:
        return "connected";
    case State::Playing:
        return "playing";
    default:
        return "disconnected";
    }
}

bool AudioDevice::has(const char* uuid) const {
    const auto& uuids = device_.stored().uuids;
    return std::find(uuids.begin(), uuids.end(), fullUuid(uuid)) != uuids.end();
}

void AudioDevice::serve() {
    ObjectTree& objects = device_.adapter().daemon().objects();
    const bool sink = has(kAudioSink);
    const bool control = has(kRemoteTarget) || has(kRemoteControl);
    const bool audio = sink || control || has(kHeadset) || has(kHandsFree) || has(kAudioSource) ||
                       has(kHeadsetGateway) || has(kHandsFreeGateway);
    const auto add = [&](bool wanted, bool& served, const Interface& table) {
        if (wanted && !served)
            objects.add(device_.path(), table, this);
        served = served || wanted;
    };
    add(audio, audioServed_, audioTable());
    add(sink, sinkServed_, sinkTable());
    add(control, controlServed_, controlTable());
}

void AudioDevice::emit(const Interface& interface, const char* member, const Value& arguments) {
    device_.adapter().daemon().bus().emit(device_.path(), interface.name, member, arguments);
}

void AudioDevice::changed(const Interface& interface, const char* property, const Value& value) {
    emit(interface, "PropertyChanged", g_variant_new("(sv)", property, value.get()));
}

void AudioDevice::setSink(State state) {
    if (!sinkServed_ || sink_ == state)
        return;
    sink_ = state;
    changed(sinkTable(), "State", g_variant_new_string(text(state)));
}

void AudioDevice::setAudio(State state) {
    if (audio_ == state)
        return;
    audio_ = state;
    // Audio answers before it says so, AudioSink after.
    if (state != State::Connecting && audioCall_) {
        if (state == State::Connected)
            audioCall_->reply();
        else
            audioCall_->fail(Errors::failed("Connect Failed"));
        audioCall_.reset();
    }
    changed(audioTable(), "State", g_variant_new_string(text(state)));
}

void AudioDevice::setControl(bool connected) {
    controlSetUp_.stop();
    if (!controlServed_ || control_ == connected)
        return;
    control_ = connected;
    emit(controlTable(), connected ? "Connected" : "Disconnected");
    changed(controlTable(), "Connected", boolValue(connected));
}

void AudioDevice::connectAudio(const CallPtr& call) {
    if (audio_ == State::Connecting)
        return call->fail(Errors::inProgress());
    if (audio_ == State::Connected)
        return call->fail(Errors::alreadyConnected());
    if (!sinkServed_ && !has(kHeadset) && !has(kHandsFree))
        return call->fail(Errors::failed("Connect Failed"));
    audioCall_ = call;
    beginConnecting();
}

void AudioDevice::connectSink(const CallPtr& call) {
    if (sink_ == State::Connecting)
        return call->fail(Errors::inProgress());
    if (sink_ != State::Disconnected)
        return call->fail(Errors::alreadyConnected());
    sinkCall_ = call;
    beginConnecting();
}

void AudioDevice::beginConnecting() {
    setSink(State::Connecting);
    setAudio(State::Connecting);
    holdsLink_ = true;
    device_.link().hold();
    if (!device_.adapter().mode().powered())
        return failed();
    device_.link().connect([this](bool reached) {
        if (reached)
            linkReached();
        else
            failed();
    });
}

void AudioDevice::linkReached() {
    const auto peer = device_.peer();
    if (peer && peer->connectsBack)
        authorize(fullUuid(kAdvancedAudio));
    else
        setUpStream();
}

void AudioDevice::serviceConnects(const std::string& uuid) {
    if (sink_ != State::Disconnected || audio_ != State::Disconnected)
        return;
    if (!device_.link().up())
        device_.comeIn(false);
    holdsLink_ = true;
    device_.link().hold();
    setSink(State::Connecting);
    setAudio(State::Connecting);
    authorize(uuid);
}

void AudioDevice::authorize(const std::string& uuid) {
    Agent* agent = device_.adapter().agent();
    // With nobody to ask, a channel that we opened as well is taken as wanted.
    const bool wanted = sinkCall_ || audioCall_;
    if (device_.stored().trusted || (!agent && wanted))
        return setUpStream();
    if (!agent || agent->busy())
        return failed();
    const auto& times = device_.adapter().daemon().times();
    const auto device = device_.weak_from_this();
    agent->ask("Authorize", g_variant_new("(os)", device_.path().c_str(), uuid.c_str()), "",
               times.agentTimeout, [this, device](const Answer& answer) {
                   const auto alive = device.lock();
                   if (!alive || sink_ == State::Connected ||
                       (audio_ != State::Connecting && sink_ != State::Connecting))
                       return;
                   if (answer.failed)
                       failed();
                   else
                       setUpStream();
               });
}

void AudioDevice::setUpStream() {
    const Times& times = device_.adapter().daemon().times();
    setUp_.start(times.scaled(times.audioConnect), [this] { connected(); });
}

void AudioDevice::connected() {
    const Times& times = device_.adapter().daemon().times();
    if (sinkServed_) {
        emit(sinkTable(), "Connected");
        changed(sinkTable(), "Connected", boolValue(true));
        setSink(State::Connected);
    }
    setAudio(State::Connected);
    if (sinkCall_)
        sinkCall_->reply();
    sinkCall_.reset();
    if (controlServed_)
        controlSetUp_.start(times.scaled(times.controlConnect), [this] { setControl(true); });
}

void AudioDevice::failed() {
    setUp_.stop();
    if (sinkCall_)
        sinkCall_->fail(Errors::failed("Stream setup failed"));
    sinkCall_.reset();
    setSink(State::Disconnected);
    setAudio(State::Disconnected);
    if (holdsLink_)
        device_.link().release();
    holdsLink_ = false;
}

void AudioDevice::disconnected() {
    setPlaying(false);
    setControl(false);
    if (sink_ == State::Connected) {
        emit(sinkTable(), "Disconnected");
        changed(sinkTable(), "Connected", boolValue(false));
    }
    failed();
}

void AudioDevice::disconnectAudio(const CallPtr& call) {
    if (audio_ == State::Disconnected)
        return call->fail(Errors::notConnected());
    disconnected();
    call->reply();
}

void AudioDevice::disconnectSink(const CallPtr& call) {
    if (sink_ == State::Disconnected)
        return call->fail(Errors::notConnected());
    if (sink_ == State::Connecting)
        return call->fail(Errors::inProgress());
    disconnected();
    call->reply();
}

void AudioDevice::setPlaying(bool playing) {
    if (sink_ != (playing ? State::Connected : State::Playing))
        return;
    emit(sinkTable(), playing ? "Playing" : "Stopped");
    changed(sinkTable(), "Playing", boolValue(playing));
    setSink(playing ? State::Playing : State::Connected);
}

void AudioDevice::linkLost() {
    holdsLink_ = false;
    if (audio_ != State::Disconnected || sink_ != State::Disconnected)
        disconnected();
}

void AudioDevice::abandon() {
    setUp_.stop();
    controlSetUp_.stop();
    audioCall_.reset();
    sinkCall_.reset();
}

void AudioDevice::audioProperties(const CallPtr& call) {
    call->reply(tuple(Dict().add("State", g_variant_new_string(text(audio_))).end()));
}

void AudioDevice::sinkIsConnected(const CallPtr& call) {
    call->reply(tuple(boolValue(sink_ == State::Connected || sink_ == State::Playing)));
}

void AudioDevice::sinkProperties(const CallPtr& call) {
    const bool connected = sink_ == State::Connected || sink_ == State::Playing;
    call->reply(tuple(Dict()
                          .add("State", g_variant_new_string(text(sink_)))
                          .add("Connected", boolValue(connected))
                          .add("Playing", boolValue(sink_ == State::Playing))
                          .end()));
}

void AudioDevice::controlIsConnected(const CallPtr& call) {
    call->reply(tuple(boolValue(control_)));
}

void AudioDevice::controlProperties(const CallPtr& call) {
    call->reply(tuple(Dict().add("Connected", boolValue(control_)).end()));
}

void AudioDevice::volume(const CallPtr& call) {
    if (!control_)
        return call->fail(Errors::notConnected());
    call->reply();
}

} // namespace Bluetooth::Sim
