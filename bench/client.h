// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BENCH_CLIENT_H
#define KESBLUETOOTH_BENCH_CLIENT_H

#include <cstddef>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

/// @file
/// The same work done through each library, in the way that its own documentation shows. What fails
/// throws std::runtime_error: a measurement of failures is none.

namespace Bench {

/// Makes blocking calls on a connection that no other thread reads.
class Caller {
public:
    virtual ~Caller() = default;
    virtual void callNothing() = 0;
    /// @return the text's length
    virtual std::size_t callText() = 0;
    /// Decodes an a{sv} of 15 properties into what the library gives its users for it.
    /// @return the number of entries
    virtual std::size_t callProperties() = 0;
};

/// Listens to the peer's signal Tick on a thread of the library's kind, until it is destroyed.
class Listener {
public:
    using Handler = void (*)(const char* text);
    virtual ~Listener() = default;
    /// A blocking call with a text as its reply, on the listener's own connection, from any thread.
    virtual std::size_t callText() = 0;
};

/// Holds a received dictionary and decodes it again and again.
class Decoder {
public:
    virtual ~Decoder() = default;
    /// Reads all names and values into objects that outlive the message.
    /// @return the number of entries
    virtual std::size_t decode() = 0;
};

/// A library under measurement; what it has no means for is null.
struct Library {
    const char* name;
    std::unique_ptr<Caller> (*caller)();
    std::unique_ptr<Listener> (*listener)(Listener::Handler handler);
    std::unique_ptr<Decoder> (*decoder)(std::size_t entries);
};

extern const Library kesbluetooth;
extern const Library libdbus;       // the limit: nothing but the traffic and a look at each value
extern const Library libdbusShared; // the same with one connection for all callers
extern const Library sdbuscpp;
extern const Library gdbus;
extern const Library dbusglib;

/// Asks the peer for `count` signals, `interval` microseconds apart.
void emitTicks(unsigned int count, unsigned int interval);

/// The peer's object with a dictionary or a list of so many entries.
std::string adapterWith(std::size_t count);

inline void require(bool done, const char* what) {
    if (!done)
        throw std::runtime_error(what);
}

} // namespace Bench

#endif
