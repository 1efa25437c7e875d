#include "daemon/service_search.h"

#include "daemon/adapter.h"
#include "daemon/daemon.h"
#include "daemon/device.h"
#include "daemon/service_records.h"
#include "world/settings.h"

namespace Bluetooth::Sim {

std::shared_ptr<ServiceSearch> ServiceSearch::begin(Device& device, const CallPtr& call) {
    const std::string pattern = call->text(0);
    const std::string uuid = pattern.empty() ? "" : uuidOfPattern(pattern);
    if (!pattern.empty() && uuid.empty()) {
        call->fail(Errors::invalidArguments());
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
    device_.link().hold();
    const auto search = [this](bool reached) {
        if (!reached) {
            call_->fail(Errors::bluez("ConnectionAttemptFailed", "Host is down"));
            return end();
        }
        const Times& times = device_.adapter().daemon().times();
        timer_.start(times.scaled(times.serviceSearch), [this] { finish(); });
    };
    device_.link().connect(search);
}

void ServiceSearch::finish() {
    device_.learnServices();
    call_->reply(g_variant_new("(@a{us})", serviceRecords(device_.stored().uuids, uuid_).get()));
    end();
}

void ServiceSearch::cancel() {
    call_->fail(Errors::failed("Operation canceled"));
    end();
}

void ServiceSearch::linkLost() {
    call_->fail(Errors::bluez("ConnectionAttemptFailed", "Host is down"));
    end();
}

void ServiceSearch::abandon() {
    end();
}

void ServiceSearch::end() {
    timer_.stop();
    device_.link().release();
    device_.searchEnded();
}

} // namespace Bluetooth::Sim
