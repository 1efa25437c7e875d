// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_VERBS_LIST_H
#define KESBT_VERBS_LIST_H

#include "command/verb.h"

/// All verbs, in the order of the program's help. Each is defined in a file of its own in this
/// folder as NAMEVerb.
#define KESBT_VERBS(VERB)                                                                          \
    VERB(names)                                                                                    \
    VERB(monitor)                                                                                  \
    VERB(wait)                                                                                     \
    VERB(adapters)                                                                                 \
    VERB(adapter)                                                                                  \
    VERB(discover)                                                                                 \
    VERB(scan)                                                                                     \
    VERB(devices)                                                                                  \
    VERB(device)                                                                                   \
    VERB(create)                                                                                   \
    VERB(disconnect)                                                                               \
    VERB(remove)                                                                                   \
    VERB(services)                                                                                 \
    VERB(input)                                                                                    \
    VERB(network)                                                                                  \
    VERB(serial)                                                                                   \
    VERB(pair)                                                                                     \
    VERB(cancel)                                                                                   \
    VERB(agent)                                                                                    \
    VERB(audio)                                                                                    \
    VERB(headset)                                                                                  \
    VERB(volume)                                                                                   \
    VERB(autoconnect)                                                                              \
    VERB(name)                                                                                     \
    VERB(restartDaemon)

namespace Kesbt {

#define KESBT_DECLARE(name) extern const Verb name##Verb;
KESBT_VERBS(KESBT_DECLARE)
#undef KESBT_DECLARE

} // namespace Kesbt

#endif
