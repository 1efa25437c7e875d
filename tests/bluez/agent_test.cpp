// The pairing agent: what it answers to each request, and how.

#include "support/peer_test.h"

#include <bluetooth/adapter.h>
#include <bluetooth/agent.h>
#include <bluetooth/device.h>

#include <csignal>
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

TEST(AgentValuesTest, HaveDefaultsAndRefuseBadOnes) {
    SyslogCapture log;
    Agent agent;
    EXPECT_STREQ(agent.getPath(), "");
    EXPECT_STREQ(agent.getInterface(), "org.bluez.Agent");
    EXPECT_STREQ(agent.getPasskeyValue(), "5820");
    EXPECT_EQ(agent.getPasskeyDelay(), 0);
    EXPECT_FALSE(agent.getReject());
    EXPECT_EQ(agent.getCapability(), Agent::PSZ_DISPLAY_YES_NO);
    EXPECT_STREQ(Agent::PSZ_DISPLAY_YES_NO, "DisplayYesNo");
    EXPECT_STREQ(Agent::PSZ_DISPLAY_ONLY, "DisplayOnly");
    EXPECT_STREQ(Agent::PSZ_KEYBOARD_ONLY, "KeyboardOnly");
    EXPECT_STREQ(Agent::PSZ_NO_INPUT_NO_OUTPUT, "NoInputNoOutput");

    std::string value = "0000";
    EXPECT_EQ(agent.setPasskeyValue(value.c_str()), 0);
    value = "changed"; // it was copied
    EXPECT_EQ(agent.setPasskeyValue(nullptr), -1);
    EXPECT_STREQ(agent.getPasskeyValue(), "0000");
    EXPECT_EQ(agent.setPasskeyDelay(3), 0);
    EXPECT_EQ(agent.setPasskeyDelay(-1), -1);
    EXPECT_EQ(agent.getPasskeyDelay(), 3);
    EXPECT_EQ(agent.setPasskeyDelay(0), 0);
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
        // A message that was never sent cannot be replied to.
        const MessagePtr unsent = call(request.member, request.arguments);
        for (const bool reject : {false, true}) {
            agent.setReject(reject);
            EXPECT_EQ(request.handler(nullptr, unsent.get(), &agent), needMemory);
            EXPECT_EQ(log.take(), Texts{noReply(request)});
        }
        agent.setReject(false);
        const MessagePtr good = call(request.member, request.arguments);
        dbus_message_set_serial(good.get(), 7);
        EXPECT_EQ(request.handler(nullptr, good.get(), &agent), handled);
        EXPECT_EQ(log.take(), Texts{});
    }
}

TEST(AgentHandlerTest, WithoutAReplyOnlyAPasskeyIsStillDelayed) {
    SyslogCapture log;
    Agent agent;
    agent.setPasskeyDelay(1);
    for (const Request& request : requests) {
        const auto begin = std::chrono::steady_clock::now();
        EXPECT_EQ(request.handler(nullptr, call(request.member, request.arguments).get(), &agent),
                  needMemory);
        const bool delayed = std::chrono::steady_clock::now() - begin >= std::chrono::seconds(1);
        EXPECT_EQ(delayed, request.handler == Agent::requestPasskey) << request.member;
    }
}

TEST(AgentHandlerTest, WhatIsNoRequestOfTheAgentsIsNotHandled) {
    SyslogCapture log;
    Agent agent;
    const MessagePtr signal(dbus_message_new_signal("/agent", "org.bluez.Agent", "Cancel"));
    const MessagePtr others[] = {
        call("DisplayPasskey", [](Writer& w) { w(Path{"/d"})(1u)(std::uint8_t{0}); }),
        call("ConfirmModeChange", [](Writer& w) { w("discoverable"); }),
        call("requestPinCode", device), call("Cancel", {}, "org.bluez.Manager")};
    for (const MessagePtr& message : others)
        EXPECT_EQ(Agent::handlerDispatcher(nullptr, message.get(), &agent), notYetHandled);
    EXPECT_EQ(Agent::handlerDispatcher(nullptr, signal.get(), &agent), notYetHandled);
    EXPECT_EQ(Agent::handlerDispatcher(nullptr, nullptr, &agent), notYetHandled);
    EXPECT_EQ(log.take(), Texts(6, noHandler));
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

    /// Does in another thread what the daemon does while `agent` pairs.
    void whilePairing(const Agent& agent, const std::function<void()>& daemonDoes) {
        daemon.forgetCalls();
        std::thread script([&] {
            EXPECT_TRUE(daemon.waitForCalls("CreatePairedDevice", 1));
            daemonDoes();
            MessagePtr reply(dbus_message_new_method_return(pairing.get()));
            Writer(reply.get())(Path{devicePath});
            daemon.send(std::move(reply));
        });
        const std::unique_ptr<Device> paired(adapter.createPairedDevice(address, agent));
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

    Adapter adapter{adapterPath};
    MessagePtr pairing; // the request that waits for its reply
};

TEST_F(AgentTest, AnswersEachRequestFromItsValues) {
    Agent agent;
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
    Agent agent;
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
    agent.unregisterPath();
}

TEST_F(AgentTest, WaitsBeforeItGivesAValueOrConfirms) {
    Agent agent;
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
    agent.unregisterPath();
}

TEST_F(AgentTest, OneAgentOfAProcessCanBeRegistered) {
    Agent first;
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
    Agent agent;
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
    agent.unregisterPath();
}

TEST_F(AgentTest, WithoutABusThePathIsNeitherRegisteredNorUnregistered) {
    Agent agent;
    ASSERT_EQ(agent.registerPath(), 0);
    bus.kill();
    Agent other;
    EXPECT_EQ(other.registerPath(), -1);
    EXPECT_EQ(agent.unregisterPath(), -1);
    const std::string noBus = "connection.cpp Failed to get bus connection";
    EXPECT_EQ(log.take(), (Texts{noBus, notRegistered, noBus, notUnregistered}));
}

TEST_F(AgentTest, APairingOutlastsTheDefaultTimeOutOfCalls) {
    Agent agent;
    ASSERT_EQ(agent.registerPath(), 0);
    Latch never;
    whilePairing(agent, [&] { never.wait(std::chrono::seconds(26)); }); // 25 s for other calls
    agent.unregisterPath();
}

TEST_F(AgentTest, AnInterruptedPairingGivesNothingAndTheNextOneWorks) {
    Agent agent;
    ASSERT_EQ(agent.registerPath(), 0);
    whilePairing(agent, [] {}); // installs the handlers
    daemon.forgetCalls();
    std::thread interrupter([&] {
        EXPECT_TRUE(daemon.waitForCalls("CreatePairedDevice", 1));
        kill(getpid(), SIGINT);
    });
    EXPECT_EQ(adapter.createPairedDevice(address, agent), nullptr);
    interrupter.join();
    EXPECT_EQ(adapter.getErrorNumber(), 2);
    EXPECT_EQ(log.take(), Texts{"adapter.cpp Reply message is null"});
    daemon.send(MessagePtr(dbus_message_new_method_return(pairing.get()))); // too late
    whilePairing(agent, [] {});
    agent.unregisterPath();
}

} // namespace Bluetooth::Test
