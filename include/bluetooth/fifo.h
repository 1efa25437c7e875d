// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_FIFO_H
#define KESBLUETOOTH_FIFO_H

#include <bluetooth/export.h>

namespace Bluetooth {

/// One end of a named pipe (FIFO). A missing pipe is created, with mode 0666 less the process's
/// umask, and never removed. Only a pipe that belongs to root or to the effective user of the
/// process is used: anything else at the path (a symbolic link, a file, a folder, a device, another
/// user's pipe) is refused before anything is read, written or waited for.
///
/// Threads: one thread at a time may use a Fifo. Its descriptor is private and close-on-exec; the
/// destructor closes it.
class KESBLUETOOTH_API Fifo {
public:
    /// Opens the reading end. Blocks until some process opens the pipe for writing. Needs /proc.
    /// @param path null fails
    /// @return a new Fifo, deleted by the caller; null with errno set on failure (logged): EACCES
    ///         or ELOOP for what is refused, EINTR when a signal handler interrupts the wait. A
    ///         null path leaves errno as it was.
    static Fifo* getReadFifo(const char* path);

    /// Opens the writing end. Never waits.
    /// @param path null fails
    /// @return a new Fifo, deleted by the caller; null with errno set on failure (logged): ENXIO
    ///         when no process has the pipe open for reading; EACCES, ELOOP for a symbolic link or
    ///         EISDIR for what is refused. A null path leaves errno as it was.
    static Fifo* getWriteFifo(const char* path);

    Fifo(const Fifo&) = delete;
    Fifo& operator=(const Fifo&) = delete;
    virtual ~Fifo();

    /// Writes once. Up to 4096 bytes (PIPE_BUF) are written whole or not at all.
    /// @param data   what to write; null fails
    /// @param length number of bytes
    /// @return 0 when all was written; -1 otherwise (logged, except for null data): the pipe is
    ///         full or has lost its reader. No SIGPIPE is raised.
    int writeData(const void* data, int length);

    /// Reads once, waiting for the first byte.
    /// @param buffer receives the bytes
    /// @param length the buffer's size in bytes
    /// @return 0, also at the end of the data and for fewer bytes than `length`; -1 on failure
    ///         (logged). On purpose the number of bytes is not returned: clear the buffer first and
    ///         look at its contents.
    int readData(void* buffer, int length);

private:
    explicit Fifo(int descriptor) : m_descriptor(descriptor) {}

    int m_descriptor = -1;
};

} // namespace Bluetooth

#endif
