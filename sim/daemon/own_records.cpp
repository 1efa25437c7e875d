// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/own_records.h"

#include "world/settings.h"

#include <iterator>

namespace Bluetooth::Sim {

namespace {

constexpr guint32 serverHandle = 0; ///< of the record of the record server
constexpr guint32 browseGroupHandle = 1;
constexpr guint32 firstHandle = 0x10000;

/// What a service class adds to the class of device, from bit 16 on.
struct ServiceBits {
    const char* uuid;
    guint32 bits;
};

constexpr guint32 networking = 0x02;
constexpr guint32 rendering = 0x04;
constexpr guint32 capturing = 0x08;
constexpr guint32 objectTransfer = 0x10;
constexpr guint32 audio = 0x20;
constexpr guint32 telephony = 0x40;

constexpr ServiceBits serviceBits[] = {
    {"1103", telephony | networking},
    {"1104", objectTransfer},
    {"1105", objectTransfer},
    {"1106", objectTransfer},
    {"1107", objectTransfer},
    {"1108", audio},
    {"1109", telephony},
    {"110a", capturing},
    {"110b", rendering},
    {"1110", telephony},
    {"1111", telephony},
    {"1115", networking},
    {"1116", networking},
    {"1117", networking},
    {"111e", audio},
    {"111f", telephony},
    {"1128", telephony | networking},
    {"112d", telephony},
    {"112f", objectTransfer},
    {"1303", capturing},
    {"1304", rendering},
};

} // namespace

OwnRecords::OwnRecords(std::function<void(const std::string&)> changed)
    : m_changed(std::move(changed)) {
    m_records[serverHandle] = {"", fullUuid("1000"), ""};
    m_records[browseGroupHandle] = {"", fullUuid("1001"), ""};
}

void OwnRecords::plugIn(const std::string& adapter) {
    m_handles[adapter];
    // Each adapter that comes gives the records of all adapters to the others once more.
    for (const auto& [handle, record] : m_records)
        if (record.adapter.empty())
            insert(handle, "");
}

void OwnRecords::pullOut(const std::string& adapter) {
    m_handles.erase(adapter);
    for (auto record = m_records.begin(); record != m_records.end();)
        record = record->second.adapter == adapter ? m_records.erase(record) : std::next(record);
}

guint32 OwnRecords::add(const Record& record, guint32 handle) {
    if (handle == 0)
        for (handle = firstHandle; m_records.count(handle);)
            ++handle;
    m_records[handle] = record;
    insert(handle, record.adapter);
    return handle;
}

void OwnRecords::insert(guint32 handle, const std::string& adapter) {
    for (auto& [id, handles] : m_handles) {
        if (!adapter.empty() && id != adapter)
            continue;
        handles.insert(handle);
        m_changed(id);
    }
}

void OwnRecords::remove(guint32 handle) {
    m_records.erase(handle);
    for (auto& [id, handles] : m_handles) {
        const auto listed = handles.find(handle);
        if (listed == handles.end())
            continue;
        handles.erase(listed);
        m_changed(id);
    }
}

const OwnRecords::Record* OwnRecords::find(guint32 handle) const {
    const auto found = m_records.find(handle);
    return found == m_records.end() ? nullptr : &found->second;
}

guint32 OwnRecords::classBits(const std::string& adapter) const {
    guint32 bits = 0;
    for (const guint32 handle : m_handles.at(adapter))
        if (const Record* record = find(handle); record && !record->owner.empty())
            for (const ServiceBits& known : serviceBits)
                bits |= fullUuid(known.uuid) == record->uuid ? known.bits << 16 : 0;
    return bits;
}

std::vector<std::string> OwnRecords::uuids(const std::string& adapter) const {
    std::vector<std::string> result;
    for (const guint32 handle : m_handles.at(adapter))
        if (const Record* record = find(handle); record && !record->uuid.empty())
            result.push_back(record->uuid);
    return result;
}

} // namespace Bluetooth::Sim
