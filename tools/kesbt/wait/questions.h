// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_WAIT_QUESTIONS_H
#define KESBT_WAIT_QUESTIONS_H

#include "wait/waiting.h"

#include <functional>
#include <memory>
#include <mutex>
#include <string>

namespace Kesbt {

/// Something that is answered later: by the person at the terminal, or by itself at its time.
struct Question {
    /// What the person is asked; may take a while. None: the answer "" is given at `due`.
    std::function<std::string()> text;
    /// What is wrong with an answer, or "": it is asked again until nothing is.
    std::function<std::string(const std::string& line)> check;
    std::function<void(const std::string& line)> answer;
    /// Called instead of `answer` when the line is empty, or nobody will answer any more.
    std::function<void()> refuse;
    Clock::time_point due;
};

/// Asks at the terminal without blocking anybody: one thread puts questions, and whatever loop
/// waits meanwhile, on any thread, attends to them. One at a time: a line that was meant for one
/// question must never answer another.
class Questions {
public:
    /// Whether somebody can see a question and answer it: standard input and error are terminals,
    /// and the program is in their foreground.
    static bool canAsk();

    /// @return false when another one is open, or after end(): nothing is called then
    bool put(Question question);
    /// Takes the open one away, unanswered.
    void withdraw();
    /// Refuses the open one, and takes no more.
    void end();

    // For the loop: it waits until a descriptor can be read (-1: none) or the time has come, and
    // then attends.
    int wakeFd() const { return m_wakeup.fd(); }
    int inputFd();
    Clock::time_point due();
    /// Asks, reads, answers.
    void attend();
    bool isAsking() { return inputFd() >= 0; }

private:
    using Open = std::shared_ptr<const Question>;
    using Lock = std::unique_lock<std::mutex>;

    void ask(Lock& lock);
    bool readLine(std::string& line);
    void takeLine(Lock& lock);
    Open close();

    std::mutex m_mutex; // for what follows; not held while a text is made or an answer given
    Open m_open;
    std::string m_text;  ///< as it was asked; "" before
    std::string m_input; ///< of a line that is not complete
    bool m_hasEnded = false;
    Wakeup m_wakeup;
};

} // namespace Kesbt

#endif
