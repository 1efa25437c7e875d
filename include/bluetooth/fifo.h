#ifndef KESBLUETOOTH_FIFO_H
#define KESBLUETOOTH_FIFO_H

#include <bluetooth/export.h>

namespace Bluetooth {

/// One end of a named pipe (FIFO). The pipe's file is created where it is missing, with mode 0666
/// less the process's umask, and is never removed. What stands at the path is not checked: an
/// ordinary file is read or written like a pipe.
///
/// Threads: one thread at a time may use a Fifo. It gives no access to its descriptor, which is
/// close-on-exec and is closed by the destructor.
class KESBLUETOOTH_API Fifo {
public:
    /// Opens the reading end. Blocks until some process has the pipe open for writing.
    /// @param path must not be null
    /// @return a new Fifo, deleted by the caller; null with errno set on failure (logged), also
    ///         when a signal handler interrupts the wait (EINTR) and for a null path (EINVAL)
    static Fifo* getReadFifo(const char* path);

    /// Opens the writing end without ever waiting.
    /// @return a new Fifo, deleted by the caller; null with errno set on failure (logged). ENXIO
    ///         is the ordinary case that no process has the pipe open for reading, EINVAL a null
    ///         path.
    static Fifo* getWriteFifo(const char* path);

    Fifo(const Fifo&) = delete;
    Fifo& operator=(const Fifo&) = delete;
    virtual ~Fifo();

    /// Writes once. Up to 4096 bytes (PIPE_BUF) are written whole or not at all.
    /// @param data   what to write; null fails
    /// @param length number of bytes
    /// @return 0 when all was written; -1 otherwise (logged, except for null data): the pipe is
    ///         full or has no reader any more. No SIGPIPE is raised.
    int writeData(const void* data, int length);

    /// Reads once, waiting for the first byte.
    /// @param buffer receives the bytes
    /// @param length the buffer's size in bytes
    /// @return 0, also at the end of the data and for fewer bytes than asked for; -1 on failure
    ///         (logged). The number of bytes is deliberately not told: clear the buffer first and
    ///         look at what it holds.
    int readData(void* buffer, int length);

private:
    explicit Fifo(int descriptor) : m_descriptor(descriptor) {}

    int m_descriptor = -1;
};

} // namespace Bluetooth

#endif
