// SPDX-License-Identifier: LGPL-2.1-or-later
#include "kesbt/kesbt_test.h"

#include <sstream>

namespace Bluetooth::Test {

namespace {

std::unique_ptr<ChildProcess>
startCommand(const Texts& command, ChildProcess::Output output = ChildProcess::Output::Capture) {
    return std::make_unique<ChildProcess>(command, output);
}

} // namespace

std::unique_ptr<ChildProcess> start(const std::string& arguments, ChildProcess::Output output) {
    Texts command{KESBT};
    std::istringstream words(arguments);
    for (std::string word; std::getline(words, word, ' ');)
        command.push_back(word);
    return startCommand(command, output);
}

Result run(const std::string& arguments) {
    return start(arguments)->finish();
}

Json json(const std::string& arguments) {
    return Json::parse(run(arguments + " --json").out);
}

Result runShell(const std::string& command) {
    return startCommand({"sh", "-c", command})->finish();
}

std::string failure(const std::string& arguments, int status) {
    const Result result = run(arguments);
    EXPECT_EQ(result.status, status) << result;
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err.find('\n'), result.err.size() - 1) << result;
    return result.err;
}

std::string errorsOf(ChildProcess& program, int status) {
    const Result result = program.finish();
    EXPECT_EQ(result.status, status) << result;
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

} // namespace Bluetooth::Test
