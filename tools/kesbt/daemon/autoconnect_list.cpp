// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/autoconnect_list.h"

#include "command/limit.h"
#include "show/failure.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace Kesbt {

namespace {

using Bluetooth::AutoConnect;

constexpr char folder[] = "/etc/bluetooth/autoconnect/";

Failure unusable(const std::string& path, int reason) {
    if (reason == ENOENT) // the folder's own folder comes with BlueZ
        return Failure("there is no /etc/bluetooth for " + path +
                       "; install BlueZ 4, or make it as root: mkdir /etc/bluetooth");
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
    for (const char* parent : {folder, "/etc/bluetooth"}) {
        if (access(parent, W_OK | X_OK) == 0)
            return 0;
        if (errno != ENOENT)
            return errno;
    }
    return ENOENT;
}

} // namespace

AutoConnectList::AutoConnectList(const std::string& adapter) : m_adapter(adapter) {
    if (!AutoConnect().readList(m_adapter.c_str(), m_list))
        throw unusable(path(), errno);
}

std::string AutoConnectList::path() const {
    return folder + m_adapter;
}

void AutoConnectList::checkWritable() const {
    if (const int reason = writeError(path()))
        throw unusable(path(), reason);
}

void AutoConnectList::change(const std::function<void(List&)>& change) {
    checkWritable();
    const auto changeText = [&](List& list) {
        change(list);
        m_list = list;
    };
    // Another program's change may have to end first.
    if (!withinLimit([&] { return AutoConnect().changeList(m_adapter.c_str(), changeText); }))
        throw Failure("cannot write " + path() + "; look into the system log for the reason");
}

} // namespace Kesbt
