// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/xml_record.h"

#include "serving.h"
#include "serving/bus/glib_ptr.h"
#include "world/settings.h"

#include <glib.h>

#include <cstdlib>

namespace Bluetooth::Sim {

namespace {

constexpr long serviceClassList = 1; ///< the id of the attribute

/// What the parser is in, and what it has found.
struct Progress {
    unsigned depth = 0;     ///< of the elements within the attribute
    bool listSeen = false;  ///< only the first attribute of an id counts
    bool listIsNow = false; ///< this attribute is the first list of service classes
    bool firstSeen = false;
    std::string uuid;
};

const char* find(const char* wanted, const char** names, const char** values) {
    for (; *names; ++names, ++values)
        if (g_str_equal(*names, wanted))
            return *values;
    return "";
}

/// A UUID as records have it: 36 characters, or any hexadecimal number.
std::string parseUuid(const char* text) {
    char* end = nullptr;
    const auto number = static_cast<guint32>(std::strtoll(text, &end, 16));
    const GlibPtr<char> digits(g_strdup_printf("%08x", number));
    const bool isNumber = *text && !*end;
    return fullUuid(isNumber ? digits.get() : text);
}

void elementBegins(GMarkupParseContext*, const char* name, const char** names, const char** values,
                   gpointer data, GError**) {
    auto& progress = *static_cast<Progress*>(data);
    if (g_str_equal(name, "record"))
        return;
    if (g_str_equal(name, "attribute")) {
        const long id = std::strtol(find("id", names, values), nullptr, 0);
        progress.depth = 0;
        progress.listIsNow = id == serviceClassList && !progress.listSeen;
        return;
    }
    ++progress.depth;
    if (!progress.listIsNow)
        return;
    progress.listSeen = true;
    if (progress.depth != 2 || progress.firstSeen)
        return;
    progress.firstSeen = true;
    if (g_str_equal(name, "uuid"))
        progress.uuid = parseUuid(find("value", names, values));
}

void elementEnds(GMarkupParseContext*, const char* name, gpointer data, GError**) {
    auto& progress = *static_cast<Progress*>(data);
    if (!g_str_equal(name, "record") && !g_str_equal(name, "attribute") && progress.depth > 0)
        --progress.depth;
}

} // namespace

std::optional<std::string> serviceClassOfXml(const std::string& xml) {
    static const GMarkupParser parser = {elementBegins, elementEnds, nullptr, nullptr, nullptr};
    Progress progress;
    GMarkupParseContext* context =
        g_markup_parse_context_new(&parser, static_cast<GMarkupParseFlags>(0), &progress, nullptr);
    const bool parsed =
        g_markup_parse_context_parse(context, xml.c_str(), static_cast<gssize>(xml.size()),
                                     nullptr) != FALSE;
    g_markup_parse_context_free(context);
    return parsed ? std::make_optional(progress.uuid) : std::nullopt;
}

} // namespace Bluetooth::Sim
