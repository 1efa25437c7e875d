// SPDX-License-Identifier: LGPL-2.1-or-later
// The pairing agent: what it answers to each request, and how.

#include "support/peer_test.h"

#include <bluetooth/adapter.h>
#include <bluetooth/agent.h>
#include <bluetooth/device.h>

#include <functional>
#include <memory>
#include <ostream>
#include <thread>
#include <unistd.h>

namespace Bluetooth::Test {

namespace {

using Handler = DBusHandlerResult (*)(DBusConnection*, DBusMessage*, void*);
constexpr auto handled = DBUS_HANDLER_RESULT_HANDLED;
constexpr auto notYetHandled = DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
constexpr auto needMemory = DBUS_HANDLER_RESULT_NEED_MEMORY;

constexpr const char* noHandler =
    "agent.cpp Registered agent does not provide a handler for the incoming message.";
constexpr const char* notRegistered = "agent.cpp Failed to register agent path to dbus.";
constexpr const char* notUnregistered = "agent.cpp Failed to unregister agent path from dbus.";

const Writer::Build device = with(Path{devicePath});

MessagePtr request(const char* member, const Writer::Build& arguments,
                   const char* interface = "org.bluez.Agent") {
    MessagePtr message(dbus_message_new_method_call(nullptr, "/agent", interface, member));
    Writer(message.get(), arguments);
    return message;
}

/// Does something. @return whether it took a second or more
template <class Action>
bool takesASecond(const Action& action) {
    const auto begin = std::chrono::steady_clock::now();
    action();
    return std::chrono::steady_clock::now() - begin >= std::chrono::seconds(1);
}

} // namespace

TEST(AgentValuesTest, HaveDefaultsAndBadOnesAreRefused) {
    SyslogCapture log;
    Agent agent;
    EXPECT_STREQ(agent.getPath(), "");
    EXPECT_STREQ(agent.getInterface(), "org.bluez.Agent");
    EXPECT_STREQ(agent.getCapability(), "DisplayYesNo");
    EXPECT_FALSE(agent.getReject());
    EXPECT_STREQ(agent.getPasskeyValue(), "5820");
    EXPECT_EQ(agent.getPasskeyDelay(), 0);
    EXPECT_EQ(agent.setPasskeyValue(std::string("0000").c_str()), 0); // it is copied
    EXPECT_EQ(agent.setPasskeyValue(nullptr), -1);
    EXPECT_STREQ(agent.getPasskeyValue(), "0000");
    EXPECT_EQ(agent.setPasskeyDelay(-1), -1);
    EXPECT_EQ(agent.getPasskeyDelay(), 0);
    EXPECT_EQ(log.take(), (Texts{"agent.cpp Failed to set null passkey value.",
                                 "agent.cpp Failed to set negitive passkey delay."}));
    const char capability[] = "KeyboardDisplay";
    EXPECT_EQ(agent.setCapability(capability), 0);
    EXPECT_EQ(agent.setCapability(nullptr), -1);
    EXPECT_EQ(agent.getCapability(), capability); // the pointer itself
    EXPECT_EQ(agent.setDispatcher(nullptr), -1);
    EXPECT_EQ(log.take(), Texts{});
}

/// A system bus whose daemon asks the agent something while it pairs.
class AgentTest : public DaemonTest {
protected:
    void SetUp() override {
        daemon.handle("CreatePairedDevice", [this](DBusMessage* call) {
            pairing.reset(dbus_message_ref(call));
            return MessagePtr();
        });
        ASSERT_EQ(agent.registerPath(), 0);
    }
    void TearDown() override { agent.unregisterPath(); }

    /// Does in another thread what the daemon does while an agent pairs.
    void whilePairing(const Agent& by, const std::function<void()>& daemonDoes) {
        daemon.forgetCalls();
        std::thread script([&] {
            EXPECT_TRUE(daemon.waitForCalls("CreatePairedDevice", 1));
            daemonDoes();
            daemon.send(replyTo(pairing.get(), device));
        });
        const std::unique_ptr<Device> paired(adapter.createPairedDevice(address, by));
        script.join();
        EXPECT_TRUE(paired) << adapter.getErrorMessage();
    }

    /// @return the answer's arguments, with the name of an error before them; "none" for no answer
    std::string ask(const std::string& member, const Writer::Build& arguments = device,
                    Milliseconds limit = patience) {
        const MessagePtr answer =
            daemon
                .call(adapter.getConnectionName(), "/org/bluez/agent_" + std::to_string(getpid()),
                      "org.bluez.Agent", member, arguments, limit)
                .get();
        if (!answer)
            return "none";
        const char* error = dbus_message_get_error_name(answer.get());
        return (error ? error + std::string(" ") : "") + argumentsOf(answer.get());
    }

