// The pairing agent: what it answers to each request, and how.

#include "support/peer_test.h"

#include <bluetooth/adapter.h>
#include <bluetooth/agent.h>
#include <bluetooth/device.h>

#include <functional>
#include <memory>
#include <thread>
#include <unistd.h>

namespace Bluetooth::Test {

namespace {

using Handler = DBusHandlerResult (*)(DBusConnection*, DBusMessage*, void*);
constexpr auto handled = DBUS_HANDLER_RESULT_HANDLED;
constexpr auto notYetHandled = DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
constexpr auto needMemory = DBUS_HANDLER_RESULT_NEED_MEMORY;
constexpr const char* rejected = "org.bluez.Error.Rejected s:";

struct Request {
    const char* member;
    const char* name; ///< in log lines
    Writer::Build arguments;
    const char* answer;
    const char* answerWhenRejecting;
    Handler handler;
    DBusHandlerResult resultOfBadArguments;
};

void device(Writer& w) {
    w(Path{devicePath});
}

const Request requests[] = {
    {"RequestPinCode", "request pin code", device, "s:5820", "s:5820", Agent::requestPinCode,
     handled},
    {"RequestPasskey", "request passkey", device, "u:5820", rejected, Agent::requestPasskey,
     notYetHandled},
    {"RequestConfirmation", "request confirmation", [](Writer& w) { w(Path{devicePath})(123456u); },
     "", rejected, Agent::requestConfirmation, notYetHandled},
    {"Authorize", "authorize", [](Writer& w) { w(Path{devicePath})("110b"); }, "", rejected,
     Agent::authorize, notYetHandled},
    {"Cancel", "cancel", {}, "", "", Agent::cancel, notYetHandled},
    {"Release", "release", {}, "", "", Agent::release, notYetHandled},
};

std::string badArguments(const Request& request) {
    return std::string("agent.cpp Failed to get argument from ") + request.name + " message.";
}
std::string noReply(const Request& request) {
    return std::string("agent.cpp Failed to create reply message when handling ") + request.name +
           " message.";
}
constexpr const char* noHandler =
    "agent.cpp Registered agent does not provide a handler for the incoming message.";
constexpr const char* notRegistered = "agent.cpp Failed to register agent path to dbus.";
constexpr const char* notUnregistered = "agent.cpp Failed to unregister agent path from dbus.";

MessagePtr call(const char* member, const Writer::Build& arguments,
                const char* interface = "org.bluez.Agent") {
    MessagePtr message(dbus_message_new_method_call(nullptr, "/agent", interface, member));
    Writer(message.get(), arguments);
    return message;
}

} // namespace

TEST(AgentHandlerTest, ValuesHaveDefaultsAndBadOnesAreRefused) {
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

TEST(AgentHandlerTest, ResultsAndLogLinesTellWhatWasWrong) {
    SyslogCapture log;
    Agent agent;
    for (const Request& request : requests) {
        EXPECT_EQ(request.handler(nullptr, nullptr, &agent), request.resultOfBadArguments);
        EXPECT_EQ(log.take(), Texts{badArguments(request)});
        if (request.arguments) {
            const MessagePtr bad = call(request.member, [](Writer& w) { w(1.5); });
            for (const Handler handler : {request.handler, Handler(Agent::handlerDispatcher)}) {
                EXPECT_EQ(handler(nullptr, bad.get(), &agent), request.resultOfBadArguments);
                EXPECT_EQ(log.take(), Texts{badArguments(request)});
            }
        }
        // A message that was never sent cannot be replied to; only a passkey is still delayed.
        const MessagePtr unsent = call(request.member, request.arguments);
        agent.setReject(true);
        EXPECT_EQ(request.handler(nullptr, unsent.get(), &agent), needMemory);
        agent.setReject(false);
        agent.setPasskeyDelay(1);
        const auto begin = std::chrono::steady_clock::now();
        EXPECT_EQ(request.handler(nullptr, unsent.get(), &agent), needMemory);
        const bool delayed = std::chrono::steady_clock::now() - begin >= std::chrono::seconds(1);
        EXPECT_EQ(delayed, request.handler == Agent::requestPasskey) << request.member;
        EXPECT_EQ(log.take(), Texts(2, noReply(request)));
        agent.setPasskeyDelay(0);
        dbus_message_set_serial(unsent.get(), 7);
        EXPECT_EQ(request.handler(nullptr, unsent.get(), &agent), handled);
        EXPECT_EQ(log.take(), Texts{});
    }
}

TEST(AgentHandlerTest, WhatIsNoRequestOfTheAgentsIsNotHandled) {
    SyslogCapture log;
    Agent agent;
    const MessagePtr others[] = {
        call("DisplayPasskey", [](Writer& w) { w(Path{"/d"})(1u)(std::uint8_t{0}); }),
        call("requestPinCode", device), call("Cancel", {}, "org.bluez.Manager"),
        MessagePtr(dbus_message_new_signal("/agent", "org.bluez.Agent", "Cancel")), nullptr};
    for (const MessagePtr& message : others)
        EXPECT_EQ(Agent::handlerDispatcher(nullptr, message.get(), &agent), notYetHandled);
    EXPECT_EQ(log.take(), Texts(5, noHandler));
    EXPECT_EQ(Agent::displayPasskey(nullptr, nullptr, &agent), notYetHandled);
    EXPECT_EQ(Agent::confirmModeChange(nullptr, nullptr, &agent), handled);
    Agent::handlerUnregisterDispatcher(nullptr, &agent);
    EXPECT_EQ(log.take(), Texts{});
}

class AgentTest : public DaemonTest {
protected:
    void SetUp() override {
        daemon.handle("CreatePairedDevice", [this](DBusMessage* request) {
            pairing.reset(dbus_message_ref(request));
            return MessagePtr();
        });
    }
    void TearDown() override { agent.unregisterPath(); }

    /// Does in another thread what the daemon does while an agent pairs.
    void whilePairing(const Agent& by, const std::function<void()>& daemonDoes) {
        daemon.forgetCalls();
        std::thread script([&] {
            EXPECT_TRUE(daemon.waitForCalls("CreatePairedDevice", 1));
            daemonDoes();
            daemon.send(replyTo(pairing.get(), [](Writer& w) { w(Path{devicePath}); }));
        });
        const std::unique_ptr<Device> paired(adapter.createPairedDevice(address, by));
        script.join();
        EXPECT_TRUE(paired) << adapter.getErrorMessage();
    }

    /// @return the answer's arguments, with the name of an error before them; "none" for no answer
    std::string ask(const std::string& member, const Writer::Build& arguments,
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

TEST_F(AgentTest, AnswersEachRequestFromItsValues) {
    ASSERT_EQ(agent.registerPath(), 0);
    EXPECT_EQ(agent.getPath(), "/org/bluez/agent_" + std::to_string(getpid()));
    whilePairing(agent, [&] {
        for (const Request& request : requests) {
            agent.setReject(false); // between requests, nobody reads it
            EXPECT_EQ(ask(request.member, request.arguments), request.answer) << request.member;
            agent.setReject(true);
            EXPECT_EQ(ask(request.member, request.arguments), request.answerWhenRejecting)
                << request.member;
        }
    });
    EXPECT_EQ(log.take(), Texts{});
    agent.setReject(false);
    const std::pair<const char*, const char*> passkeys[] = {
        {"12ab", "u:12"}, {"abc", "u:0"}, {"", "u:0"}, {"000042", "u:42"}};
    whilePairing(agent, [&] {
        for (const auto& [value, answer] : passkeys) {
            agent.setPasskeyValue(value);
            EXPECT_EQ(ask("RequestPinCode", device), std::string("s:") + value);
            EXPECT_EQ(ask("RequestPasskey", device), answer);
        }
        agent.setPasskeyValue("\xff"); // cannot be sent as a text
        EXPECT_EQ(ask("RequestPinCode", device), "");
    });
    EXPECT_EQ(log.take().size(), 1u);
    EXPECT_EQ(agent.unregisterPath(), 0);
}

TEST_F(AgentTest, BadRequestsAreLoggedAndNotAnswered) {
    ASSERT_EQ(agent.registerPath(), 0);
    Texts expected;
    whilePairing(agent, [&] {
        for (const Request& request : requests) {
            if (!request.arguments) { // what it does not need does not trouble it
                EXPECT_EQ(ask(request.member, device), "");
                continue;
            }
            // libdbus tells the daemon of what was not handled; a PIN code it waits for in vain.
            const bool silent = request.resultOfBadArguments == handled;
            const std::string answer = ask(
                request.member, [](Writer& w) { w("bad"); }, silent ? Milliseconds(200) : patience);
            EXPECT_EQ(answer.substr(0, answer.find(' ')),
                      silent ? "none" : DBUS_ERROR_UNKNOWN_METHOD);
            expected.push_back(badArguments(request));
        }
        for (const char* unknown : {"DisplayPasskey", "ConfirmModeChange", "Nonsense"}) {
            EXPECT_EQ(ask(unknown, device).find(DBUS_ERROR_UNKNOWN_METHOD), 0u);
            expected.push_back(noHandler);
        }
    });
    EXPECT_EQ(log.take(), expected);
}

TEST_F(AgentTest, WaitsBeforeItGivesAValueOrConfirms) {
    ASSERT_EQ(agent.registerPath(), 0);
    agent.setPasskeyDelay(1);
    const auto takesASecond = [&](const Request& request) {
        const auto begin = std::chrono::steady_clock::now();
        ask(request.member, request.arguments);
        return std::chrono::steady_clock::now() - begin >= std::chrono::seconds(1);
    };
    whilePairing(agent, [&] {
        for (const Request& request : requests) {
            agent.setReject(false);
            EXPECT_EQ(takesASecond(request), &request - requests < 3) << request.member;
            agent.setReject(true);
            if (request.handler != Agent::requestPinCode) {
                EXPECT_FALSE(takesASecond(request)) << request.member;
            }
        }
    });
}

TEST_F(AgentTest, OneAgentOfAProcessCanBeRegistered) {
    Agent& first = agent;
    Agent second;
    EXPECT_EQ(first.unregisterPath(), -1);
    EXPECT_EQ(log.take(), Texts{notUnregistered});
    EXPECT_EQ(first.registerPath(), 0);
    EXPECT_EQ(second.registerPath(), -1);
    EXPECT_STREQ(first.getPath(), second.getPath());
    EXPECT_EQ(log.take(), Texts{notRegistered});
    second.setPasskeyValue("2222");
    whilePairing(second, [&] { EXPECT_EQ(ask("RequestPinCode", device), "s:5820"); });
    EXPECT_EQ(second.unregisterPath(), 0); // the path, whichever agent serves it
    EXPECT_EQ(first.unregisterPath(), -1);
    EXPECT_EQ(log.take(), Texts{notUnregistered});
    EXPECT_EQ(second.registerPath(), 0);
    whilePairing(second, [&] { EXPECT_EQ(ask("RequestPinCode", device), "s:2222"); });
    EXPECT_EQ(second.unregisterPath(), 0);
    whilePairing(second, [&] {
        EXPECT_EQ(ask("RequestPinCode", device).find("org.freedesktop.DBus.Error."), 0u);
    });
}

TEST_F(AgentTest, AnotherDispatcherServesFromTheNextRegistrationOn) {
    static Recorder<void*> userData;
    ASSERT_EQ(agent.registerPath(), 0);
    EXPECT_EQ(agent.setDispatcher([](DBusConnection* connection, DBusMessage* message, void* data) {
        userData.add(data);
        return Agent::requestPinCode(connection, message, data); // whatever was asked
    }),
              0);
    whilePairing(agent, [&] { EXPECT_EQ(ask("Authorize", requests[3].arguments), ""); });
    EXPECT_EQ(userData.count(), 0u);
    ASSERT_EQ(agent.unregisterPath(), 0);
    ASSERT_EQ(agent.registerPath(), 0);
    whilePairing(agent, [&] { EXPECT_EQ(ask("AnythingElse", device), "s:5820"); });
    EXPECT_EQ(userData.events(), std::vector<void*>{&agent});
}

TEST_F(AgentTest, WithoutABusThePathIsNeitherRegisteredNorUnregistered) {
    ASSERT_EQ(agent.registerPath(), 0);
    bus.kill();
    Agent other;
    EXPECT_EQ(other.registerPath(), -1);
    EXPECT_EQ(agent.unregisterPath(), -1);
    const std::string noBus = "connection.cpp Failed to get bus connection";
    EXPECT_EQ(log.take(), (Texts{noBus, notRegistered, noBus, notUnregistered}));
}

TEST_F(AgentTest, APairingOutlastsTheDefaultTimeOutOfCalls) {
    ASSERT_EQ(agent.registerPath(), 0);
    Latch never;
    whilePairing(agent, [&] { never.wait(std::chrono::seconds(26)); }); // 25 s for other calls
}

} // namespace Bluetooth::Test
