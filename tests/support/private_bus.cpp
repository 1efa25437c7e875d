// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/private_bus.h"

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>

namespace Bluetooth::Test {

namespace {

struct Folder {
    std::string path = "/tmp/kesbluetooth-test-XXXXXX";
    pid_t owner = getpid();

    Folder() {
        if (!mkdtemp(path.data()))
            throw std::runtime_error("cannot make a folder for the tests");
    }
    ~Folder() {
        std::error_code ignored;
        if (getpid() == owner)
            std::filesystem::remove_all(path, ignored);
    }
};

const char* nameOf(PrivateBus::Kind kind) {
    return kind == PrivateBus::Kind::System ? "system" : "session";
}

} // namespace

const std::string& testFolder() {
    static const Folder folder;
    return folder.path;
}

std::string PrivateBus::address(Kind kind) {
    std::string address = "unix:path=" + testFolder() + "/" + nameOf(kind) + "-bus";
    setenv(kind == Kind::System ? "DBUS_SYSTEM_BUS_ADDRESS" : "DBUS_SESSION_BUS_ADDRESS",
           address.c_str(), 1);
    return address;
}

PrivateBus::PrivateBus(Kind kind, const std::string& configuration)
    : m_address(address(kind)),
      m_configurationFile(testFolder() + "/" + nameOf(kind) + "-bus.conf") {
    std::ofstream(m_configurationFile)
        << "<!DOCTYPE busconfig PUBLIC \"-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN\" "
           "\"http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd\">\n"
        << "<busconfig><type>" << nameOf(kind) << "</type><listen>" << m_address << "</listen>"
        << "<auth>EXTERNAL</auth><policy context=\"default\">"
        << "<allow send_destination=\"*\" eavesdrop=\"true\"/><allow eavesdrop=\"true\"/>"
        << "<allow own=\"*\"/></policy>" << configuration << "</busconfig>\n";
    start();
}

void PrivateBus::start() {
    std::filesystem::remove(m_address.substr(m_address.find('/')));
    m_daemon = std::make_unique<ChildProcess>(
        std::vector<std::string>{"dbus-daemon", "--config-file=" + m_configurationFile, "--nofork",
                                 "--nopidfile", "--nosyslog", "--print-address=1"},
        ChildProcess::Output::Capture);
    if (m_daemon->readLine().empty())
        throw std::runtime_error("dbus-daemon does not start: " + m_daemon->readErrors());
}

} // namespace Bluetooth::Test