    Agent agent;
    Adapter adapter{adapterPath};
    MessagePtr pairing; // the request that waits for its reply
};

enum class Delayed { Never, UnlessRejecting, Always };

struct Request {
    const char* member;
    const char* name; ///< in log lines
    Writer::Build arguments;
    const char* answer;
    const char* answerWhenRejecting;
    Delayed delayed;
    Handler handler;
    DBusHandlerResult resultOfBadArguments;
};
void PrintTo(const Request& row, std::ostream* stream) {
    *stream << row.member;
}

class AgentRequestTest : public AgentTest, public testing::WithParamInterface<Request> {
protected:
    const Request& row = GetParam();
    const std::string badArguments =
        std::string("agent.cpp Failed to get argument from ") + row.name + " message.";
    const std::string noReply =
        std::string("agent.cpp Failed to create reply message when handling ") + row.name +
        " message.";
};

TEST_P(AgentRequestTest, IsAnsweredFromTheAgentsValuesAfterItsDelay) {
    agent.setPasskeyDelay(1);
    whilePairing(agent, [&] {
        EXPECT_EQ(takesASecond([&] { EXPECT_EQ(ask(row.member, row.arguments), row.answer); }),
                  row.delayed != Delayed::Never);
        agent.setReject(true); // between requests, nobody reads it
        EXPECT_EQ(takesASecond(
                      [&] { EXPECT_EQ(ask(row.member, row.arguments), row.answerWhenRejecting); }),
                  row.delayed == Delayed::Always);
    });
    EXPECT_EQ(log.take(), Texts{});
}

TEST_P(AgentRequestTest, WithBadArgumentsIsLoggedAndNotAnswered) {
    EXPECT_EQ(row.handler(nullptr, nullptr, &agent), row.resultOfBadArguments);
    EXPECT_EQ(log.take(), Texts{badArguments});
    // libdbus tells the daemon of what was not handled; for a PIN code it waits in vain.
    const bool isSilent = row.resultOfBadArguments == handled;
    std::string expected = isSilent ? "none" : DBUS_ERROR_UNKNOWN_METHOD;
    if (!row.arguments)
        expected = ""; // what it does not need does not trouble it
    whilePairing(agent, [&] {
        const std::string answer =
            ask(row.member, with("bad"), isSilent ? Milliseconds(200) : patience);
        EXPECT_EQ(answer.substr(0, answer.find(' ')), expected);
    });
    EXPECT_EQ(log.take(), row.arguments ? Texts{badArguments} : Texts{});
}

TEST_P(AgentRequestTest, ThatWasNeverSentCannotBeAnswered) {
    const MessagePtr unsent = request(row.member, row.arguments);
    agent.setReject(true);
    EXPECT_EQ(row.handler(nullptr, unsent.get(), &agent), needMemory);
    agent.setReject(false);
    agent.setPasskeyDelay(1);
    EXPECT_EQ(
        takesASecond([&] { EXPECT_EQ(row.handler(nullptr, unsent.get(), &agent), needMemory); }),
        row.handler == Agent::requestPasskey); // which still waits
    EXPECT_EQ(log.take(), Texts(2, noReply));
    agent.setPasskeyDelay(0);
    dbus_message_set_serial(unsent.get(), 7);
    EXPECT_EQ(row.handler(nullptr, unsent.get(), &agent), handled);
    EXPECT_EQ(log.take(), Texts{});
}

constexpr const char* rejected = "org.bluez.Error.Rejected s:";
INSTANTIATE_TEST_SUITE_P(
    , AgentRequestTest,
    testing::Values(
        Request{"RequestPinCode", "request pin code", device, "s:5820", "s:5820", Delayed::Always,
                Agent::requestPinCode, handled},
        Request{"RequestPasskey", "request passkey", device, "u:5820", rejected,
                Delayed::UnlessRejecting, Agent::requestPasskey, notYetHandled},
        Request{"RequestConfirmation", "request confirmation", with(Path{devicePath}, 123456U), "",
                rejected, Delayed::UnlessRejecting, Agent::requestConfirmation, notYetHandled},
        Request{"Authorize", "authorize", with(Path{devicePath}, "110b"), "", rejected,
                Delayed::Never, Agent::authorize, notYetHandled},
        Request{"Cancel", "cancel", {}, "", "", Delayed::Never, Agent::cancel, notYetHandled},
        Request{"Release", "release", {}, "", "", Delayed::Never, Agent::release, notYetHandled}),
    testing::PrintToStringParamName());

TEST_F(AgentTest, WhatIsNoRequestOfTheAgentsIsNotHandled) {
    const MessagePtr others[] = {
        request("requestPinCode", device), request("Cancel", {}, "org.bluez.Manager"),
        MessagePtr(dbus_message_new_signal("/agent", "org.bluez.Agent", "Cancel")), nullptr};
    for (const MessagePtr& message : others)
        EXPECT_EQ(Agent::handlerDispatcher(nullptr, message.get(), &agent), notYetHandled);
    whilePairing(agent, [&] {
        for (const char* unknown : {"DisplayPasskey", "ConfirmModeChange", "Nonsense"})
            EXPECT_EQ(ask(unknown).rfind(DBUS_ERROR_UNKNOWN_METHOD, 0), 0U);
    });
    EXPECT_EQ(log.take(), Texts(4 + 3, noHandler));
    EXPECT_EQ(Agent::displayPasskey(nullptr, nullptr, &agent), notYetHandled);
    EXPECT_EQ(Agent::confirmModeChange(nullptr, nullptr, &agent), handled);
    Agent::handlerUnregisterDispatcher(nullptr, &agent);
    EXPECT_EQ(log.take(), Texts{});
}

TEST_F(AgentTest, APasskeyIsTheNumberThatItsTextBeginsWith) {
    whilePairing(agent, [&] {
        for (const auto& [value, answer] :
             {std::pair("12ab", "u:12"), {"abc", "u:0"}, {"", "u:0"}, {"000042", "u:42"}}) {
            agent.setPasskeyValue(value);
            EXPECT_EQ(ask("RequestPinCode"), std::string("s:") + value);
            EXPECT_EQ(ask("RequestPasskey"), answer);
        }
        EXPECT_EQ(log.take(), Texts{});
        agent.setPasskeyValue("\xff"); // cannot be sent as a string
        EXPECT_EQ(ask("RequestPinCode"), "");
    });
    EXPECT_EQ(log.take().size(), 1U);
}

TEST_F(AgentTest, OneAgentOfAProcessCanBeRegistered) {
    Agent& first = agent;
    Agent second;
    EXPECT_EQ(second.unregisterPath(), -1);
    EXPECT_EQ(second.registerPath(), -1);
    EXPECT_STREQ(first.getPath(), second.getPath());
    EXPECT_EQ(log.take(), (Texts{notUnregistered, notRegistered}));
    second.setPasskeyValue("2222");
    whilePairing(second, [&] { EXPECT_EQ(ask("RequestPinCode"), "s:5820"); });
    EXPECT_EQ(second.unregisterPath(), 0); // the path, whichever agent serves it
    EXPECT_EQ(first.unregisterPath(), -1);
    EXPECT_EQ(log.take(), Texts{notUnregistered});
    EXPECT_EQ(second.registerPath(), 0);
    whilePairing(second, [&] { EXPECT_EQ(ask("RequestPinCode"), "s:2222"); });
    EXPECT_EQ(second.unregisterPath(), 0);
    whilePairing(second, [&] {
        EXPECT_EQ(ask("RequestPinCode").rfind("org.freedesktop.DBus.Error.", 0), 0U);
    });
}

TEST_F(AgentTest, AnotherDispatcherServesFromTheNextRegistrationOn) {
    static Recorder<void*> userData;
    EXPECT_EQ(agent.setDispatcher([](DBusConnection* connection, DBusMessage* message, void* data) {
        userData.add(data);
        return Agent::requestPinCode(connection, message, data); // whatever was asked
    }),
              0);
    whilePairing(agent, [&] { EXPECT_EQ(ask("Cancel"), ""); });
    EXPECT_EQ(userData.count(), 0U);
    ASSERT_EQ(agent.unregisterPath(), 0);
    ASSERT_EQ(agent.registerPath(), 0);
    whilePairing(agent, [&] { EXPECT_EQ(ask("AnythingElse"), "s:5820"); });
    EXPECT_EQ(userData.events(), std::vector<void*>{&agent});
}

TEST_F(AgentTest, WithoutABusThePathIsNeitherRegisteredNorUnregistered) {
    bus.kill();
    Agent other;
    EXPECT_EQ(other.registerPath(), -1);
    EXPECT_EQ(agent.unregisterPath(), -1);
    const std::string noBus = "connection.cpp Failed to get bus connection";
    EXPECT_EQ(log.take(), (Texts{noBus, notRegistered, noBus, notUnregistered}));
}

TEST_F(AgentTest, APairingOutlastsTheDefaultTimeOutOfCalls) {
    Latch never;
    whilePairing(agent, [&] { never.wait(std::chrono::seconds(26)); }); // 25 s for other calls
}

} // namespace Bluetooth::Test
