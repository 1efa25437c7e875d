#include <bluetooth/commandlib.h>

#include "core/log.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <string>

namespace Bluetooth {

namespace {

// Readers of the log know these lines under this name.
constexpr const char* LOG_FILE = "auto_connect.cpp";
constexpr int FLAG_CLOSE_ON_EXEC = 1;
constexpr mode_t PID_FILE_MODE = 0600;

bool setCloseOnExec(int descriptor, const char* path) {
    const int flags = fcntl(descriptor, F_GETFD);
    if (flags < 0) {
        logError({LOG_FILE, __LINE__}, "Can not get flags for PID file %s", path);
        return false;
    }
    if (fcntl(descriptor, F_SETFD, flags | FD_CLOEXEC) < 0) {
        logError({LOG_FILE, __LINE__}, "Could not set flags for PID file '%s'", path);
        return false;
    }
    return true;
}

bool lockWhole(int descriptor, const char* path, bool reportLocked) {
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET;
    if (fcntl(descriptor, F_SETLK, &lock) == 0)
        return true;

    const int error = errno;
    if (error != EAGAIN && error != EACCES)
        logError({LOG_FILE, __LINE__}, "Unable to lock PID file '%s'", path);
    else if (reportLocked)
        logError({LOG_FILE, __LINE__}, "PID file '%s' is locked; Daemon is already running", path);
    errno = error;
    return false;
}

bool writePid(int descriptor, const char* path) {
    if (ftruncate(descriptor, 0) != 0) {
        logError({LOG_FILE, __LINE__}, "Could not truncate PID file '%s'", path);
        return false;
    }
    const std::string text = std::to_string(getpid()) + '\n';
    if (write(descriptor, text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
        // Reads like a note of progress; it is the failure's message, and is kept as it is.
        logError({LOG_FILE, __LINE__}, "Writing to PID file '%s'", path);
        return false;
    }
    return true;
}

} // namespace

int createPidFile(const char* path, int flags, bool reportLocked) {
    const int descriptor = path ? open(path, O_RDWR | O_CREAT, PID_FILE_MODE) : -1;
    if (descriptor < 0) {
        const int error = path ? errno : EINVAL;
        logError({LOG_FILE, __LINE__}, "Could not open PID file %s", path ? path : "(null)");
        errno = error;
        return -1;
    }
    const bool closeOnExec = (flags & FLAG_CLOSE_ON_EXEC) != 0;
    if ((!closeOnExec || setCloseOnExec(descriptor, path)) &&
        lockWhole(descriptor, path, reportLocked) && writePid(descriptor, path))
        return descriptor;

    const int error = errno;
    close(descriptor);
    errno = error;
    return -1;
}

} // namespace Bluetooth
