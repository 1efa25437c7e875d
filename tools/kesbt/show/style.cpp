// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/style.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <limits>

namespace Kesbt {

namespace {

bool wantsColour() {
    const char* noColour = std::getenv("NO_COLOR");
    const char* terminal = std::getenv("TERM");
    return isatty(STDOUT_FILENO) != 0 && !(noColour && *noColour) && terminal &&
           std::strcmp(terminal, "dumb") != 0;
}

const char* code(Colour colour) {
    switch (colour) {
    case Colour::Bold:
        return "1";
    case Colour::Green:
        return "32";
    case Colour::Yellow:
        return "33";
    case Colour::Red:
        return "31";
    case Colour::Dim:
        return "2";
    case Colour::Plain:
        break;
    }
    return "0";
}

} // namespace

std::size_t lineWidth() {
    constexpr std::size_t unlimited = std::numeric_limits<std::size_t>::max();
    if (isatty(STDOUT_FILENO) == 0)
        return unlimited;
    const char* chosen = std::getenv("COLUMNS");
    if (const long columns = chosen ? std::strtol(chosen, nullptr, 10) : 0; columns > 0)
        return static_cast<std::size_t>(columns);
    winsize size{};
    return ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col
                                                                           : unlimited;
}

std::string coloured(const std::string& text, Colour colour) {
    static const bool wanted = wantsColour();
    if (!wanted || colour == Colour::Plain || text.empty())
        return text;
    return std::string("\033[") + code(colour) + "m" + text + "\033[0m";
}

} // namespace Kesbt
