// SPDX-License-Identifier: LGPL-2.1-or-later
// Pairs with a device, and asks the person at the terminal what the daemon asks. The main thread
// runs a main loop, GLib's or one with a queue of tasks as Qt's has; the pairing runs on a thread
// beside it.
//   pair_asking glib|queue ADDRESS
#include "asking_agent.h"

#include <bluetooth/adapter.h>
#include <bluetooth/device.h>
#include <bluetooth/manager.h>

#include <glib-unix.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <deque>
#include <iostream>
#include <thread>

using namespace Bluetooth;

using Task = AskingAgent::Task;

/// What the program needs of a main loop.
class Loop {
public:
    virtual ~Loop() = default;
    virtual void post(Task task) = 0; ///< any thread
    virtual void quit() = 0;          ///< a task
    virtual void run() = 0;

    std::function<void(const std::string&)> onLine; ///< a line of standard input
    Task onEnd;                                     ///< its end

protected:
    /// @return false at the end
    bool readInput() {
        char buffer[256];
        const ssize_t count = read(STDIN_FILENO, buffer, sizeof buffer);
        m_input.append(buffer, count > 0 ? static_cast<std::size_t>(count) : 0);
        for (std::size_t end; (end = m_input.find('\n')) != std::string::npos;) {
            const std::string line = m_input.substr(0, end);
            m_input.erase(0, end + 1);
            onLine(line);
        }
        if (count <= 0)
            onEnd();
        return count > 0;
    }

private:
    std::string m_input;
};

class GlibLoop : public Loop {
public:
    GlibLoop() : m_loop(g_main_loop_new(nullptr, FALSE)) {
        const auto read = [](gint, GIOCondition, gpointer loop) -> gboolean {
            return static_cast<GlibLoop*>(loop)->readInput();
        };
        g_unix_fd_add(STDIN_FILENO, static_cast<GIOCondition>(G_IO_IN | G_IO_HUP), read, this);
    }
    ~GlibLoop() override { g_main_loop_unref(m_loop); }

    void post(Task task) override {
        const auto run = [](gpointer data) -> gboolean {
            (*static_cast<Task*>(data))();
            return G_SOURCE_REMOVE;
        };
        const auto destroy = [](gpointer data) { delete static_cast<Task*>(data); };
        // An idle source, since a task that is invoked on the main thread would run at once.
        g_idle_add_full(G_PRIORITY_DEFAULT, run, new Task(std::move(task)), destroy);
    }
    void quit() override { g_main_loop_quit(m_loop); }
    void run() override { g_main_loop_run(m_loop); }

private:
    GMainLoop* m_loop;
};

class QueueLoop : public Loop {
public:
    ~QueueLoop() override { close(m_wake); }

    void post(Task task) override {
        const std::lock_guard<std::mutex> lock(m_mutex);
        m_tasks.push_back(std::move(task));
        eventfd_write(m_wake, 1);
    }
    void quit() override { m_running = false; }
    void run() override {
        pollfd sources[] = {{m_wake, POLLIN, 0}, {STDIN_FILENO, POLLIN, 0}};
        while (m_running) {
            poll(sources, 2, -1);
            if (sources[0].revents != 0)
                runTasks();
            if (sources[1].revents != 0 && !readInput())
                sources[1].fd = -1; // not looked at any more
        }
    }

private:
    void runTasks() {
        eventfd_t count = 0;
        eventfd_read(m_wake, &count);
        std::deque<Task> tasks;
        {
            const std::lock_guard<std::mutex> lock(m_mutex);
            tasks.swap(m_tasks);
        }
        for (const Task& task : tasks)
            task();
    }

    const int m_wake = eventfd(0, EFD_CLOEXEC);
    std::mutex m_mutex;
    std::deque<Task> m_tasks;
    bool m_running = true;
};

int fail(const std::string& text, int status = 1) {
    std::cerr << text << '\n';
    return status;
}

/// The dialog: one question at a time. All of it runs on the main thread.
class Dialog {
public:
    void open(std::shared_ptr<Question> question) {
        m_question = std::move(question);
        std::cout << text() << std::endl;
        if (m_ended)
            answer("");
    }
    void answer(const std::string& line) {
        if (!m_question)
            return;
        if (m_question->wantsText() ? line.empty() : line != "y")
            m_question->refuse();
        else
            m_question->accept(line);
        m_question.reset();
    }
    void withdraw() {
        std::cout << "the question was withdrawn" << std::endl;
        m_question.reset();
    }
    /// Nobody is left to answer.
    void end() {
        m_ended = true;
        answer("");
    }

private:
    std::string text() const {
        const std::string& detail = m_question->detail;
        if (m_question->isOnlyShown())
            return "type " + detail + " there";
        if (m_question->wantsText())
            return m_question->method == "RequestPinCode" ? "which PIN code?" : "which passkey?";
        if (m_question->method == "RequestConfirmation")
            return "does it show " + detail + "? y or n";
        if (m_question->method == "Authorize")
            return "may it use the service " + detail + "? y or n";
        return m_question->method + " " + detail + "? y or n";
    }

    std::shared_ptr<Question> m_question;
    bool m_ended = false;
};

/// Pairs, on a thread beside the main loop, with proxies of its own. @return what went wrong, or ""
std::string pair(const std::string& address, const Agent& agent) {
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (!manager)
        return "bluetoothd is not running; start it and try again";
    const std::unique_ptr<Adapter> adapter(manager->defaultAdapter());
    if (!adapter)
        return "there is no adapter; plug one in and try again";
    const std::unique_ptr<Device> device(adapter->createPairedDevice(address.c_str(), agent));
    if (device)
        return "";
    constexpr int interrupted = 2; // by Ctrl-C
    if (adapter->getErrorNumber() != interrupted)
        return "cannot pair with " + address + " (" + adapter->getErrorMessage() +
               "); try again, and answer in time";
    adapter->cancelDeviceCreation(address.c_str());
    return "the pairing was interrupted; try again";
}

int main(int argc, char** argv) {
    const std::string kind = argc == 3 ? argv[1] : "";
    if (kind != "glib" && kind != "queue")
        return fail("usage: pair_asking glib|queue ADDRESS", 2);
    const std::string address = argv[2];
    const std::unique_ptr<Loop> loop(kind == "glib" ? std::unique_ptr<Loop>(new GlibLoop)
                                                    : std::unique_ptr<Loop>(new QueueLoop));
    Dialog dialog;
    loop->onLine = [&dialog](const std::string& line) { dialog.answer(line); };
    loop->onEnd = [&dialog] { dialog.end(); };
    AskingAgent agent(
        [&loop](Task task) { loop->post(std::move(task)); },
        [&dialog](std::shared_ptr<Question> question) { dialog.open(std::move(question)); },
        [&dialog] { dialog.withdraw(); });
    if (agent.registerPath() != 0)
        return fail("cannot serve the agent; is there a system bus with bluetoothd? start it");

    std::string failure;
    std::thread pairing([&] {
        failure = pair(address, agent);
        loop->post([&loop] { loop->quit(); });
    });
    loop->run();
    pairing.join();
    agent.unregisterPath();
    if (!failure.empty())
        return fail(failure);
    std::cout << "paired with " << address << '\n';
    return 0;
}
