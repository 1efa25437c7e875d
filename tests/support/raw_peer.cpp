// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/raw_peer.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <stdexcept>

namespace Bluetooth::Test {

namespace {

std::string textOf(const char* text) {
    return text ? text : "";
}

MessagePtr methodCall(const std::string& destination, const std::string& path,
                      const std::string& interface, const std::string& member) {
    return MessagePtr(dbus_message_new_method_call(destination.c_str(), path.c_str(),
                                                   interface.c_str(), member.c_str()));
}

} // namespace

std::string SeenCall::text() const {
    return member + (wantsReply ? "" : "!") + (arguments.empty() ? "" : " ") + arguments;
}

RawPeer::RawPeer(const std::string& address, const std::string& name, Observer observer)
    : m_observer(std::move(observer)) {
    ScopedError error;
    m_wakeFd = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    m_connection = dbus_connection_open_private(address.c_str(), error);
    if (!m_connection || !dbus_bus_register(m_connection, error))
        throw std::runtime_error(std::string("no connection for a peer: ") + error.message());
    dbus_connection_set_exit_on_disconnect(m_connection, false);
    dbus_connection_add_filter(m_connection, filter, this, nullptr);
    m_thread = std::thread([this] { loop(); });
    if (!name.empty() && !own(name))
        throw std::runtime_error("a peer cannot own " + name);
}

RawPeer::~RawPeer() {
    m_stop = true;
    eventfd_write(m_wakeFd, 1);
    m_thread.join();
    dbus_connection_remove_filter(m_connection, filter, this);
    dbus_connection_close(m_connection);
    dbus_connection_unref(m_connection);
    close(m_wakeFd);
}

void RawPeer::handle(const std::string& member, Handler handler, Milliseconds delay) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_answers[member] = {std::move(handler), delay};
}

void RawPeer::reply(const std::string& member, Build arguments, Milliseconds delay) {
    handle(
        member,
        [arguments = std::move(arguments)](DBusMessage* call) { return replyTo(call, arguments); },
        delay);
}

void RawPeer::replyError(const std::string& member, const char* name, const char* text) {
    handle(member, [name = std::string(name), text = std::string(text)](DBusMessage* call) {
        return MessagePtr(dbus_message_new_error(call, name.c_str(), text.c_str()));
    });
}

void RawPeer::neverReply(const std::string& member) {
    handle(member, [](DBusMessage*) { return MessagePtr(); });
}

void RawPeer::post(Task task) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_tasks.push_back(std::move(task));
    eventfd_write(m_wakeFd, 1);
}

void RawPeer::run(const Task& task) {
    if (std::this_thread::get_id() == m_thread.get_id())
        return task(m_connection); // a handler's
    std::promise<void> done;
    post([&](DBusConnection* connection) {
        task(connection);
        done.set_value();
    });
    done.get_future().wait();
}

void RawPeer::send(MessagePtr message) {
    post([held = std::shared_ptr<DBusMessage>(std::move(message))](DBusConnection* connection) {
        dbus_connection_send(connection, held.get(), nullptr);
    });
}

void RawPeer::emit(const std::string& path, const std::string& interface, const std::string& member,
                   const Build& arguments) {
    MessagePtr signal(dbus_message_new_signal(path.c_str(), interface.c_str(), member.c_str()));
    Writer(signal.get(), arguments);
    send(std::move(signal));
}

void RawPeer::emitToEach(const std::string& path, const std::string& interface,
                         const std::string& member, const Build& arguments) {
    emit(path, interface, member, arguments);
    const MessagePtr reply =
        call(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS, DBUS_INTERFACE_DBUS, "ListNames").get();
    char** names = nullptr;
    int count = 0;
    dbus_message_get_args(reply.get(), nullptr, DBUS_TYPE_ARRAY, DBUS_TYPE_STRING, &names, &count,
                          DBUS_TYPE_INVALID);
    for (int name = 0; name < count; ++name) {
        MessagePtr signal(dbus_message_new_signal(path.c_str(), interface.c_str(), member.c_str()));
        dbus_message_set_destination(signal.get(), names[name]);
        Writer(signal.get(), arguments);
        send(std::move(signal));
    }
    dbus_free_string_array(names);
}

