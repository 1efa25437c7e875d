#include "daemon/link.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/daemon.h"
#include "daemon/device.h"

namespace Bluetooth::Sim {

void Link::connect(OnPaged onPaged) {
    if (up_)
        return onPaged(true);
    waiting_.push_back(std::move(onPaged));
    if (!pager_.running())
        page();
}

void Link::page() {
    const Times& times = device_.adapter().daemon().times();
    if (!device_.reachable())
        return pager_.start(times.scaled(times.pageTimeout), [this] { paged(false); });
    pager_.start(times.scaled(times.connect), [this] {
        if (device_.reachable())
            return paged(true);
        page();
    });
}

void Link::paged(bool reached) {
    if (reached)
        comeUp();
    const auto waiting = std::move(waiting_);
    waiting_.clear();
    for (const OnPaged& onPaged : waiting)
        onPaged(reached);
}

void Link::accept() {
    pager_.stop();
    paged(true);
}

void Link::comeUp() {
    if (up_)
        return;
    up_ = true;
    device_.changed("Connected", boolValue(true));
    device_.learnName();
}

void Link::hold() {
    ++holds_;
    idle_.stop();
}

void Link::release() {
    if (holds_ && --holds_ == 0 && up_) {
        const Times& times = device_.adapter().daemon().times();
        idle_.start(times.scaled(times.idleDisconnect), [this] { drop(); });
    }
}

void Link::drop() {
    if (!up_)
        return;
    idle_.stop();
    disconnect_.stop();
    up_ = false;
    const auto calls = std::move(disconnects_);
    disconnects_.clear();
    for (const CallPtr& call : calls)
        call->reply();
    device_.changed("Connected", boolValue(false));
    device_.linkLost();
}

void Link::requestDisconnect(const CallPtr& call) {
    if (call)
        disconnects_.push_back(call);
    if (disconnect_.running())
        return;
    const Times& times = device_.adapter().daemon().times();
    device_.emit("DisconnectRequested", {});
    disconnect_.start(times.scaled(times.disconnectRequest), [this] { drop(); });
}

void Link::abandon() {
    up_ = false;
    waiting_.clear();
    disconnects_.clear();
    pager_.stop();
    idle_.stop();
    disconnect_.stop();
}

} // namespace Bluetooth::Sim
