// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_DESCRIPTOR_H
#define KESBLUETOOTH_CORE_DESCRIPTOR_H

#include <unistd.h>

#include <cerrno>
#include <utility>

namespace Bluetooth {

/// A file descriptor that is closed with its owner, which leaves errno as it is: what failed before
/// can still be told afterwards.
class Descriptor {
public:
    /// @param owned may be -1, for a file that could not be opened
    explicit Descriptor(int owned) : m_number(owned) {}
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    ~Descriptor() {
        const int error = errno;
        if (isOpen())
            close(m_number);
        errno = error;
    }

    bool isOpen() const { return m_number >= 0; }
    int number() const { return m_number; }
    /// Gives it to another owner.
    int release() { return std::exchange(m_number, -1); }

private:
    int m_number;
};

} // namespace Bluetooth

#endif
