// SPDX-License-Identifier: LGPL-2.1-or-later
#include "wait/questions.h"

#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <iostream>
#include <utility>

namespace Kesbt {

bool Questions::canAsk() {
    if (isatty(STDIN_FILENO) == 0 || isatty(STDERR_FILENO) == 0)
        return false;
    const pid_t foreground = tcgetpgrp(STDIN_FILENO);
    return foreground < 0 || foreground == getpgrp(); // below 0: nobody controls jobs there
}

bool Questions::put(Question question) {
    const Lock lock(m_mutex);
    if (m_open || m_hasEnded)
        return false;
    m_open = std::make_shared<const Question>(std::move(question));
    m_wakeup.raise();
    return true;
}

void Questions::withdraw() {
    const Lock lock(m_mutex);
    close();
    m_wakeup.raise();
}

void Questions::end() {
    Lock lock(m_mutex);
    m_hasEnded = true;
    const Open question = close();
    lock.unlock();
    if (question)
        question->refuse();
}

/// @return what was open; null for nothing
Questions::Open Questions::close() {
    if (!m_text.empty())
        std::cerr << '\n'; // whatever is told next begins a line
    m_text.clear();
    m_input.clear();
    return std::exchange(m_open, nullptr);
}

int Questions::inputFd() {
    const Lock lock(m_mutex);
    return m_text.empty() ? -1 : STDIN_FILENO;
}

Clock::time_point Questions::due() {
    const Lock lock(m_mutex);
    return m_open && m_text.empty() ? m_open->due : Clock::time_point::max();
}

void Questions::attend() {
    Lock lock(m_mutex);
    m_wakeup.clear();
    if (!m_open || Clock::now() < m_open->due)
        return;
    if (!m_open->text) {
        const Open question = close();
        lock.unlock();
        question->answer("");
    } else if (m_text.empty()) {
        ask(lock);
    } else {
        takeLine(lock);
    }
}

void Questions::ask(Lock& lock) {
    const Open question = m_open;
    lock.unlock();
    const std::string text = question->text();
    lock.lock();
    if (m_open != question)
        return; // withdrawn meanwhile
    m_text = text;
    tcflush(STDIN_FILENO, TCIFLUSH); // what was typed before the question does not answer it
    std::cerr << m_text << std::flush;
}

/// @return whether a line is complete; at the end of the input, it is ""
bool Questions::readLine(std::string& line) {
    pollfd input{STDIN_FILENO, POLLIN, 0};
    if (poll(&input, 1, 0) <= 0)
        return false;
    char bytes[256];
    const ssize_t length = read(STDIN_FILENO, bytes, sizeof bytes);
    if (length <= 0) {
        std::cerr << '\n';
        return true;
    }
    m_input.append(bytes, static_cast<std::size_t>(length));
    const std::size_t end = m_input.find('\n');
    if (end == std::string::npos)
        return false;
    line = m_input.substr(0, end);
    m_input.clear();
    return true;
}

void Questions::takeLine(Lock& lock) {
    std::string line;
    if (!readLine(line))
        return;
    const std::string mistake = line.empty() ? "" : m_open->check(line);
    if (!mistake.empty()) {
        std::cerr << mistake << '\n' << m_text << std::flush;
        return;
    }
    m_text.clear(); // the end of its line is on the terminal already
    const Open question = close();
    lock.unlock();
    if (line.empty())
        question->refuse();
    else
        question->answer(line);
}

} // namespace Kesbt
