#pragma once

#include "bus/call.h"

#include <deque>

namespace Bluetooth::Sim {

/// The calls that the daemon received, oldest first; the oldest are dropped beyond a limit.
class CallLog {
public:
    void add(const CallPtr& call) {
        calls_.push_back(call);
        if (calls_.size() > kMost)
            calls_.pop_front();
    }
    void clear() { calls_.clear(); }

    /// As a(ossv): path, interface, member, and the arguments as one tuple.
    Value list() const {
        GVariantBuilder builder;
        g_variant_builder_init(&builder, G_VARIANT_TYPE("a(ossv)"));
        for (const CallPtr& call : calls_)
            g_variant_builder_add(&builder, "(ossv)", call->path().c_str(),
                                  call->interface().c_str(), call->member().c_str(),
                                  call->arguments().get());
        return g_variant_builder_end(&builder);
    }

private:
    static constexpr std::size_t kMost = 10000;
    std::deque<CallPtr> calls_;
};

} // namespace Bluetooth::Sim
