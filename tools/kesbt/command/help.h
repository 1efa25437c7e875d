// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_HELP_H
#define KESBT_COMMAND_HELP_H

#include <CLI/CLI.hpp>

#include <string>

namespace Kesbt {

/// Lays the help out: 80 columns, or as many as the terminal has when it has less.
class Help : public CLI::Formatter {
public:
    Help();
    std::string make_help(const CLI::App* app, std::string name,
                          CLI::AppFormatMode mode) const override;
    std::string make_option_opts(const CLI::Option* option) const override;
};

} // namespace Kesbt

#endif
