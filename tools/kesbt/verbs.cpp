#include "command/verb.h"

/// All verbs, in the order of the program's help. Each is defined in the file of its name in
/// verbs/ as NAMEVerb.
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
    VERB(remove)                                                                                   \
    VERB(services)                                                                                 \
    VERB(pair)                                                                                     \
    VERB(cancel)                                                                                   \
    VERB(agent)                                                                                    \
    VERB(audio)                                                                                    \
    VERB(volume)                                                                                   \
    VERB(autoconnect)                                                                              \
    VERB(name)                                                                                     \
    VERB(restartDaemon)

namespace Kesbt {

#define KESBT_DECLARE(name) extern const Verb name##Verb;
KESBT_VERBS(KESBT_DECLARE)

const std::vector<const Verb*>& allVerbs() {
#define KESBT_ENTRY(name) &name##Verb,
    static const std::vector<const Verb*> verbs = {KESBT_VERBS(KESBT_ENTRY)};
    return verbs;
}

} // namespace Kesbt
