// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/pid_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

namespace Bluetooth {

namespace {

constexpr int closeOnExecFlag = 1;
constexpr mode_t pidFileMode = 0600;

/// A file that has another name is another program's too.
bool hasOneName(int descriptor) {
    struct stat status {};
    if (fstat(descriptor, &status) != 0)
        return false;
    if (status.st_nlink <= 1)
        return true;
    errno = EMLINK;
    return false;
}

bool setCloseOnExec(int descriptor, PidFileFailure& failure) {
    failure = PidFileFailure::GetFlags;
    const int flags = fcntl(descriptor, F_GETFD);
    if (flags < 0)
        return false;
    failure = PidFileFailure::SetFlags;
    return fcntl(descriptor, F_SETFD, flags | FD_CLOEXEC) == 0;
}

bool lockWhole(int descriptor, PidFileFailure& failure) {
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET;
    if (fcntl(descriptor, F_SETLK, &lock) == 0)
        return true;
    const bool byOther = errno == EAGAIN || errno == EACCES;
    failure = byOther ? PidFileFailure::LockedByOther : PidFileFailure::Lock;
    return false;
}

bool writePid(int descriptor, PidFileFailure& failure) {
    failure = PidFileFailure::Truncate;
    if (ftruncate(descriptor, 0) != 0)
        return false;
    failure = PidFileFailure::Write;
    const std::string text = std::to_string(getpid()) + '\n';
    return write(descriptor, text.data(), text.size()) == static_cast<ssize_t>(text.size());
}

} // namespace

int lockPidFile(const char* path, int flags, PidFileFailure& failure) {
    failure = PidFileFailure::Open;
    if (!path) {
        errno = EINVAL;
        return -1;
    }
    const int descriptor =
        open(path, O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY, pidFileMode);
    if (descriptor < 0)
        return -1;
    const bool closeOnExec = (flags & closeOnExecFlag) != 0;
    if (hasOneName(descriptor) && (!closeOnExec || setCloseOnExec(descriptor, failure)) &&
        lockWhole(descriptor, failure) && writePid(descriptor, failure))
        return descriptor;

    const int error = errno;
    close(descriptor);
    errno = error;
    return -1;
}

} // namespace Bluetooth
