// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_CONTROL_CALL_LOG_H
#define KESBLUETOOTH_SIM_CONTROL_CALL_LOG_H

#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/dict_builder.h"

#include <deque>

namespace Bluetooth::Sim {

/// The calls that the daemon received, oldest first; the oldest are dropped beyond a limit.
class CallLog {
public:
    void add(const CallPtr& call) {
        m_calls.push_back(call);
        if (m_calls.size() > most)
            m_calls.pop_front();
    }
    void clear() { m_calls.clear(); }

    /// As a(ossav): path, interface, member and arguments.
    Value list() const {
        GVariantBuilder builder;
        g_variant_builder_init(&builder, G_VARIANT_TYPE("a(ossav)"));
        for (const CallPtr& call : m_calls)
            g_variant_builder_add(&builder, "(oss@av)", call->path().c_str(),
                                  call->interface().c_str(), call->member().c_str(),
                                  variantList(call->arguments()).get());
        return g_variant_builder_end(&builder);
    }

private:
    static constexpr std::size_t most = 10000;
    std::deque<CallPtr> m_calls;
};

} // namespace Bluetooth::Sim

#endif
