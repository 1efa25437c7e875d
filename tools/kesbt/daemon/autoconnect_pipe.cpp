// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/autoconnect_pipe.h"

#include "show/failure.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

namespace Kesbt {

namespace {

using Bluetooth::AutoConnect;

constexpr char pipePath[] = "/tmp/kes_bluetooth_autoconnect";
constexpr char restart[] = "start the auto-connect daemon again: kesbt-autoconnectd";

/// Why the auto-connect daemon was sent nothing.
Failure notSent(int reason) {
    switch (reason) {
    case ENOENT:
    case ENXIO:
    case EPIPE:
        return Failure("no auto-connect daemon takes commands; start it: kesbt-autoconnectd");
    case EAGAIN:
        return Failure(
            std::string("the auto-connect daemon does not read its commands; stop it, then ") +
            restart);
    case EACCES:
        return Failure("no permission to command the auto-connect daemon; run it as root");
    case ELOOP:
        return Failure(std::string(pipePath) +
                       " is not the auto-connect daemon's pipe; remove it and " + restart);
    default:
        return Failure(std::string("cannot use ") + pipePath + ": " + std::strerror(reason) + "; " +
                       restart);
    }
}

/// Finds out whether a daemon reads its pipe, without making one, which any user could then read:
/// the daemon's pipe is its own user's only, and locked. @return 0 or an error
int lookForDaemon() {
    constexpr mode_t permissions = 0777;
    constexpr mode_t daemonsMode = 0600;
    struct stat status {};
    if (lstat(pipePath, &status) != 0)
        return errno;
    if (!S_ISFIFO(status.st_mode) || (status.st_uid != 0 && status.st_uid != geteuid()))
        return ELOOP;
    if ((status.st_mode & permissions) != daemonsMode)
        return ENXIO;
    const int pipe = open(pipePath, O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (pipe < 0)
        return errno;
    const bool isLocked = flock(pipe, LOCK_SH | LOCK_NB) != 0;
    close(pipe);
    return isLocked ? 0 : ENXIO;
}

} // namespace

void sendToDaemon(bool (AutoConnect::*send)() const) {
    if (const int reason = lookForDaemon())
        throw notSent(reason);
    if (!(AutoConnect().*send)())
        throw notSent(errno);
}

} // namespace Kesbt
