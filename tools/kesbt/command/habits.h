// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_HABITS_H
#define KESBT_COMMAND_HABITS_H

#include <string>
#include <vector>

namespace Kesbt {

/// What is meant by a word that other Bluetooth programs have and this one has not.
/// @param verb  the verb before the word, or ""
/// @param words the unknown word and those behind it, whose address and value are taken over
/// @return the command as it has to be typed; "" when the word is none of those
std::string habitMeant(const std::string& verb, const std::vector<std::string>& words);

} // namespace Kesbt

#endif
