// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_COMMAND_LINE_H
#define KESBT_COMMAND_COMMAND_LINE_H

#include "command/verb.h"

#include <string>
#include <vector>

namespace Kesbt {

/// The program's command line: the options of every verb, the verbs and the help.
class CommandLine {
public:
    /// @param adapters what is offered for --adapter
    CommandLine(std::vector<const Verb*> verbs, Offer adapters);

    /// Runs the verb that is named, within the limit that it declares. A Failure when the words
    /// cannot be meant so, or the verb fails. Hidden: behind "--complete" the words are completed.
    void run(int argc, const char* const* argv);

private:
    void addOptions(Offer adapters);
    void printCompletions(const std::vector<std::string>& words);
    void addVerbs(const std::string& first);
    void add(const Verb& verb);
    void setAction(CLI::App& app, const Form& form);

    const std::vector<const Verb*> m_verbs;
    Options m_options;
    CLI::App m_program;
    Completion m_completion;
};

} // namespace Kesbt

#endif
