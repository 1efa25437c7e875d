// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command_pipe.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace AutoConnectd {

namespace {

constexpr mode_t pipeMode = 0666;
constexpr std::size_t readSize = 512;

bool isPipe(int descriptor) {
    struct stat status {};
    return fstat(descriptor, &status) == 0 && S_ISFIFO(status.st_mode);
}

} // namespace

std::unique_ptr<CommandPipe> CommandPipe::open(const std::string& path, std::string& problem) {
    problem.clear();
    if (mkfifo(path.c_str(), pipeMode) != 0 && errno != EEXIST) {
        problem = "cannot create the pipe " + path + ": " + strerror(errno);
        return nullptr;
    }
    const int keeper = ::open(path.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC);
    if (keeper < 0) {
        problem = "cannot open the pipe " + path + ": " + strerror(errno);
        return nullptr;
    }
    std::unique_ptr<CommandPipe> pipe(new CommandPipe(path, keeper));
    if (isPipe(keeper))
        pipe->m_fifo.reset(Bluetooth::Fifo::getReadFifo(path.c_str()));
    if (!pipe->m_fifo) {
        problem = path + " is not a pipe that can be read; remove it and start again";
        return nullptr;
    }
    return pipe;
}

CommandPipe::~CommandPipe() {
    close(m_keeper);
}

bool CommandPipe::isCurrent() const {
    struct stat now {};
    struct stat mine {};
    return stat(m_path.c_str(), &now) == 0 && fstat(m_keeper, &mine) == 0 &&
           now.st_ino == mine.st_ino && now.st_dev == mine.st_dev;
}

std::vector<Command> CommandPipe::read() {
    // Cleared, since the number of bytes read is not told.
    std::string bytes(readSize, '\0');
    if (m_fifo->readData(bytes.data(), static_cast<int>(bytes.size())) != 0)
        return {};
    bytes.erase(bytes.find_last_not_of('\0') + 1);
    std::vector<Command> commands = m_splitter.feed(bytes);
    const std::string unknown = m_splitter.takeUnknown();
    if (!unknown.empty())
        syslog(LOG_WARNING, "no command: \"%s\"", unknown.c_str());

    const auto bothReload = [](Command one, Command next) {
        return one == Command::Reload && next == Command::Reload;
    };
    commands.erase(std::unique(commands.begin(), commands.end(), bothReload), commands.end());
    return commands;
}

} // namespace AutoConnectd
