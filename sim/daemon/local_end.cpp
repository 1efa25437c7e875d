// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/local_end.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <glib.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <iterator>

namespace Bluetooth::Sim {

namespace {

struct Rate {
    const char* text;
    speed_t speed;
};

constexpr Rate rates[] = {{"50", B50},       {"300", B300},     {"600", B600},
                          {"1200", B1200},   {"1800", B1800},   {"2400", B2400},
                          {"4800", B4800},   {"9600", B9600},   {"19200", B19200},
                          {"38400", B38400}, {"57600", B57600}, {"115200", B115200}};

bool beginsWith(const std::string& text, const char* beginning) {
    return text.rfind(beginning, 0) == 0;
}

bool is(const std::string& text, const char* word) {
    return g_ascii_strcasecmp(text.c_str(), word) == 0;
}

int connectTo(int family, const void* address, socklen_t length) {
    const int number = socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (number < 0 || connect(number, static_cast<const sockaddr*>(address), length) == 0)
        return number;
    close(number);
    return -1;
}

} // namespace

std::optional<LocalEnd> LocalEnd::at(const std::string& address) {
    struct stat status {};
    if (stat(address.c_str(), &status) != 0) {
        if (beginsWith(address, "localhost:"))
            return LocalEnd(Kind::Tcp, address);
        return beginsWith(address, "x00") ? std::make_optional(LocalEnd(Kind::Unix, address))
                                          : std::nullopt;
    }
    if (S_ISSOCK(status.st_mode))
        return LocalEnd(Kind::Unix, address);
    if (!S_ISCHR(status.st_mode) || !beginsWith(address, "/dev"))
        return std::nullopt;
    LocalEnd terminal(Kind::Terminal, address);
    const int number = ::open(address.c_str(), O_RDONLY | O_NOCTTY | O_NONBLOCK | O_CLOEXEC);
    if (number < 0)
        return std::nullopt;
    tcgetattr(number, &terminal.m_settings);
    close(number);
    return terminal;
}

int LocalEnd::open() const {
    switch (m_kind) {
    case Kind::Terminal:
        return openTerminal();
    case Kind::Unix:
        return connectUnix();
    default:
        return connectTcp();
    }
}

int LocalEnd::openTerminal() const {
    const int number = ::open(m_address.c_str(), O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC);
    if (number < 0 || tcsetattr(number, TCSANOW, &m_settings) == 0)
        return number;
    close(number);
    return -1;
}

int LocalEnd::connectUnix() const {
    sockaddr_un to{};
    to.sun_family = AF_UNIX;
    const bool isAbstract = beginsWith(m_address, "x00");
    const std::string name = isAbstract ? m_address.substr(3) : m_address;
    name.copy(to.sun_path + (isAbstract ? 1 : 0), sizeof to.sun_path - 2);
    // As the daemon does: the name of an abstract socket is all of these bytes.
    return connectTo(AF_UNIX, &to, sizeof to);
}

int LocalEnd::connectTcp() const {
    const int port = std::atoi(m_address.c_str() + m_address.find(':') + 1);
    if (port <= 0 || port > G_MAXUINT16)
        return -1;
    sockaddr_in to{};
    to.sin_family = AF_INET;
    to.sin_port = htons(static_cast<guint16>(port));
    to.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return connectTo(AF_INET, &to, sizeof to);
}

bool LocalEnd::setRate(const std::string& rate) {
    const auto* found = std::find_if(std::begin(rates), std::end(rates),
                                     [&](const Rate& known) { return rate == known.text; });
    if (found == std::end(rates))
        return false;
    m_settings.c_cflag |= CLOCAL | CREAD;
    cfsetispeed(&m_settings, found->speed);
    cfsetospeed(&m_settings, found->speed);
    return true;
}

bool LocalEnd::setDataBits(unsigned bits) {
    constexpr tcflag_t sizes[] = {CS5, CS6, CS7, CS8};
    if (bits < 5 || bits > 8)
        return false;
    m_settings.c_cflag = (m_settings.c_cflag & ~static_cast<tcflag_t>(CSIZE)) | sizes[bits - 5];
    return true;
}

bool LocalEnd::setStopBits(unsigned bits) {
    if (bits != 1 && bits != 2)
        return false;
    m_settings.c_cflag &= ~static_cast<tcflag_t>(CSTOPB);
    m_settings.c_cflag |= bits == 2 ? CSTOPB : 0;
    return true;
}

bool LocalEnd::setParity(const std::string& parity) {
    const bool odd = is(parity, "odd");
    const bool some = odd || is(parity, "even") || is(parity, "mark");
    if (!some && !is(parity, "none") && !is(parity, "space"))
        return false;
    m_settings.c_cflag &= ~static_cast<tcflag_t>(PARENB | PARODD);
    m_settings.c_cflag |= (some ? PARENB : 0) | (odd ? PARODD : 0);
    return true;
}

} // namespace Bluetooth::Sim
