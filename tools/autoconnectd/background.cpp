// SPDX-License-Identifier: LGPL-2.1-or-later
#include "background.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

namespace AutoConnectd {

namespace {

[[noreturn]] void waitForReady(int descriptor) {
    char byte = 0;
    ssize_t got = -1;
    do
        got = read(descriptor, &byte, 1);
    while (got < 0 && errno == EINTR);
    _exit(got == 1 ? EXIT_SUCCESS : EXIT_FAILURE);
}

} // namespace

Background::~Background() {
    if (m_starter >= 0)
        close(m_starter);
}

bool Background::enter() {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0)
        return false;
    const pid_t child = fork();
    if (child > 0) {
        close(ends[1]);
        waitForReady(ends[0]);
    }
    close(ends[0]);
    m_starter = ends[1];
    return child == 0 && setsid() >= 0 && chdir("/") == 0;
}

void Background::ready() {
    if (m_starter < 0)
        return;
    const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
    for (int standard = STDIN_FILENO; standard <= STDERR_FILENO; ++standard)
        dup2(null, standard);
    if (null > STDERR_FILENO)
        close(null);
    [[maybe_unused]] const ssize_t written = write(m_starter, "1", 1);
    close(m_starter);
    m_starter = -1;
}

} // namespace AutoConnectd
