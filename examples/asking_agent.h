// SPDX-License-Identifier: LGPL-2.1-or-later
// An agent that asks a person. The daemon's requests come on the thread that waits in
// createPairedDevice(); the person answers later, on the thread of the main loop.
#ifndef ASKING_AGENT_H
#define ASKING_AGENT_H

#include <bluetooth/agent.h>

#include <cstdlib>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <utility>

/// What the daemon wants to know. It waits until it is answered, or cancels the question.
class Question {
public:
    // Both replies are made at once, so that the request itself need not be kept.
    Question(DBusConnection* connection, DBusMessage* request)
        : method(dbus_message_get_member(request)),
          m_connection(connection),
          m_yes(dbus_message_new_method_return(request), dbus_message_unref),
          m_no(dbus_message_new_error(request, "org.bluez.Error.Rejected", "Rejected"),
               dbus_message_unref) {
        DBusMessageIter argument;
        if (!dbus_message_iter_init(request, &argument))
            return;
        const char* text = nullptr;
        if (dbus_message_iter_get_arg_type(&argument) == DBUS_TYPE_OBJECT_PATH) {
            dbus_message_iter_get_basic(&argument, &text);
            device = text;
            dbus_message_iter_next(&argument);
        }
        const int type = dbus_message_iter_get_arg_type(&argument);
        if (type == DBUS_TYPE_UINT32) {
            dbus_uint32_t passkey = 0;
            dbus_message_iter_get_basic(&argument, &passkey);
            detail = std::to_string(passkey);
            detail.insert(0, detail.size() < 6 ? 6 - detail.size() : 0, '0');
        } else if (type == DBUS_TYPE_STRING) {
            dbus_message_iter_get_basic(&argument, &text);
            detail = text;
        }
    }

    const std::string method; ///< e.g. "RequestConfirmation"
    std::string device;       ///< its object path; "" where none is told
    std::string detail;       ///< the passkey or PIN to show, the service or the mode

    bool wantsText() const { return method == "RequestPinCode" || method == "RequestPasskey"; }
    bool isOnlyShown() const { return method == "DisplayPasskey" || method == "DisplayPinCode"; }

    /// Replies yes. Only the first reply counts.
    /// @param text the PIN code or passkey, if wanted; one that is not UTF-8 is refused
    void accept(const std::string& text = "") {
        const std::lock_guard<std::mutex> lock(m_mutex);
        const char* pin = text.c_str();
        if (!dbus_validate_utf8(pin, nullptr)) // libdbus would end the process
            return reply(m_no.get());
        const auto passkey = static_cast<dbus_uint32_t>(std::strtoul(pin, nullptr, 10));
        if (m_yes && method == "RequestPinCode")
            dbus_message_append_args(m_yes.get(), DBUS_TYPE_STRING, &pin, DBUS_TYPE_INVALID);
        if (m_yes && method == "RequestPasskey")
            dbus_message_append_args(m_yes.get(), DBUS_TYPE_UINT32, &passkey, DBUS_TYPE_INVALID);
        reply(m_yes.get());
    }
    /// Replies no.
    void refuse() {
        const std::lock_guard<std::mutex> lock(m_mutex);
        reply(m_no.get());
    }
    /// The daemon does not wait any more.
    void withdraw() {
        const std::lock_guard<std::mutex> lock(m_mutex);
        reply(nullptr);
    }

private:
    using Message = std::unique_ptr<DBusMessage, void (*)(DBusMessage*)>;

    void reply(DBusMessage* message) {
        if (message) {
            dbus_connection_send(m_connection, message, nullptr);
            dbus_connection_flush(m_connection);
        }
        m_yes.reset();
        m_no.reset();
    }

    DBusConnection* m_connection; // lives as long as the process
    std::mutex m_mutex;
    Message m_yes;
    Message m_no;
};

class AskingAgent : public Bluetooth::Agent {
public:
    using Task = std::function<void()>;
    using Ask = std::function<void(std::shared_ptr<Question>)>;

    /// @param post     makes the main loop run a task soon; any thread calls it. GLib:
    ///                 g_idle_add_full(); Qt: QMetaObject::invokeMethod(qApp, task,
    ///                 Qt::QueuedConnection)
    /// @param ask      opens the dialog; run by the main loop, like the next
    /// @param withdraw closes it: the daemon has cancelled the question
    AskingAgent(std::function<void(Task)> post, Ask ask, Task withdraw)
        : m_post(std::move(post)), m_ask(std::move(ask)), m_withdraw(std::move(withdraw)) {
        setDispatcher(dispatch);
    }

private:
    static DBusHandlerResult dispatch(DBusConnection* connection, DBusMessage* message,
                                      void* agent) {
        return static_cast<AskingAgent*>(static_cast<Agent*>(agent))->handle(connection, message);
    }

    DBusHandlerResult handle(DBusConnection* connection, DBusMessage* message) {
        const auto is = [&](const char* method) {
            return dbus_message_is_method_call(message, getInterface(), method);
        };
        if (is("Cancel") || is("Release")) {
            if (m_open)
                m_open->withdraw();
            if (m_open && is("Cancel"))
                m_post(m_withdraw);
            m_open.reset();
        }
        const bool isQuestion = is("RequestPinCode") || is("RequestPasskey") ||
                                is("RequestConfirmation") || is("Authorize") ||
                                is("ConfirmModeChange") || is("DisplayPasskey") ||
                                is("DisplayPinCode");
        if (!isQuestion)
            return handlerDispatcher(connection, message, static_cast<Agent*>(this));
        if (m_open) // of another adapter; one dialog is open at a time
            m_open->refuse();
        m_open = std::make_shared<Question>(connection, message);
        m_post([ask = m_ask, question = m_open] { ask(question); });
        if (m_open->isOnlyShown())
            m_open->accept();
        return DBUS_HANDLER_RESULT_HANDLED;
    }

    std::function<void(Task)> m_post;
    Ask m_ask;
    Task m_withdraw;
    std::shared_ptr<Question> m_open; // used by the thread that dispatches only
};

#endif
