// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/style.h"

#include <unistd.h>

#include <cstdlib>
#include <cstring>

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

std::string coloured(const std::string& text, Colour colour) {
    static const bool wanted = wantsColour();
    if (!wanted || colour == Colour::Plain || text.empty())
        return text;
    return std::string("\033[") + code(colour) + "m" + text + "\033[0m";
}

} // namespace Kesbt
