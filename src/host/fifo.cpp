// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/fifo.h>

#include "core/log.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

namespace Bluetooth {

namespace {

constexpr mode_t pipeMode = 0666;

/// @return the descriptor, or -1 with errno set
int openPipe(const char* path, int flags) {
    if (!path) {
        errno = EINVAL;
        return -1;
    }
    if (mkfifo(path, pipeMode) != 0 && errno != EEXIST)
        return -1;
    return open(path, flags | O_CLOEXEC);
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
    const int descriptor = openPipe(path, O_RDONLY);
    if (descriptor >= 0)
        return new Fifo(descriptor);

    const int error = errno;
    logError(KES_HERE, "Error opening the named file.");
    errno = error;
    return nullptr;
}

Fifo* Fifo::getWriteFifo(const char* path) {
    const int descriptor = openPipe(path, O_WRONLY | O_NONBLOCK);
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
        logError(KES_HERE, "Error writing the data to the pipe file.");
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
