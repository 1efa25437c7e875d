// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

#include <poll.h>
#include <unistd.h>

#include <cstdint>
#include <ostream>

namespace Bluetooth::Test {

namespace {

constexpr const char* sink = "110b;110c;110e";
constexpr const char* voice = "1108;111e";
constexpr const char* both = "1108;111e;110b;110c;110e";

// Control methods whose effect is traced.
const Question connectStream("com.kestrine.bluetooth.Sim.ConnectService", "hci0", newDevice,
                             "110d");
const Question closeStream("com.kestrine.bluetooth.Sim.DisconnectService", "hci0", newDevice,
                           "110d");
const Question closeHeadset("com.kestrine.bluetooth.Sim.DisconnectService", "hci0", newDevice,
                            "111e");
const Question play("com.kestrine.bluetooth.Sim.SetPlaying", "hci0", newDevice, true);
const Question stopPlaying("com.kestrine.bluetooth.Sim.SetPlaying", "hci0", newDevice, false);
const Question dropLink("com.kestrine.bluetooth.Sim.DropLink", "hci0", newDevice);
const Question goAway("com.kestrine.bluetooth.Sim.SetDevice", newDevice,
                      Settings{{"Connectable", "false"}});

const std::string linkUp = "device Connected=1, ";
const std::string linkDown = ", device Connected=0";
const std::string controlUp = "Control.Connected, Control Connected=1";
const std::string controlDown = "Control.Disconnected, Control Connected=0";
const std::string sinkBegins = "Sink connecting, Audio connecting, ";
const std::string sinkUp = "Sink.Connected, Sink Connected=1, Sink connected";
const std::string sinkDown = "Sink.Disconnected, Sink Connected=0, Sink disconnected";
const std::string voiceBegins = "Headset connecting, Audio connecting, ";
const std::string voiceUp = "Headset connected, Headset.Connected, Headset Connected=1";
const std::string voiceDown = "Headset disconnected, Headset.Disconnected, Headset Connected=0";
const std::string connectFailed = "answer Connect error Failed: Connect Failed, Audio disconnected";
const std::string setupFailed = "answer Connect error Failed: Stream setup failed";
const std::string asked = "agent Authorize device 0000110d-0000-1000-8000-00805f9b34fb, ";

/// What an audio device brings about, from a question on.
struct Row {
    const char* name;
    const char* uuids;
    std::vector<Question> before;
    Question question;
    const char* last; ///< the line up to which it is heard
    std::string heard;
    const char* behaviour = "";
};

// NOLINTNEXTLINE(readability-identifier-naming): named by GoogleTest
void PrintTo(const Row& row, std::ostream* out) {
    *out << row.name;
}

const std::vector<Row> rows{
    {"AllOfASink",
     sink,
     {},
     "Audio.Connect",
     "Audio State=s:connected",
     sinkBegins + linkUp + controlUp + ", " + sinkUp + ", answer Connect, Audio connected"},
    {"TheSink",
     sink,
     {},
     "AudioSink.Connect",
     "Audio State=s:connected",
     sinkBegins + linkUp + controlUp + ", answer Connect, " + sinkUp + ", Audio connected"},
    {"AllOfAHeadset",
     voice,
     {},
     "Audio.Connect",
     "Audio State=s:connected",
     voiceBegins + linkUp + voiceUp + ", answer Connect, Audio connected"},
    {"TheHeadset",
     voice,
     {},
     "Headset.Connect",
     "answer",
     voiceBegins + linkUp + voiceUp + ", Audio connected, answer Connect"},
    {"AllOfBoth",
     both,
     {},
     "Audio.Connect",
     "Audio State=s:connected",
     voiceBegins + linkUp + voiceUp + ", Sink connecting, " + controlUp + ", " + sinkUp +
         ", answer Connect, Audio connected"},
    {"TheHeadsetBesideTheSink",
     both,
     {"AudioSink.Connect"},
     "Headset.Connect",
     "answer",
     "Headset connecting, " + voiceUp + ", answer Connect"},
    {"TheSinkBesideTheHeadset",
     both,
     {"Headset.Connect"},
     "AudioSink.Connect",
     "Sink State=s:connected",
     "Sink connecting, " + controlUp + ", answer Connect, " + sinkUp},
    {"TheDeviceConnects",
     sink,
     {{"Adapter.RegisterAgent", Path{"/agent"}, ""}},
     connectStream,
     "Control Connected",
     linkUp + sinkBegins + asked + sinkUp + ", Audio connected, " + controlUp},
    {"TheDeviceConnectsAndMayNot",
     sink,
     {},
     connectStream,
     "device Connected=b:0",
     linkUp + sinkBegins + "Sink disconnected, Audio disconnected" + linkDown},
    {"Playing",
     sink,
     {"Audio.Connect"},
     play,
     "Sink State",
     "Sink.Playing, Sink Playing=1, Sink playing"},
    {"Stopping",
     sink,
     {"Audio.Connect", play},
     stopPlaying,
     "Sink State",
     "Sink.Stopped, Sink Playing=0, Sink connected"},
    {"AllOfASinkEnds",
     sink,
     {"Audio.Connect", play},
     "Audio.Disconnect",
     "device Connected",
     controlDown + ", answer Disconnect, " + sinkDown + ", Audio disconnected" + linkDown},
    {"AllOfBothEnds",
     both,
     {"Audio.Connect"},
     "Audio.Disconnect",
     "device Connected",
     controlDown + ", answer Disconnect, " + sinkDown + ", " + voiceDown + ", Audio disconnected" +
         linkDown},
    {"AllOfAHeadsetEnds",
     voice,
     {"Audio.Connect"},
     "Audio.Disconnect",
     "device Connected",
     voiceDown + ", answer Disconnect, Audio disconnected" + linkDown},
    {"TheHeadsetEnds",
     voice,
     {"Audio.Connect"},
     "Headset.Disconnect",
     "device Connected",
     voiceDown + ", Audio disconnected, answer Disconnect" + linkDown},
    {"TheSinkEnds",
     sink,
     {"Audio.Connect"},
     "AudioSink.Disconnect",
     "device Connected",
     "answer Disconnect, " + sinkDown + ", " + controlDown + ", Audio disconnected" + linkDown},
    {"TheSinkEndsBesideTheHeadset",
     both,
     {"Audio.Connect"},
     "AudioSink.Disconnect",
     "Control Connected",
     "answer Disconnect, " + sinkDown + ", " + controlDown},
    {"TheDeviceClosesItsStream",
     sink,
     {"Audio.Connect"},
     closeStream,
     "device Connected",
     sinkDown + ", " + controlDown + ", Audio disconnected" + linkDown},
    {"TheDeviceClosesTheHeadset",
     voice,
     {"Audio.Connect"},
     closeHeadset,
     "device Connected",
     voiceDown + ", Audio disconnected" + linkDown},
    {"TheDeviceIsDisconnected",
     sink,
     {"Audio.Connect"},
     "Device.Disconnect",
     "device Connected",
     controlDown + ", device DisconnectRequested, " + sinkDown +
         ", Audio disconnected, answer Disconnect" + linkDown},
    {"TheLinkIsLost",
     both,
     {"Audio.Connect"},
     dropLink,
     "Audio State",
     "device Connected=0, " + controlDown + ", " + sinkDown + ", " + voiceDown +
         ", Audio disconnected"},
    {"ThePowerGoes",
     sink,
     {"Audio.Connect"},
     {"Adapter.SetProperty", "Powered", Var{false}},
     "Audio State",
     "device Connected=0, hci0 Pairable=0, hci0 Powered=0, answer SetProperty, " + controlDown +
         ", " + sinkDown + ", Audio disconnected"},
    {"NoEndpointForAll",
     sink,
     {},
     "Audio.Connect",
     "Audio State=s:disconnected",
     sinkBegins + linkUp + controlUp + ", Sink disconnected, " + controlDown + ", " + connectFailed,
     "NoEndpoint"},
    {"NoEndpointForTheSink",
     sink,
     {},
     "AudioSink.Connect",
     "answer",
     sinkBegins + linkUp + controlUp + ", Sink disconnected, " + controlDown +
         ", Audio disconnected, " + setupFailed,
     "NoEndpoint"},
    {"NobodyForAll",
     sink,
     {goAway},
     "Audio.Connect",
     "Sink Connected",
     sinkBegins + "Sink disconnected, " + connectFailed + ", " + sinkDown},
    {"NobodyForTheSink",
     sink,
     {goAway},
     "AudioSink.Connect",
     "answer",
     sinkBegins + "Sink disconnected, Audio disconnected, " + sinkDown + ", " + setupFailed},
    {"NobodyForTheHeadset",
     both,
     {goAway},
     "Audio.Connect",
     "Audio State=s:disconnected",
     voiceBegins + "Headset disconnected, Headset.Disconnected, " + connectFailed},
    {"Hanging",
     sink,
     {},
     "Audio.Connect",
     "Sink Connected",
     sinkBegins + linkUp + "Sink disconnected, " + connectFailed + ", " + sinkDown,
     "AudioHangs"},
};

} // namespace

class AudioTest : public SimTest {
protected:
    void createAudio(const char* uuids, const char* behaviour = "") {
        create({{"UUIDs", uuids}, {"Behaviour", behaviour}});
        control({"DropLink", "hci0", newDevice});
    }
    /// All that a question brings about, up to a line that begins so: in one line, without types.
    std::string heard(const Question& question, const std::string& last) {
        const bool ofControl = question.method.rfind("com.", 0) == 0;
        Texts all = trace(question, last);
        control({"ClearFaults"});
        const Texts rest = taken();
        all.insert(all.end(), rest.begin(), rest.end());
        std::string text;
        for (const std::string& line : all)
            if (!ofControl || line.rfind("answer", 0) != 0)
                text += (text.empty() ? "" : ", ") + line;
        return std::regex_replace(text, std::regex("State=s:|\\b[a-z]:"), "");
    }
};

class AudioSequence : public AudioTest, public testing::WithParamInterface<Row> {};

TEST_P(AudioSequence, IsThatOfTheDaemon) {
    const Row& row = GetParam();
    createAudio(row.uuids, row.behaviour);
    if (std::string(row.last).rfind("device", 0) != 0)
        setTime("AudioIdle", "60000"); // the link is not what the row is about
    for (const Question& question : row.before)
        EXPECT_EQ(call(question), "") << question.method;
    control({"ClearFaults"});
    EXPECT_EQ(heard(row.question, row.last), row.heard);
}

INSTANTIATE_TEST_SUITE_P(Of, AudioSequence, testing::ValuesIn(rows),
                         [](const auto& row) { return row.param.name; });

TEST_F(AudioTest, WhatIsUnderWayAllowsLittle) {
    const std::string busy = "error InProgress: Operation already in progress";
    const std::string inProgress = "error InProgress: In Progress";
    createAudio("1108;110b;110e");
    setTime("AudioConnect", "60000000");
    setTime("AudioIdle", "60000000");
    start("Audio.Connect");
    until("device Connected=b:1");
    EXPECT_EQ(call("Audio.Connect"), inProgress);
    EXPECT_EQ(call("Headset.Connect"), inProgress);
    EXPECT_EQ(heard("Audio.Disconnect", "Audio State"),
              "Headset disconnected, Headset.Disconnected, answer Disconnect, " + connectFailed);
    start("AudioSink.Connect");
    until("Control Connected=b:1");
    EXPECT_EQ(call("AudioSink.Connect"), busy);
    EXPECT_EQ(call("AudioSink.Disconnect"), busy);
    EXPECT_EQ(heard("Audio.Disconnect", "Audio State"),
              controlDown + ", " + setupFailed +
                  ", Sink disconnected, answer Disconnect, Audio disconnected");

    setTime("AudioConnect", "700");
    EXPECT_EQ(call("Audio.Connect"), "");
    setTime("AudioShutdown", "60000");
    start("Audio.Disconnect");
    EXPECT_EQ(call("Audio.Disconnect"), "");
    EXPECT_EQ(call("AudioSink.Disconnect"), "error Failed: Invalid argument");
}

TEST_F(AudioTest, ASinkThatIsConnectedInThePauseLeavesAllOfItWaiting) {
    createAudio(both);
    setTime("AudioPause", "60000000");
    start("Audio.Connect");
    until("Headset Connected=b:1");
    EXPECT_EQ(call("AudioSink.Connect"), "");
    EXPECT_EQ(call("Audio.GetProperties"), "a(e(s:State v(s:connecting)))");
    start("Audio.Disconnect");
    until("answer Connect error Failed: Connect Failed");
}

TEST_F(AudioTest, AHeadsetIsHeardAndHeardOf) {
    control({"SetAudio", Settings{{"SCORouting", "PCM"}}});
    createAudio(voice);
    EXPECT_EQ(call("Headset.Connect"), "");
    EXPECT_EQ(heard("Headset.Play", "Headset Playing"),
              "answer Play, Headset playing, Headset.Playing, Headset Playing=1");
    EXPECT_EQ(heard("Headset.Stop", "answer"),
              "Headset connected, Headset.Stopped, Headset Playing=0, answer Stop");
    EXPECT_EQ(heard({"Headset.SetProperty", "SpeakerGain", Var{std::uint16_t{7}}}, "answer"),
              "Headset.SpeakerGainChanged 7, Headset SpeakerGain=7, answer SetProperty");
    control({"SetHeadsetGain", "hci0", newDevice, "MicrophoneGain", std::uint16_t{9}});
    control({"PressHeadsetButton", "hci0", newDevice});
    EXPECT_EQ(taken(), lines("Headset.MicrophoneGainChanged q:9", "Headset MicrophoneGain=q:9",
                             "Headset.AnswerRequested"));
}

TEST_F(AudioTest, APhoneIsASourceAndAGateway) {
    control({"SetAudio", Settings{{"Enable", "Source;Gateway"}}});
    createAudio("110a;111f");
    EXPECT_EQ(heard("AudioSource.Connect", "Source State=s:connected"),
              "Source connecting, device Connected=1, answer Connect, Source connected");
    control({"SetPlaying", "hci0", newDevice, true});
    EXPECT_EQ(call("AudioSource.GetProperties"), "a(e(s:State v(s:playing)))");
    EXPECT_EQ(heard("AudioSource.Disconnect", "Source State"),
              "answer Disconnect, Source disconnected");

    EXPECT_EQ(call({"HandsfreeGateway.RegisterAgent", Path{"/agent"}}), "");
    EXPECT_EQ(SimClient().call({"HandsfreeGateway.UnregisterAgent", Path{"/agent"}}),
              "error NotAuthorized: Operation Not Authorized");
    std::string received;
    peer().handle("NewConnection", [&](DBusMessage* request) {
        int descriptor = -1;
        dbus_uint16_t version = 0;
        if (dbus_message_get_args(request, nullptr, DBUS_TYPE_UNIX_FD, &descriptor,
                                  DBUS_TYPE_UINT16, &version, DBUS_TYPE_INVALID))
            received = ::write(descriptor, "AT\r", 3) == 3 ? std::to_string(version) : "closed";
        close(descriptor);
        return MessagePtr(dbus_message_new_method_return(request));
    });
    EXPECT_EQ(call("HandsfreeGateway.Connect"), "");
    until("Gateway State=s:connected");
    EXPECT_EQ(received, "261"); // 1.5
    EXPECT_EQ(heard("HandsfreeGateway.Disconnect", "answer"),
              "Gateway disconnected, answer Disconnect");
    EXPECT_EQ(call({"Adapter.RemoveDevice", device}), "");
    until("agent Release");
}

TEST_F(AudioTest, AnEndpointConfiguresTheStreamAndItsTransportPlays) {
    const Path endpoint{"/endpoint"};
    const auto registering = [&](const char* uuid, std::uint8_t codec) {
        return Question("Media.RegisterEndpoint", endpoint, Writer::Build([=](Writer& w) {
                            w.dict("sv", [&](Writer& entries) {
                                entries.entry("UUID", Var{uuid}).entry("Codec", Var{codec});
                            });
                        }));
    };
    const char* ours = "0000110A-0000-1000-8000-00805F9B34FB";
    EXPECT_EQ(call(registering("1101", 0)), badArguments) << "that is no sound";
    EXPECT_EQ(call(registering("110b", 0)), "error NotSupported: Operation is not supported");
    EXPECT_EQ(call(registering(ours, 0)), "");
    EXPECT_EQ(call(registering(ours, 0)), "error AlreadyExists: Already Exists");
    const auto configuration = [](Writer& w) {
        w.array("y", [](Writer& bytes) { bytes(std::uint8_t{0x21})(std::uint8_t{0x15}); });
    };
    createAudio(sink);
    setTime("AudioIdle", "60000");
    EXPECT_EQ(call("AudioSink.Connect"), "error Failed: Stream setup failed") << "it selects none";
    peer().reply("SelectConfiguration", configuration);
    peer().reply("SetConfiguration");
    peer().reply("ClearConfiguration");
    const std::string transport = "e(s:Device v(o:device)) e(s:UUID v(s:" + std::string(ours) +
                                  ")) e(s:Codec v(y:0)) e(s:Configuration v(a(y:33 y:21))) "
                                  "e(s:Delay v(q:0))";
    EXPECT_EQ(trace("AudioSink.Connect", "agent SetConfiguration").back(),
              "agent SetConfiguration o:device/fd0 a(" + transport + ")");
    until("Audio State=s:connected");
    EXPECT_EQ(call("MediaTransport.GetProperties"), "a(" + transport + ")");

    const Question acquire("MediaTransport.Acquire", "w");
    int descriptor = -1;
    dbus_uint16_t readMtu = 1;
    const MessagePtr reply = peer()
                                 .call("org.bluez", device.text + "/fd0",
                                       "org.bluez.MediaTransport", "Acquire", with("w"))
                                 .get();
    ASSERT_TRUE(dbus_message_get_args(reply.get(), nullptr, DBUS_TYPE_UNIX_FD, &descriptor,
                                      DBUS_TYPE_UINT16, &readMtu, DBUS_TYPE_INVALID));
    EXPECT_EQ(readMtu, 0); // it is for writing
    for (int packet = 0; packet < 1000; ++packet) {
        pollfd room{descriptor, POLLOUT, 0};
        ASSERT_EQ(poll(&room, 1, 5000), 1) << "nobody takes the sound";
        ASSERT_EQ(::write(descriptor, "sound", 5), 5);
    }
    close(descriptor);
    until("Sink State=s:playing");
    EXPECT_EQ(call(acquire), "error NotAuthorized: Operation Not Authorized");
    EXPECT_EQ(call({"MediaTransport.SetProperty", "Volume", Var{std::uint16_t{128}}}),
              badArguments);
    EXPECT_EQ(call({"MediaTransport.SetProperty", "Volume", Var{std::uint16_t{99}}}), "");
    control({"ClearFaults"});
    EXPECT_EQ(heard({"MediaTransport.Release", "w"}, "answer"),
              "Sink.Stopped, Sink Playing=0, Sink connected, answer Release");
    call("Audio.Disconnect");
    until("agent ClearConfiguration o:device/fd0");
    control({"RemoveAdapter", "hci0"});
    until("agent Release");
}

} // namespace Bluetooth::Test
