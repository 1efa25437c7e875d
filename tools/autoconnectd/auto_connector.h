// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_AUTO_CONNECTOR_H
#define KESBT_AUTOCONNECTD_AUTO_CONNECTOR_H

#include "command_splitter.h"
#include "lists.h"
#include "target.h"
#include "wakeup.h"

#include <bluetooth/adapter_list.h>
#include <bluetooth/manager.h>

#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace AutoConnectd {

/// Keeps the devices of the auto-connect files connected: their audio and their input.
///
/// The main loop calls work() when wakeup or nextDue() says so. A restart of the Bluetooth daemon,
/// an adapter that comes or goes or is switched on, and a connection that begins or ends are
/// learnt from signals; where one is missed, the longest pause between two attempts bounds the
/// delay. Signals are hints only, for many may come, and from anyone: what they are about is asked
/// of the Bluetooth daemon, about the adapters once a second at most, and no device is tried
/// before its interval is over because of them.
class AutoConnector {
public:
    explicit AutoConnector(Pace pace) : m_pace(pace), m_retryDelay(pace.first) {}
    ~AutoConnector();

    /// Subscribes and starts the receive thread. @return false when the system bus is not there
    bool start();
    /// Whether the connection to the system bus still stands. It does not come back.
    bool hasBus() const;

    /// @param commands all that have come since the last call
    void handle(const std::vector<Command>& commands);
    void handle(News news);
    /// Reads the files again. A device that is still listed keeps its pace.
    void reload();
    /// Looks at all targets and makes the attempts that are due.
    void work();
    Clock::time_point nextDue() const;

private:
    /// What is told of the Bluetooth daemon when it changes.
    enum class Daemon { Answers, Silent, Missing };
    using Targets = std::vector<std::unique_ptr<Target>>;

    bool hasDaemon();
    void note(Daemon state);
    void watchAdapters();
    void handle(Command command, bool mayHurry);
    void hurryAll();
    void remember(const Target& dropped);
    void forgetOldAttempts();
    void reloadAt(Clock::time_point when);
    void retryLater();
    void addTargets(Bluetooth::Device& device, Targets& targets);
    std::unique_ptr<Target> takeOrCreate(const std::string& device, const Service& service);
    void noteUnserved(const std::string& what, const char* why);

    Pace m_pace;
    Bluetooth::Manager m_manager; // its signals need no daemon on the bus yet
    Lists m_lists;
    bool m_loopRuns = false;
    bool m_paused = false;
    Daemon m_daemon = Daemon::Answers;
    bool m_reloadDue = false;
    bool m_hasPruned = false;
    Clock::time_point m_reloadAt{};
    Clock::time_point m_reloaded{};
    std::chrono::seconds m_retryDelay;
    std::unique_ptr<Bluetooth::AdapterList> m_adapters;
    Targets m_targets;
    // The last attempt at what a dropped target was for, by name, for as long as an interval: its
    // adapter was switched off, say, and may be on again in no time.
    std::map<std::string, Clock::time_point> m_tried;
    // What is listed and cannot be connected: told already, and found by the reading under way.
    std::set<std::string> m_unserved;
    std::set<std::string> m_foundUnserved;
};

} // namespace AutoConnectd

#endif