std::future<MessagePtr> RawPeer::call(const std::string& destination, const std::string& path,
                                      const std::string& interface, const std::string& member,
                                      const Build& arguments, Milliseconds timeout) {
    const MessagePtr message = methodCall(destination, path, interface, member);
    Writer(message.get(), arguments);
    std::future<MessagePtr> result;
    run([&](DBusConnection* connection) {
        dbus_uint32_t serial = 0;
        dbus_connection_send(connection, message.get(), &serial);
        OwnCall& own = m_ownCalls[serial];
        own.deadline = Clock::now() + timeout;
        result = own.reply.get_future();
    });
    return result;
}

void RawPeer::takeReply(DBusMessage* message) {
    const auto call = m_ownCalls.find(dbus_message_get_reply_serial(message));
    if (call == m_ownCalls.end())
        return;
    call->second.reply.set_value(MessagePtr(dbus_message_ref(message)));
    m_ownCalls.erase(call);
}

void RawPeer::giveUpOwnCalls() {
    const auto oldest =
        dbus_connection_get_is_connected(m_connection) ? Clock::now() : Clock::time_point::max();
    for (auto call = m_ownCalls.begin(); call != m_ownCalls.end();) {
        if (call->second.deadline > oldest) {
            ++call;
            continue;
        }
        call->second.reply.set_value(nullptr);
        call = m_ownCalls.erase(call);
    }
}

bool RawPeer::own(const std::string& name) {
    bool owned = false;
    run([&](DBusConnection* connection) {
        owned = dbus_bus_request_name(connection, name.c_str(), DBUS_NAME_FLAG_DO_NOT_QUEUE,
                                      nullptr) == DBUS_REQUEST_NAME_REPLY_PRIMARY_OWNER;
    });
    return owned;
}

void RawPeer::disown(const std::string& name) {
    run([&](DBusConnection* connection) {
        dbus_bus_release_name(connection, name.c_str(), nullptr);
    });
}

bool RawPeer::hasOwner(const std::string& name) {
    bool owned = false;
    run([&](DBusConnection* connection) {
        owned = dbus_bus_name_has_owner(connection, name.c_str(), nullptr);
    });
    return owned;
}

void RawPeer::addMatch(const std::string& rule) {
    run([&](DBusConnection* connection) {
        dbus_bus_add_match(connection, rule.c_str(), nullptr);
        dbus_connection_flush(connection);
    });
}

bool RawPeer::waitForOwner(const std::string& name, bool owned, Milliseconds limit) {
    addMatch("type='signal',sender='org.freedesktop.DBus',member='NameOwnerChanged',arg0='" + name +
             "'");
    const auto deadline = Clock::now() + limit;
    while (true) {
        const std::size_t seen = m_signals.count();
        if (hasOwner(name) == owned)
            return true;
        const auto left = std::chrono::duration_cast<Milliseconds>(deadline - Clock::now());
        if (left.count() <= 0 || !m_signals.waitFor(seen + 1, left))
            return false;
    }
}

void RawPeer::becomeMonitor() {
    run([this](DBusConnection* connection) {
        const MessagePtr call = methodCall(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS,
                                           "org.freedesktop.DBus.Monitoring", "BecomeMonitor");
        Writer(call.get()).array("s")(std::uint32_t{0});
        ScopedError error;
        const MessagePtr reply(
            dbus_connection_send_with_reply_and_block(connection, call.get(), 5000, error));
        if (!reply)
            throw std::runtime_error(error.message());
        m_isMonitor = true;
    });
}

std::vector<std::string> RawPeer::callTexts() const {
    std::vector<std::string> texts;
    for (const SeenCall& call : m_calls.events()) {
        if (call.destination != DBUS_SERVICE_DBUS)
            texts.push_back(call.text());
    }
    return texts;
}

