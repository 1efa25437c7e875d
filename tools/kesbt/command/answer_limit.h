#ifndef KESBT_COMMAND_ANSWER_LIMIT_H
#define KESBT_COMMAND_ANSWER_LIMIT_H

#include "command/options.h"

namespace Kesbt {

/// Holds the library's own calls to the time-out that the user gave: they wait for 25 s, whatever
/// was asked for. While one of these lives, the program ends with one line and status 1 when the
/// time is over. Leaving the bus ends what the daemon did for it. For one thread; an inner one does
/// nothing.
class AnswerLimit {
public:
    /// Before the first; without this, and without a time-out from the user, there is no limit.
    static void set(const Options& options);

    AnswerLimit();
    ~AnswerLimit();
    AnswerLimit(const AnswerLimit&) = delete;
    AnswerLimit& operator=(const AnswerLimit&) = delete;
};

} // namespace Kesbt

#endif
