// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/fifo.h>

#include "core/descriptor.h"
#include "core/log.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>
#include <string>

namespace Bluetooth {

namespace {

constexpr mode_t pipeMode = 0666;

/// What another user made may be anything, and whoever made a pipe reads what is written to it.
bool isTrustedPipe(const struct stat& status) {
    return S_ISFIFO(status.st_mode) && (status.st_uid == 0 || status.st_uid == geteuid());
}

/// Opens what stands at the path, waiting for nothing, and a pipe only.
/// @param access O_WRONLY, or O_PATH for a descriptor that can do nothing yet
/// @return the descriptor; -1 with errno set, except for a null path
int openPipe(const char* path, int access) {
    if (!path)
        return -1;
    if (mkfifo(path, pipeMode) != 0 && errno != EEXIST)
        return -1;
    const int descriptor = open(path, access | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (descriptor < 0)
        return -1;
    struct stat status {};
    if (fstat(descriptor, &status) == 0 && isTrustedPipe(status))
        return descriptor;
    close(descriptor);
    errno = S_ISLNK(status.st_mode) ? ELOOP : EACCES; // O_PATH opens links
    return -1;
}

/// Opens the reading end of the very pipe that was looked at, and waits for a writer. Had it been
/// open for reading while it was looked at, a writer could have come and gone unnoticed.
int openForReading(const char* path) {
    const Descriptor pipe(openPipe(path, O_PATH));
    return pipe.isOpen() ? open(("/proc/self/fd/" + std::to_string(pipe.number())).c_str(),
                                O_RDONLY | O_CLOEXEC)
                         : -1;
}

/// write() for a pipe whose reader may have gone: EPIPE instead of a signal that ends the process.
ssize_t writeOnce(int descriptor, const void* data, std::size_t length) {
    sigset_t pipeSignal;
    sigemptyset(&pipeSignal);
    sigaddset(&pipeSignal, SIGPIPE);
    sigset_t pending;
    sigpending(&pending);
    const bool alreadyPending = sigismember(&pending, SIGPIPE) == 1;

    sigset_t before;
    pthread_sigmask(SIG_BLOCK, &pipeSignal, &before);
    const ssize_t written = write(descriptor, data, length);
    const int error = errno;
    if (written < 0 && error == EPIPE && !alreadyPending) {
        const timespec now{};
        while (sigtimedwait(&pipeSignal, nullptr, &now) < 0 && errno == EINTR) {
        }
    }
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
    errno = error;
    return written;
}

} // namespace

Fifo* Fifo::getReadFifo(const char* path) {
    const int descriptor = openForReading(path);
    if (descriptor >= 0)
        return new Fifo(descriptor);

    const int error = errno;
    logError(KES_HERE, "Error opening the named file.");
    errno = error;
    return nullptr;
}

Fifo* Fifo::getWriteFifo(const char* path) {
    const int descriptor = openPipe(path, O_WRONLY);
    if (descriptor >= 0)
        return new Fifo(descriptor);

    const int error = errno;
    logError(KES_HERE, "Error opening the named file %s, errno is %d.", path ? path : "(null)",
             error);
    // That nobody reads the pipe is ordinary and worth one line only.
    if (error != ENXIO)
        logError(KES_HERE, "Error opening the named file.");
    errno = error;
    return nullptr;
}

Fifo::~Fifo() {
    if (m_descriptor >= 0)
        close(m_descriptor);
}

int Fifo::writeData(const void* data, int length) {
    if (!data || m_descriptor < 0)
        return -1;
    if (length < 0 || writeOnce(m_descriptor, data, static_cast<std::size_t>(length)) != length) {
        const int error = errno;
        logError(KES_HERE, "Error writing the data to the pipe file.");
        errno = error;
        return -1;
    }
    return 0;
}

int Fifo::readData(void* buffer, int length) {
    if (m_descriptor < 0)
        return -1;
    if (length < 0 || read(m_descriptor, buffer, static_cast<std::size_t>(length)) < 0) {
        logError(KES_HERE, "Error reading the data to the pipe file.");
        return -1;
    }
    return 0;
}

} // namespace Bluetooth
