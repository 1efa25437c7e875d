// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command_pipe.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <thread>

namespace AutoConnectd {

namespace {

// Who commands the daemon decides what is connected: that is for those who may write the lists.
constexpr mode_t pipeMode = 0600;
constexpr mode_t permissionBits = 07777;
constexpr std::size_t readSize = 65536; // what a pipe holds
constexpr int attempts = 100;           // against someone who always is faster

bool isPipeOfThisUser(const struct stat& status) {
    return S_ISFIFO(status.st_mode) && status.st_uid == geteuid();
}

/// A pipe that others could open is not taken over: they may have it open still, and locked.
bool mayTakeOver(const struct stat& status) {
    return isPipeOfThisUser(status) && (status.st_mode & permissionBits) == pipeMode;
}

/// What is not the daemon's is not opened, not even for a moment: what is written to a pipe just
/// then would be lost, and its sender not told.
/// @return -1 when it is not the daemon's, or cannot be opened
int openOwn(const char* path, bool isNew) {
    const int place = open(path, O_PATH | O_NOFOLLOW | O_CLOEXEC);
    if (place < 0)
        return -1;
    struct stat status {};
    int pipe = -1;
    if (fstat(place, &status) == 0 && (isNew ? isPipeOfThisUser(status) : mayTakeOver(status)))
        pipe = open(("/proc/self/fd/" + std::to_string(place)).c_str(),
                    O_RDWR | O_NONBLOCK | O_CLOEXEC);
    close(place);
    if (pipe >= 0)
        fchmod(pipe, pipeMode); // whatever the umask has left of it
    return pipe;
}

/// A folder with something in it is not for us to remove.
bool setAside(const char* folder) {
    std::string aside = std::string(folder) + ".XXXXXX";
    if (!mkdtemp(aside.data()))
        return false;
    if (rename(folder, aside.c_str()) == 0)
        return true;
    const int error = errno;
    rmdir(aside.c_str());
    errno = error;
    return false;
}

/// Takes away what stands in the place of the pipe, except for a pipe that has been made there
/// meanwhile by a daemon that starts at the same time. @return false with errno set
bool clearPlace(const char* path) {
    struct stat status {};
    if (lstat(path, &status) != 0)
        return errno == ENOENT;
    if (geteuid() != 0 && !isPipeOfThisUser(status)) {
        errno = EPERM;
        return false;
    }
    return mayTakeOver(status) || std::remove(path) == 0 || errno == ENOENT ||
           (errno == ENOTEMPTY && setAside(path));
}

/// kesbt finds out whether a daemon has the lock by taking it for a moment.
bool lock(int pipe) {
    for (int attempt = 1; flock(pipe, LOCK_EX | LOCK_NB) != 0; ++attempt) {
        if (attempt == 10)
            return false;
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return true;
}

} // namespace

std::unique_ptr<CommandPipe> CommandPipe::open(const std::string& path, std::string& problem) {
    for (int attempt = 0; attempt < attempts; ++attempt) {
        const bool isNew = mkfifo(path.c_str(), pipeMode) == 0;
        if (!isNew && errno != EEXIST) {
            problem = "cannot create the pipe " + path + ": " + strerror(errno);
            return nullptr;
        }
        std::unique_ptr<CommandPipe> pipe(new CommandPipe(path, openOwn(path.c_str(), isNew)));
        if (pipe->m_descriptor < 0) {
            if (clearPlace(path.c_str()))
                continue;
            problem = "cannot replace " + path +
                      ", which is no pipe of this user's own: " + strerror(errno) +
                      "; remove it and start again";
            return nullptr;
        }
        if (!lock(pipe->m_descriptor)) {
            problem = "another kesbt-autoconnectd reads " + path + "; stop it first";
            return nullptr;
        }
        pipe->watch();
        if (pipe->isCurrent())
            return pipe;
    }
    problem = path + " cannot be opened, or is replaced again and again; find out by whom, and "
                     "start again";
    return nullptr;
}

CommandPipe::~CommandPipe() {
    for (const int descriptor : {m_descriptor, m_watch}) {
        if (descriptor >= 0)
            close(descriptor);
    }
}

/// The pipe is watched, not its folder, where others come and go all the time. Without a watch the
/// main loop finds out when it wakes for something else.
void CommandPipe::watch() {
    m_watch = inotify_init1(IN_CLOEXEC | IN_NONBLOCK);
    // Removing a file changes its number of links, an attribute.
    inotify_add_watch(m_watch, m_path.c_str(), IN_ATTRIB | IN_MOVE_SELF | IN_DONT_FOLLOW);
}

bool CommandPipe::isCurrent() const {
    char events[1024]; // only that there are some counts
    while (::read(m_watch, events, sizeof events) > 0) {
    }
    struct stat now {};
    struct stat mine {};
    return lstat(m_path.c_str(), &now) == 0 && fstat(m_descriptor, &mine) == 0 &&
           now.st_ino == mine.st_ino && now.st_dev == mine.st_dev;
}

std::vector<Command> CommandPipe::read() {
    std::string bytes(readSize, '\0');
    const ssize_t length = ::read(m_descriptor, bytes.data(), bytes.size());
    bytes.resize(length < 0 ? 0 : static_cast<std::size_t>(length));
    std::vector<Command> commands = m_splitter.feed(bytes);
    m_unknown.add(m_splitter.takeUnknown());

    const auto bothReload = [](Command one, Command next) {
        return one == Command::Reload && next == Command::Reload;
    };
    commands.erase(std::unique(commands.begin(), commands.end(), bothReload), commands.end());
    return commands;
}

} // namespace AutoConnectd