bool RawPeer::waitForCalls(const std::string& member, std::size_t count, Milliseconds limit) const {
    return m_calls.waitUntil(
        [&](const std::vector<SeenCall>& seen) {
            return static_cast<std::size_t>(
                       std::count_if(seen.begin(), seen.end(), [&](const SeenCall& call) {
                           return call.member == member;
                       })) >= count;
        },
        limit);
}

void RawPeer::loop() {
    while (!m_stop) {
        std::deque<Task> tasks;
        {
            const std::lock_guard<std::mutex> lock(m_mutex);
            tasks.swap(m_tasks);
        }
        for (const Task& task : tasks)
            task(m_connection);
        sendDueReplies();
        giveUpOwnCalls();
        wait();
        dbus_connection_read_write(m_connection, 0);
        while (dbus_connection_dispatch(m_connection) == DBUS_DISPATCH_DATA_REMAINS) {
        }
    }
}

/// Waits for input, a task or the next reply that is due.
void RawPeer::wait() {
    if (dbus_connection_get_dispatch_status(m_connection) == DBUS_DISPATCH_DATA_REMAINS)
        return;
    pollfd fds[] = {{m_wakeFd, POLLIN, 0}, {-1, POLLIN, 0}};
    if (dbus_connection_get_is_connected(m_connection))
        dbus_connection_get_unix_fd(m_connection, &fds[1].fd);
    if (dbus_connection_has_messages_to_send(m_connection))
        fds[1].events |= POLLOUT;
    auto limit = Milliseconds(m_ownCalls.empty() ? 1000 : 20);
    if (!m_dueReplies.empty())
        limit =
            std::clamp(std::chrono::ceil<Milliseconds>(m_dueReplies.begin()->first - Clock::now()),
                       Milliseconds(0), limit);
    poll(fds, 2, static_cast<int>(limit.count()));
    eventfd_t count = 0;
    eventfd_read(m_wakeFd, &count);
}

void RawPeer::sendDueReplies() {
    while (!m_dueReplies.empty() && m_dueReplies.begin()->first <= Clock::now()) {
        dbus_connection_send(m_connection, m_dueReplies.begin()->second.get(), nullptr);
        m_dueReplies.erase(m_dueReplies.begin());
    }
}

DBusHandlerResult RawPeer::filter(DBusConnection*, DBusMessage* message, void* peer) {
    return static_cast<RawPeer*>(peer)->take(message);
}

DBusHandlerResult RawPeer::take(DBusMessage* message) {
    if (m_observer)
        m_observer(message);
    switch (dbus_message_get_type(message)) {
    case DBUS_MESSAGE_TYPE_METHOD_CALL:
        if (!m_isMonitor)
            answerCall(message); // first: who waits for the call finds its handler done
        if (m_recording)
            m_calls.add({textOf(dbus_message_get_destination(message)),
                         textOf(dbus_message_get_path(message)),
                         textOf(dbus_message_get_interface(message)),
                         textOf(dbus_message_get_member(message)), argumentsOf(message),
                         !dbus_message_get_no_reply(message)});
        return DBUS_HANDLER_RESULT_HANDLED;
    case DBUS_MESSAGE_TYPE_SIGNAL:
        m_signals.add(textOf(dbus_message_get_member(message)) + " " + argumentsOf(message));
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    default:
        takeReply(message);
        return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
    }
}

void RawPeer::answerCall(DBusMessage* message) {
    Answer answer;
    {
        const std::lock_guard<std::mutex> lock(m_mutex);
        const auto known = m_answers.find(textOf(dbus_message_get_member(message)));
        if (known != m_answers.end())
            answer = known->second;
    }
    MessagePtr reply = answer.handler ? answer.handler(message)
                                      : MessagePtr(dbus_message_new_error(
                                            message, DBUS_ERROR_UNKNOWN_METHOD, "No such method"));
    if (reply && !dbus_message_get_no_reply(message))
        m_dueReplies.emplace(Clock::now() + answer.delay, std::move(reply));
}

} // namespace Bluetooth::Test
