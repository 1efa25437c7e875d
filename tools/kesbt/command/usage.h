// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_USAGE_H
#define KESBT_COMMAND_USAGE_H

#include "show/failure.h"

#include <CLI/CLI.hpp>

namespace Kesbt {

/// What is wrong with the words that could not be parsed, in one line, and where to read on.
Failure usageFailure(const CLI::App& program, const CLI::ParseError& error);

} // namespace Kesbt

#endif
