// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_OUTPUT_H
#define KESBT_SHOW_OUTPUT_H

#include <bluetooth/variant.h>

#include <nlohmann/json.hpp>

#include <string>

namespace Kesbt {

using Json = nlohmann::ordered_json;

Json toJson(const Bluetooth::Variant& value);
Json toJson(const Bluetooth::Dict& properties);

/// A value for people: "yes" and "no" for booleans, lists joined by ", ".
std::string display(const Json& value);

/// A property for people; "" when there is none of this name.
std::string field(const Json& properties, const char* name);

/// Writes one document, over several lines.
void printDocument(const Json& document);
/// Writes one event of a stream on a line of its own, at once.
void printEvent(const Json& event);
/// Tells a user at a terminal, on standard error, what is waited for; programs get nothing.
void printHint(const std::string& text);
/// Writes what is buffered. A Failure when it cannot be written.
void flushOutput();

/// Two columns for people: each property's name and value, the elements of a list one below the
/// other.
void printProperties(const Json& properties);

/// The time now: in UTC for programs ("2026-01-31T12:34:56.789Z"), local for people
/// ("12:34:56.789").
std::string timeForPrograms();
std::string timeForPeople();

} // namespace Kesbt

#endif
