#ifndef KESBT_COMMAND_COMMAND_LINE_H
#define KESBT_COMMAND_COMMAND_LINE_H

#include "command/verb.h"

#include <vector>

namespace Kesbt {

/// The program's command line: the options of every verb, the verbs and the help.
class CommandLine {
public:
    explicit CommandLine(const std::vector<const Verb*>& verbs);

    /// Runs the verb that is named, within the limit that it declares. A Failure when the words
    /// cannot be meant so, or the verb fails.
    void run(int argc, const char* const* argv);

private:
    void addOptions();
    void add(const Verb& verb);
    void setAction(CLI::App& app, const Form& form);

    Options m_options;
    CLI::App m_program;
};

} // namespace Kesbt

#endif
