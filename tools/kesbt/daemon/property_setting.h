// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_PROPERTY_SETTING_H
#define KESBT_DAEMON_PROPERTY_SETTING_H

#include "command/verb.h"
#include "daemon/objects.h"

namespace Kesbt {

/// Sets properties of one kind of object, whose names and values are given as text.
struct PropertySetting {
    struct Property {
        const char* name;
        bool isBoolean;
    };
    const char* command; ///< e.g. "adapter set"
    const char* hint;    ///< more on values, for the help; may be ""
    const char* examples;
    std::vector<Property> properties; ///< those that the daemon lets be set

    struct Given {
        std::string name; ///< in either case
        std::string value;
    };
    /// Adds the arguments NAME and VALUE, what can be offered for them, and the help. The actions
    /// keep this.
    std::shared_ptr<Given> addArguments(const Syntax& syntax) const;

    /// Sets one, reads it back and prints the old and the new value.
    /// @param subject how messages name the object
    /// @param document the members that a program gets before "property"
    void set(const Options& options, Bluetooth::BluezObject& object, const std::string& subject,
             const Given& given, Json document) const;

private:
    std::string help() const;
    std::string see() const;
};

} // namespace Kesbt

#endif
