// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/service_record.h"

#include <glib.h>

#include <cstring>
#include <memory>

namespace Kesbt {

namespace {

constexpr char classIdList[] = "0x0001";
constexpr char serviceName[] = "0x0100";

struct Reader {
    ServiceRecord record;
    std::string attribute; // the id of the one being read
};

const char* find(const char** names, const char** values, const char* name) {
    for (; *names; ++names, ++values) {
        if (std::strcmp(*names, name) == 0)
            return *values;
    }
    return "";
}

void startElement(GMarkupParseContext*, const char* element, const char** names,
                  const char** values, void* data, GError**) {
    Reader& reader = *static_cast<Reader*>(data);
    if (std::strcmp(element, "attribute") == 0)
        reader.attribute = find(names, values, "id");
    else if (reader.attribute == classIdList && std::strcmp(element, "uuid") == 0)
        reader.record.uuids.emplace_back(find(names, values, "value"));
    else if (reader.attribute == serviceName && std::strcmp(element, "text") == 0)
        reader.record.name = find(names, values, "value");
}

} // namespace

ServiceRecord parseServiceRecord(const std::string& xml) {
    constexpr GMarkupParser parser = {startElement, nullptr, nullptr, nullptr, nullptr};
    Reader reader;
    const std::unique_ptr<GMarkupParseContext, decltype(&g_markup_parse_context_free)> context(
        g_markup_parse_context_new(&parser, G_MARKUP_DEFAULT_FLAGS, &reader, nullptr),
        g_markup_parse_context_free);
    g_markup_parse_context_parse(context.get(), xml.data(), static_cast<gssize>(xml.size()),
                                 nullptr);
    return reader.record;
}

} // namespace Kesbt
