// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/service_search.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "daemon/service_records.h"
#include "serving/bluez4/errors.h"
#include "world/settings.h"

namespace Bluetooth::Sim {

std::shared_ptr<ServiceSearch> ServiceSearch::begin(ServedDevice& device, const CallPtr& call) {
    const std::string pattern = call->text(0);
    const std::string uuid = pattern.empty() ? "" : uuidOfPattern(pattern);
    if (!pattern.empty() && uuid.empty()) {
        call->fail(Errors::invalidArguments);
        return nullptr;
    }
    if (!device.adapter().mode().powered()) {
        call->fail(Errors::failed("No route to host"));
        return nullptr;
    }
    auto search = std::make_shared<ServiceSearch>(device, call, uuid);
    search->run();
    return search;
}

void ServiceSearch::run() {
    m_hold = m_device.link().hold();
    const auto search = [this](bool reached) {
        if (!reached) {
            m_call->fail(Errors::connectionAttemptFailed("Host is down"));
            return end();
        }
        const Times& times = m_device.adapter().daemon().times();
        m_timer.start(times.scaled(times.serviceSearch), [this] { finish(); });
    };
    m_device.link().connect(search);
}

void ServiceSearch::finish() {
    m_device.learnServices();
    m_call->reply(tuple(serviceRecords(m_device.stored().uuids, m_uuid)));
    end();
}

void ServiceSearch::cancel() {
    m_call->fail(Errors::failed("Operation canceled"));
    end();
}

void ServiceSearch::linkLost() {
    m_call->fail(Errors::connectionAttemptFailed("Host is down"));
    end();
}

void ServiceSearch::abandon() {
    m_timer.stop();
    m_hold.release();
}

void ServiceSearch::end() {
    abandon();
    m_device.searchEnded();
}

} // namespace Bluetooth::Sim
