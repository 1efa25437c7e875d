#ifndef KESBT_COMMAND_VERB_H
#define KESBT_COMMAND_VERB_H

#include "command/options.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <string>
#include <vector>

namespace Kesbt {

/// One verb of the program. A new verb is one file that defines one, and its name in verbs.cpp.
struct Verb {
    const char* name;
    const char* group; ///< heading in the program's help
    const char* summary;
    const char* examples; ///< command lines, one a line
    /// Adds the verb's arguments to `command` and sets what it does as its callback.
    void (*build)(CLI::App& command, const Options& options);
};

const std::vector<const Verb*>& allVerbs();

/// The arguments that several verbs have. What is returned holds its value once the command line
/// is parsed; callbacks keep it alive by copying it.
std::shared_ptr<std::string> addAddress(CLI::App& command);
std::shared_ptr<double> addSeconds(CLI::App& command, const std::string& name,
                                   const std::string& description);

/// A validator of a positive time. @return what is wrong with it, or ""
std::string checkSeconds(const std::string& text);

} // namespace Kesbt

#endif
