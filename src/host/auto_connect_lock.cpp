// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/auto_connect_lock.h"

#include "host/auto_connect_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

namespace Bluetooth {

AutoConnectLock::AutoConnectLock()
    : m_file(open(autoConnectPath(".lock").c_str(),
                  O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, S_IRUSR | S_IWUSR)) {
    struct stat status {};
    if (!m_file.isOpen() || fstat(m_file.number(), &status) != 0 || !S_ISREG(status.st_mode))
        return;
    int result = -1;
    do
        result = flock(m_file.number(), LOCK_EX);
    while (result != 0 && errno == EINTR);
    m_isHeld = result == 0;
}

AutoConnectLock::~AutoConnectLock() {
    // Closing alone would leave it with a process that was forked meanwhile and started no program.
    if (m_isHeld)
        flock(m_file.number(), LOCK_UN);
}

} // namespace Bluetooth
