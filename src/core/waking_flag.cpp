// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/waking_flag.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

namespace Bluetooth {

void WakingFlag::raise() {
    m_raised = true;
    const int fd = m_fd;
    if (fd < 0)
        return;
    const int error = errno;
    const std::uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = write(fd, &one, sizeof one);
    errno = error;
}

void WakingFlag::lower() {
    m_raised = false;
    calm();
}

bool WakingFlag::open() {
    if (m_fd >= 0)
        return true;
    const int fd = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    int none = -1;
    if (fd >= 0 && !m_fd.compare_exchange_strong(none, fd))
        close(fd); // another thread was first
    return m_fd >= 0;
}

void WakingFlag::calm() {
    const int fd = m_fd;
    eventfd_t count = 0;
    if (fd < 0 || isRaised() || eventfd_read(fd, &count) != 0 || !isRaised())
        return;
    eventfd_write(fd, count); // raised meanwhile
}

} // namespace Bluetooth
