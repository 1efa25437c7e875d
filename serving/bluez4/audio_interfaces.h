// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_AUDIO_INTERFACES_H
#define KESBLUETOOTH_SERVING_BLUEZ4_AUDIO_INTERFACES_H

#include "serving/bluez4/interfaces.h"

// The audio interfaces of BlueZ 4.101, as in interfaces.h.

namespace Bluetooth::Serving {

namespace Interfaces {

inline constexpr const char* audio = "org.bluez.Audio";
inline constexpr const char* audioSink = "org.bluez.AudioSink";
inline constexpr const char* audioSource = "org.bluez.AudioSource";
inline constexpr const char* control = "org.bluez.Control";
inline constexpr const char* handsfreeGateway = "org.bluez.HandsfreeGateway";
inline constexpr const char* headset = "org.bluez.Headset";
inline constexpr const char* media = "org.bluez.Media";
inline constexpr const char* mediaTransport = "org.bluez.MediaTransport";
inline constexpr const char* telephonyTest = "org.bluez.TelephonyTest";
// What clients serve.
inline constexpr const char* handsfreeAgent = "org.bluez.HandsfreeAgent";
inline constexpr const char* mediaEndpoint = "org.bluez.MediaEndpoint";
inline constexpr const char* mediaPlayer = "org.bluez.MediaPlayer";

} // namespace Interfaces

template <class Served>
const Interface& audioInterface() {
    static const Interface table = {Interfaces::audio,
                                    {{"Connect", {}, {}, handle<&Served::connect>},
                                     {"Disconnect", {}, {}, handle<&Served::disconnect>},
                                     Entries::getProperties<&Served::getProperties>()},
                                    {Entries::propertyChanged()}};
    return table;
}

template <class Served>
const Interface& audioSinkInterface() {
    static const Interface table = {
        Interfaces::audioSink,
        {{"Connect", {}, {}, handle<&Served::connect>},
         {"Disconnect", {}, {}, handle<&Served::disconnect>},
         {"IsConnected", {}, {{"connected", "b"}}, handle<&Served::isConnected>, true},
         Entries::getProperties<&Served::getProperties>()},
        {{"Connected", {}, true},
         {"Disconnected", {}, true},
         {"Playing", {}, true},
         {"Stopped", {}, true},
         Entries::propertyChanged()}};
    return table;
}

template <class Served>
const Interface& audioSourceInterface() {
    static const Interface table = {Interfaces::audioSource,
                                    {{"Connect", {}, {}, handle<&Served::connect>},
                                     {"Disconnect", {}, {}, handle<&Served::disconnect>},
                                     Entries::getProperties<&Served::getProperties>()},
                                    {Entries::propertyChanged()}};
    return table;
}

template <class Served>
const Interface& remoteControlInterface() {
    static const Interface table = {
        Interfaces::control,
        {{"IsConnected", {}, {{"connected", "b"}}, handle<&Served::isConnected>},
         Entries::getProperties<&Served::getProperties>(),
         {"VolumeUp", {}, {}, handle<&Served::changeVolume>},
         {"VolumeDown", {}, {}, handle<&Served::changeVolume>}},
        {{"Connected", {}, true}, {"Disconnected", {}, true}, Entries::propertyChanged()}};
    return table;
}

template <class Served>
const Interface& headsetInterface() {
    static const Arguments gain = {{"gain", "q"}};
    static const Interface table = {
        Interfaces::headset,
        {{"Connect", {}, {}, handle<&Served::connect>},
         {"Disconnect", {}, {}, handle<&Served::disconnect>},
         {"IsConnected", {}, {{"connected", "b"}}, handle<&Served::isConnected>},
         {"IndicateCall", {}, {}, handle<&Served::indicateCall>},
         {"CancelCall", {}, {}, handle<&Served::indicateCall>},
         {"Play", {}, {}, handle<&Served::play>, true},
         {"Stop", {}, {}, handle<&Served::stop>},
         {"IsPlaying", {}, {{"playing", "b"}}, handle<&Served::isPlaying>, true},
         {"GetSpeakerGain", {}, gain, handle<&Served::getSpeakerGain>, true},
         {"GetMicrophoneGain", {}, gain, handle<&Served::getMicrophoneGain>, true},
         {"SetSpeakerGain", gain, {}, handle<&Served::setSpeakerGain>, true},
         {"SetMicrophoneGain", gain, {}, handle<&Served::setMicrophoneGain>, true},
         Entries::getProperties<&Served::getProperties>(),
         Entries::setProperty<&Served::setProperty>()},
        {{"Connected", {}, true},
         {"Disconnected", {}, true},
         {"AnswerRequested", {}, true},
         {"Stopped", {}, true},
         {"Playing", {}, true},
         {"SpeakerGainChanged", gain, true},
         {"MicrophoneGainChanged", gain, true},
         {"CallTerminated", {}},
         Entries::propertyChanged()}};
    return table;
}

template <class Served>
const Interface& handsfreeGatewayInterface() {
    static const Interface table = {
        Interfaces::handsfreeGateway,
        {{"Connect", {}, {}, handle<&Served::connect>},
         {"Disconnect", {}, {}, handle<&Served::disconnect>},
         Entries::getProperties<&Served::getProperties>(),
         {"RegisterAgent", {{"agent", "o"}}, {}, handle<&Served::registerAgent>},
         {"UnregisterAgent", {{"agent", "o"}}, {}, handle<&Served::unregisterAgent>}},
        {Entries::propertyChanged()}};
    return table;
}

template <class Served>
const Interface& mediaInterface() {
    static const Interface table = {
        Interfaces::media,
        {{"RegisterEndpoint",
          {{"endpoint", "o"}, {"properties", "a{sv}"}},
          {},
          handle<&Served::registerEndpoint>},
         {"UnregisterEndpoint", {{"endpoint", "o"}}, {}, handle<&Served::unregisterEndpoint>},
         {"RegisterPlayer",
          {{"player", "o"}, {"properties", "a{sv}"}, {"metadata", "a{sv}"}},
          {},
          handle<&Served::registerPlayer>},
         {"UnregisterPlayer", {{"player", "o"}}, {}, handle<&Served::unregisterPlayer>}},
        {}};
    return table;
}

template <class Served>
const Interface& mediaTransportInterface() {
    static const Interface table = {
        Interfaces::mediaTransport,
        {Entries::getProperties<&Served::getProperties>(),
         {"Acquire",
          {{"access_type", "s"}},
          {{"fd", "h"}, {"mtu_r", "q"}, {"mtu_w", "q"}},
          handle<&Served::acquire>},
         {"Release", {{"access_type", "s"}}, {}, handle<&Served::release>},
         Entries::setProperty<&Served::setProperty>()},
        {Entries::propertyChanged()}};
    return table;
}

/// The telephone system that a daemon has which was built for none.
template <class Served>
const Interface& telephonyTestInterface() {
    static const Arguments number = {{"number", "s"}};
    static const Interface table = {
        Interfaces::telephonyTest,
        {{"OutgoingCall", number, {}, handle<&Served::accept>},
         {"IncomingCall", number, {}, handle<&Served::accept>},
         {"CancelCall", {}, {}, handle<&Served::accept>},
         {"SignalStrength", {{"strength", "u"}}, {}, handle<&Served::setLevel>},
         {"BatteryLevel", {{"level", "u"}}, {}, handle<&Served::setLevel>},
         {"RoamingStatus", {{"roaming", "b"}}, {}, handle<&Served::accept>},
         {"RegistrationStatus", {{"registration", "b"}}, {}, handle<&Served::accept>},
         {"SetSubscriberNumber", number, {}, handle<&Served::accept>}},
        {{"VoiceDial", {}}}};
    return table;
}

} // namespace Bluetooth::Serving

#endif
