// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/session/bus_configuration.h"

#include "serving/bus/glib_ptr.h"

namespace Bluetooth::Serving {

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
    return xml + "  <policy context=\"default\">\n    <allow user=\"*\"/>\n    <allow own=\"*\"/>\n"
                 "    <allow send_destination=\"*\" eavesdrop=\"true\"/>\n"
                 "    <allow receive_sender=\"*\" eavesdrop=\"true\"/>\n"
                 "    <allow send_requested_reply=\"false\" send_type=\"method_return\"/>\n"
                 "    <allow send_requested_reply=\"false\" send_type=\"error\"/>\n"
                 "  </policy>\n</busconfig>\n";
}

} // namespace Bluetooth::Serving
