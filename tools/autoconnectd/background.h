// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_BACKGROUND_H
#define KESBT_AUTOCONNECTD_BACKGROUND_H

namespace AutoConnectd {

/// Goes into the background in a way that the one who started the program learns how the start
/// went: the foreground process waits for ready() and then exits with 0; it exits with 1 when the
/// background process ends without.
class Background {
public:
    Background() = default;
    Background(const Background&) = delete;
    Background& operator=(const Background&) = delete;
    ~Background();

    /// Returns in the background process only; no thread may run yet. @return false with errno set
    bool enter();
    /// Lets the starter go, and lets go of its terminal. Does nothing when enter() was not called.
    void ready();

private:
    int m_starter = -1;
};

} // namespace AutoConnectd

#endif
