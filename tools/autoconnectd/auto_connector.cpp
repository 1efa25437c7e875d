// SPDX-License-Identifier: LGPL-2.1-or-later
#include "auto_connector.h"

#include <bluetooth/adapter.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>

#include <syslog.h>

#include <algorithm>
#include <cstring>
#include <iterator>
#include <set>
#include <string>
#include <utility>

namespace AutoConnectd {

namespace {

constexpr std::chrono::seconds newsPause{1};

void onAdapterAddedOrRemoved(Bluetooth::RemoteObject* /*sender*/,
                             const Bluetooth::ObjectPath* /*adapter*/) {
    tellAdapters();
}

void onAdapterChanged(Bluetooth::RemoteObject* /*sender*/, const char* name,
                      const Bluetooth::Variant* /*value*/) {
    if (strcmp(name, "Powered") == 0)
        tellPower();
}

} // namespace

AutoConnector::~AutoConnector() {
    if (!m_loopRuns)
        return;
    m_manager.stopLoop();
    m_manager.waitLoop();
}

bool AutoConnector::hasBus() const {
    return m_manager.getConnection() && dbus_connection_get_is_connected(m_manager.getConnection());
}

bool AutoConnector::start() {
    if (!hasBus() || m_manager.setAdapterAddedHandler(onAdapterAddedOrRemoved) != 0 ||
        m_manager.setAdapterRemovedHandler(onAdapterAddedOrRemoved) != 0)
        return false;
    m_loopRuns = m_manager.startLoop() == 0;
    return m_loopRuns;
}

void AutoConnector::handle(const std::vector<Command>& commands) {
    // Whoever changes a list asks for a reload, the pruning in reload() too: nobody has asked for
    // attempts then. What it wrote is in the pipe by the time it is done.
    const bool mayHurry = !std::exchange(m_hasPruned, false);
    for (const Command command : commands)
        handle(command, mayHurry);
}

void AutoConnector::handle(Command command, bool mayHurry) {
    switch (command) {
    case Command::Reload:
        if (mayHurry)
            hurryAll();
        reload();
        break;
    case Command::Pause:
        m_paused = true;
        syslog(LOG_NOTICE, "paused");
        break;
    case Command::Resume:
        m_paused = false;
        syslog(LOG_NOTICE, "resumed");
        hurryAll();
        break;
    }
}

void AutoConnector::handle(News news) {
    if (news.power) {
        for (const auto& target : m_targets)
            target->beginAgain();
    }
    if (news.adapters)
        reloadAt(m_reloaded + newsPause);
}

void AutoConnector::hurryAll() {
    m_tried.clear();
    for (const auto& target : m_targets)
        target->hurry();
}

void AutoConnector::remember(const Target& dropped) {
    if (dropped.tried() == Clock::time_point{})
        return;
    Clock::time_point& tried = m_tried[dropped.name()];
    tried = std::max(tried, dropped.tried());
}

void AutoConnector::forgetOldAttempts() {
    for (auto attempt = m_tried.begin(); attempt != m_tried.end();) {
        const bool isOld = attempt->second + m_pace.first <= Clock::now();
        attempt = isOld ? m_tried.erase(attempt) : std::next(attempt);
    }
}

/// Asked first: a daemon that is absent cannot be told from one that does not answer otherwise.
bool AutoConnector::hasDaemon() {
    const bool present = Bluetooth::BluezObject::hasBluetoothd();
    if (!present || m_daemon == Daemon::Missing)
        note(present ? Daemon::Answers : Daemon::Missing);
    return present;
}

void AutoConnector::note(Daemon state) {
    constexpr const char* texts[] = {"is back", "does not answer; waiting for it",
                                     "is not running; waiting for it"};
    if (state != std::exchange(m_daemon, state))
        syslog(LOG_NOTICE, "bluetoothd %s", texts[static_cast<int>(state)]);
}

void AutoConnector::watchAdapters() {
    m_adapters.reset(m_manager.listAdapters());
    if (!m_adapters)
        return;
    for (Bluetooth::Adapter* adapter : *m_adapters) {
        if (adapter)
            adapter->setPropertyChangedHandler(onAdapterChanged);
    }
}

void AutoConnector::reloadAt(Clock::time_point when) {
    m_reloadAt = m_reloadDue ? std::min(m_reloadAt, when) : when;
    m_reloadDue = true;
}

void AutoConnector::retryLater() {
    reloadAt(Clock::now() + m_retryDelay);
    m_retryDelay = std::min(m_retryDelay * 2, m_pace.longest);
}

/// What cannot be connected is told once, as long as it is listed.
void AutoConnector::noteUnserved(const std::string& what, const char* why) {
    m_foundUnserved.insert(what);
    if (m_unserved.insert(what).second)
        syslog(LOG_WARNING, "%s %s", what.c_str(), why);
}

std::unique_ptr<Target> AutoConnector::takeOrCreate(const std::string& device,
                                                    const Service& service) {
    for (auto& target : m_targets) {
        if (target && target->isOf(device, service))
            return std::move(target);
    }
    auto target = std::make_unique<Target>(device, service, m_pace);
    switch (target->open()) {
    case Target::Opening::Done:
        break;
    case Target::Opening::NotServed:
        noteUnserved(target->name(), "is not connected: bluetoothd does not serve it");
        return nullptr;
    case Target::Opening::NotAnswered:
        retryLater();
        return nullptr;
    }
    syslog(LOG_INFO, "watching %s", target->name().c_str());
    const auto attempt = m_tried.find(target->name());
    if (attempt != m_tried.end())
        target->wasTried(attempt->second);
    return target;
}

void AutoConnector::addTargets(Bluetooth::Device& device, Targets& targets) {
    const std::unique_ptr<Bluetooth::Dict> properties(device.getProperties());
    if (!properties) {
        retryLater();
        return;
    }
    const auto services = servicesOf(Bluetooth::find(properties.get(), "UUIDs"));
    if (services.empty())
        noteUnserved(Bluetooth::find(properties.get(), "Address"),
                     "is not connected: it is no headset, speaker, keyboard or mouse");
    for (const Service* service : services) {
        auto target = takeOrCreate(device.getPath(), *service);
        if (target)
            targets.push_back(std::move(target));
    }
}

void AutoConnector::reload() {
    m_reloadDue = false;
    m_reloaded = Clock::now();
    forgetOldAttempts();
    if (!hasDaemon()) {
        for (const auto& target : m_targets)
            remember(*target);
        m_targets.clear();
        m_adapters.reset();
        retryLater();
        return;
    }
    // Watched before the files are read: an adapter that is switched on meanwhile is not missed.
    watchAdapters();
    const auto devices = m_lists.read(m_adapters.get());
    note(devices ? Daemon::Answers : Daemon::Silent);
    if (!devices) {
        retryLater();
        return;
    }
    m_hasPruned |= m_lists.havePruned();
    m_foundUnserved.clear();
    Targets targets;
    std::set<std::string> paths; // an entry may stand twice in a file
    for (Bluetooth::Device* device : *devices) {
        if (paths.insert(device->getPath()).second)
            addTargets(*device, targets);
    }
    m_unserved = m_foundUnserved;
    for (const auto& target : m_targets) {
        if (!target)
            continue;
        // No longer listed, or its adapter was switched off: log what became of it.
        target->check(Clock::now(), false);
        remember(*target);
    }
    m_targets = std::move(targets);
}

void AutoConnector::work() {
    const Clock::time_point now = Clock::now();
    if (m_reloadDue ? now >= m_reloadAt : !hasDaemon())
        reload();
    const auto lost = std::remove_if(m_targets.begin(), m_targets.end(),
                                     [&](const std::unique_ptr<Target>& target) {
                                         if (target->check(now, !m_paused))
                                             return false;
                                         remember(*target);
                                         return true;
                                     });
    if (lost == m_targets.end()) {
        if (!m_reloadDue)
            m_retryDelay = m_pace.first;
        return;
    }
    // Removed from the daemon, or the daemon was restarted and all paths are new.
    m_targets.erase(lost, m_targets.end());
    retryLater();
}

Clock::time_point AutoConnector::nextDue() const {
    Clock::time_point due = Clock::now() + m_pace.longest;
    if (m_reloadDue)
        due = std::min(due, m_reloadAt);
    for (const auto& target : m_targets) {
        if (!target->isConnected() && !m_paused)
            due = std::min(due, target->due());
    }
    return due;
}

} // namespace AutoConnectd
