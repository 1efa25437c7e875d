#include "kesbt/kesbt_test.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <ostream>

namespace Bluetooth::Test {

namespace {

constexpr const char* simName = "com.kestrine.bluetooth.Sim";
constexpr const char* simPath = "/com/kestrine/bluetooth/Sim";

std::unique_ptr<ChildProcess> startSim(const std::string& timeScale) {
    auto sim = std::make_unique<ChildProcess>(
        Arguments{BLUEZ4_SIM, "--print-ready", "--time-scale=" + timeScale},
        ChildProcess::Output::Capture);
    if (sim->readLine() != "ready")
        throw std::runtime_error("bluez4-sim does not start: " + sim->readErrors());
    return sim;
}

std::size_t countOf(const std::vector<std::string>& signals, const std::string& member) {
    return static_cast<std::size_t>(
        std::count_if(signals.begin(), signals.end(), [&](const std::string& signal) {
            return signal.find("s:" + member + " ") != std::string::npos;
        }));
}

} // namespace

std::ostream& operator<<(std::ostream& stream, const Result& result) {
    return stream << "status " << result.status << "\nout: " << result.out
                  << "\nerr: " << result.err;
}

std::unique_ptr<ChildProcess> start(const Arguments& arguments) {
    Arguments command = {KESBT};
    command.insert(command.end(), arguments.begin(), arguments.end());
    return std::make_unique<ChildProcess>(command, ChildProcess::Output::Capture);
}

Result finish(ChildProcess& program) {
    Result result;
    result.out = program.readAll();
    result.err = program.readErrors();
    result.status = program.wait();
    return result;
}

Result run(const Arguments& arguments) {
    return finish(*start(arguments));
}

Result runCommand(const Arguments& command) {
    ChildProcess program(command, ChildProcess::Output::Capture);
    return finish(program);
}

std::string failure(const Arguments& arguments, int status) {
    const Result result = run(arguments);
    EXPECT_EQ(result.status, status) << result;
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err.find('\n'), result.err.size() - 1) << result;
    return result.err;
}

Json awaitEvent(ChildProcess& program, const std::string& member, const Json& value) {
    for (std::string line = program.readLine(); !line.empty(); line = program.readLine()) {
        const Json event = Json::parse(line);
        if (event.value(member, Json()) == value)
            return event;
    }
    ADD_FAILURE() << "no event with " << member << " " << value;
    return Json::object();
}

KesbtTest::KesbtTest(const std::string& timeScale)
    : daemon(startSim(timeScale)), peer(std::make_unique<RawPeer>(bus.address())) {
    peer->addMatch(std::string("type='signal',interface='") + simName + "'");
}

HostTest::HostTest() {
    if (!getenv("KESBLUETOOTH_TEST_NAMESPACE"))
        throw std::runtime_error("this would change the machine's own files: run it with ctest");
    std::filesystem::remove_all("/etc/bluetooth");
    std::filesystem::create_directory("/etc/bluetooth");
}

MessagePtr KesbtTest::control(const char* method, const RawPeer::Build& arguments) {
    MessagePtr reply = peer->call(simName, simPath, simName, method, arguments).get();
    EXPECT_TRUE(reply && dbus_message_get_type(reply.get()) != DBUS_MESSAGE_TYPE_ERROR)
        << method << " " << (reply ? argumentsOf(reply.get()) : "no reply");
    return reply;
}

void KesbtTest::setTimeScale(double scale) {
    control("SetTimeScale", [scale](Writer& w) { w(scale); });
}

void KesbtTest::awaitCall(const std::string& member, std::size_t count) {
    EXPECT_TRUE(peer->signals().waitUntil([&](const auto& signals) {
        return countOf(signals, member) >= count;
    })) << "no call of "
        << member;
}

std::size_t KesbtTest::calls(const std::string& member) {
    control("ClearFaults"); // its answer comes after the signals of all calls before
    return countOf(peer->signals().events(), member);
}

} // namespace Bluetooth::Test
