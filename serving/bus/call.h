// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_CALL_H
#define KESBLUETOOTH_SERVING_BUS_CALL_H

#include "serving/bus/bus_error.h"
#include "serving/bus/value.h"

#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Serving {

/// A method call that came in and is answered once, now or later.
///
/// A call that is never answered stays so: its caller learns of it when the daemon leaves the bus.
class Call {
public:
    Call(GDBusConnection* connection, GDBusMessage* message);
    Call(const Call&) = delete;
    Call& operator=(const Call&) = delete;
    ~Call();

    std::string sender() const;
    std::string path() const;
    /// The interface, or "" when the caller named none.
    std::string interface() const;
    std::string member() const;
    /// The signature of the arguments, without parentheses.
    std::string signature() const;

    /// The arguments as one tuple; "()" when there are none.
    Value arguments() const;
    /// One of the arguments.
    Value argument(gsize index) const;
    std::string text(gsize index) const { return argument(index).text(); }
    guint32 number(gsize index) const { return argument(index).number(); }
    /// The content of a variant argument.
    Value content(gsize index) const;

    bool expectsReply() const;
    /// @param results  a tuple, or nothing for an empty reply
    void reply(const Value& results = {});
    /// Replies with a descriptor, of which the caller gets a copy, and what comes after it.
    void replyDescriptor(int descriptor, const std::vector<Value>& others = {});
    void fail(const BusError& error);

private:
    void send(GDBusMessage* reply);

    GDBusConnection* m_connection;
    GDBusMessage* m_message;
    bool m_answered = false;
};

using CallPtr = std::shared_ptr<Call>;

} // namespace Bluetooth::Serving

#endif
