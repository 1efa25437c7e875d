// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_VERB_H
#define KESBT_COMMAND_VERB_H

#include "command/completion.h"
#include "command/options.h"

#include <CLI/CLI.hpp>

#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace Kesbt {

/// Where a form of a verb adds what it takes.
struct Syntax {
    CLI::App& app;
    const Options& options;
    Completion& completion;
};

/// What a form of a verb does once the command line is parsed.
using Action = std::function<void()>;
using Build = std::function<Action(const Syntax&)>;

/// A verb alone, as in "kesbt adapter", or with a word behind it, as in "kesbt adapter set".
struct Form {
    Form(Limit limitOfThis, Build builder) : limit(limitOfThis), build(std::move(builder)) {}
    Form(const char* word, const char* what, Limit limitOfThis, Build builder)
        : name(word), summary(what), limit(limitOfThis), build(std::move(builder)) {}

    const char* name = ""; ///< the word; "" for the verb alone, which comes first
    const char* summary = "";
    Limit limit;
    Build build;
};

/// One verb of the program. A new verb is a file in verbs/ that defines one, and its name in
/// verbs/list.h.
struct Verb {
    const char* name;
    const char* group; ///< heading in the program's help
    const char* summary;
    const char* examples; ///< command lines, one a line
    std::vector<Form> forms;
};

/// What can be offered for an argument, e.g. knownDevices(); it may ask the daemon.
using Offer = std::vector<std::string> (*)(const Options&);

/// Forms that take nothing, or a device.
Build noArguments(void (*action)(const Options&));
using DeviceAction = void (*)(const Options&, const std::string& address);
Build oneDevice(DeviceAction action, Offer offer = nullptr);

/// Arguments that several verbs have. What is returned holds the value once the command line is
/// parsed; actions keep it alive by copying it.
std::shared_ptr<std::string> addAddress(const Syntax& syntax, Offer offer = nullptr);
std::shared_ptr<double> addSeconds(const Syntax& syntax, const std::string& name,
                                   const std::string& description);

/// A validator of a positive time. @return what is wrong with it, or ""
std::string checkSeconds(const std::string& text);

} // namespace Kesbt

#endif
