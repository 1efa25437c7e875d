#include "run/private_bus.h"

#include "run/process.h"

#include <fstream>
#include <stdexcept>

namespace Bluetooth::Sim {

namespace {

constexpr int addressFd = 3;

std::string configuration(const std::string& folder, const std::string& type,
                          const std::vector<std::string>& serviceFolders) {
    std::string xml = "<!DOCTYPE busconfig PUBLIC \"-//freedesktop//DTD D-Bus Bus Configuration "
                      "1.0//EN\" \"http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd\">\n"
                      "<busconfig>\n  <type>" +
                      type + "</type>\n  <listen>unix:path=" + folder + "/" + type +
                      "_bus</listen>\n  <auth>EXTERNAL</auth>\n";
    for (const std::string& services : serviceFolders) {
        const GlibPtr<char> escaped(g_markup_escape_text(services.c_str(), -1));
        xml += std::string("  <servicedir>") + escaped.get() + "</servicedir>\n";
    }
    return xml + "  <policy context=\"default\">\n    <allow user=\"*\"/>\n    <allow own=\"*\"/>\n"
                 "    <allow send_destination=\"*\" eavesdrop=\"true\"/>\n"
                 "    <allow receive_sender=\"*\" eavesdrop=\"true\"/>\n"
                 "    <allow send_requested_reply=\"false\" send_type=\"method_return\"/>\n"
                 "    <allow send_requested_reply=\"false\" send_type=\"error\"/>\n"
                 "  </policy>\n</busconfig>\n";
}

} // namespace

PrivateBus::PrivateBus(const std::string& folder, const std::string& type,
                       const std::vector<std::string>& serviceFolders,
                       const std::vector<std::string>& environment) {
    const std::string file = folder + "/" + type + ".conf";
    if (!(std::ofstream(file) << configuration(folder, type, serviceFolders)))
        throw std::runtime_error("cannot write " + file);
    Helper helper;
    helper.arguments = {"dbus-daemon",           "--nofork",
                        "--nopidfile",           "--syslog-only",
                        "--config-file=" + file, "--print-address=" + std::to_string(addressFd)};
    helper.environment = environment;
    helper.pipeTarget = addressFd;
    int output = -1;
    m_pid = startHelper(helper, output);
    m_address = readLine(output);
    if (m_address.empty()) {
        endProcess(m_pid);
        throw std::runtime_error("dbus-daemon has not started a " + type + " bus");
    }
}

PrivateBus::~PrivateBus() {
    endProcess(m_pid);
}

} // namespace Bluetooth::Sim
