// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/session/bus_configuration.h"

#include "serving/bus/glib_ptr.h"

namespace Bluetooth::Serving {

namespace {

struct Limit {
    const char* name;
    int value;
};

/// Those of the session bus as dbus-daemon ships it: the few that a program may run into by
/// mistake.
constexpr Limit limits[] = {{"max_incoming_bytes", 1000000000},
                            {"max_incoming_unix_fds", 250000000},
                            {"max_outgoing_bytes", 1000000000},
                            {"max_outgoing_unix_fds", 250000000},
                            {"max_message_size", 1000000000},
                            {"service_start_timeout", 120000},
                            {"auth_timeout", 240000},
                            {"pending_fd_timeout", 150000},
                            {"max_completed_connections", 100000},
                            {"max_incomplete_connections", 10000},
                            {"max_connections_per_user", 100000},
                            {"max_pending_service_starts", 10000},
                            {"max_names_per_connection", 50000},
                            {"max_match_rules_per_connection", 50000},
                            {"max_replies_per_connection", 50000}};

} // namespace

std::string busConfiguration(const std::string& type, const std::string& socket,
                             const std::vector<std::string>& serviceFolders) {
    std::string xml = "<!DOCTYPE busconfig PUBLIC \"-//freedesktop//DTD D-Bus Bus Configuration "
                      "1.0//EN\" \"http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd\">\n"
                      "<busconfig>\n  <type>" +
                      type + "</type>\n  <listen>unix:path=" + socket +
                      "</listen>\n  <auth>EXTERNAL</auth>\n";
    for (const std::string& services : serviceFolders) {
        const GlibPtr<char> escaped(g_markup_escape_text(services.c_str(), -1));
        xml += std::string("  <servicedir>") + escaped.get() + "</servicedir>\n";
    }
    for (const auto& [name, value] : limits)
        xml +=
            std::string("  <limit name=\"") + name + "\">" + std::to_string(value) + "</limit>\n";
    return xml + "  <policy context=\"default\">\n    <allow user=\"*\"/>\n    <allow own=\"*\"/>\n"
                 "    <allow send_destination=\"*\" eavesdrop=\"true\"/>\n"
                 "    <allow receive_sender=\"*\" eavesdrop=\"true\"/>\n"
                 "    <allow send_requested_reply=\"false\" send_type=\"method_return\"/>\n"
                 "    <allow send_requested_reply=\"false\" send_type=\"error\"/>\n"
                 "  </policy>\n</busconfig>\n";
}

} // namespace Bluetooth::Serving
