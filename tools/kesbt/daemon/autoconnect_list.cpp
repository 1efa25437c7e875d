// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/autoconnect_list.h"

#include "show/failure.h"
#include "show/text.h"

#include <bluetooth/auto_connect.h>

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <sstream>

namespace Kesbt {

namespace {

constexpr char folder[] = "/etc/bluetooth/autoconnect/";

Failure unusable(const std::string& path, int reason) {
    const bool denied = reason == EACCES || reason == EPERM;
    return Failure("cannot use " + path + ": " + std::strerror(reason) + "; " +
                   (denied ? "run it as root" : "make the file writable or remove it"));
}

/// Why the file cannot be written, without changing anything.
int writeError(const std::string& path) {
    struct stat status {};
    if (stat(path.c_str(), &status) == 0 && !S_ISREG(status.st_mode))
        return S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
    if (access(path.c_str(), R_OK | W_OK) == 0)
        return 0;
    if (errno != ENOENT)
        return errno;
    // It would be created, and the folder where that is missing.
    for (std::string parent = folder; parent.size() > 1;) {
        parent.resize(parent.rfind('/'));
        if (access(parent.empty() ? "/" : parent.c_str(), W_OK | X_OK) == 0)
            return 0;
        if (errno != ENOENT)
            return errno;
    }
    return ENOENT;
}

} // namespace

AutoConnectList::AutoConnectList(const std::string& adapter)
    : m_adapter(adapter), m_path(folder + adapter) {
    read();
}

void AutoConnectList::read() {
    struct stat status {};
    if (stat(m_path.c_str(), &status) != 0) {
        if (errno != ENOENT)
            throw unusable(m_path, errno);
        return;
    }
    if (!S_ISREG(status.st_mode))
        throw unusable(m_path, S_ISDIR(status.st_mode) ? EISDIR : EINVAL);
    std::ifstream file(m_path, std::ios::binary);
    if (!file)
        throw unusable(m_path, errno);
    m_content.assign(std::istreambuf_iterator<char>(file), {});
    // Editors end files with a line break, which would be part of the last address.
    m_content.erase(m_content.find_last_not_of("\r\n") + 1);
}

bool AutoConnectList::isEnabled() const {
    return std::strtol(m_content.c_str(), nullptr, 10) != 0;
}

std::vector<std::string> AutoConnectList::devices() const {
    constexpr std::size_t firstEntry = 2; // after the flag and a comma
    std::vector<std::string> entries;
    std::istringstream stream(m_content.size() > firstEntry ? m_content.substr(firstEntry) : "");
    for (std::string entry; std::getline(stream, entry, ',');)
        entries.push_back(entry);
    return entries;
}

bool AutoConnectList::has(const std::string& device) const {
    for (const std::string& entry : devices()) {
        if (upperCase(entry) == device)
            return true;
    }
    return false;
}

void AutoConnectList::add(const std::string& device) {
    // A list that ends with a comma has its place for an entry already.
    m_content += (!list().empty() && list().back() == ',' ? "" : ",") + device;
}

void AutoConnectList::remove(const std::string& device) {
    std::string kept;
    for (const std::string& entry : devices()) {
        if (upperCase(entry) != device)
            kept += ',' + entry;
    }
    m_content.replace(std::min<std::size_t>(1, m_content.size()), std::string::npos, kept);
}

void AutoConnectList::checkWritable() const {
    if (const int reason = writeError(m_path))
        throw unusable(m_path, reason);
}

void AutoConnectList::write(bool enable) {
    checkWritable();
    const std::string wanted = (enable ? "1" : "0") + list();
    if (list().find('\0') != std::string::npos)
        throw Failure(m_path + " has bytes that are no text; remove the file and begin anew");
    if (!Bluetooth::AutoConnect().set(m_adapter.c_str(), enable, list().c_str()))
        throw Failure("cannot write " + m_path + "; look into the system log for the reason");
    read();
    if (m_content != wanted)
        throw Failure(m_path + " was not written whole; free space on the disk and try again");
}

} // namespace Kesbt
