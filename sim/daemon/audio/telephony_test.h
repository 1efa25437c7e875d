// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_TELEPHONY_TEST_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_TELEPHONY_TEST_H

#include "serving.h"
#include "serving/bluez4/audio_interfaces.h"
#include "serving/bluez4/errors.h"
#include "serving/bus/object_tree.h"

namespace Bluetooth::Sim {

/// org.bluez.TelephonyTest: tells headsets of calls and of the network. What it is told is accepted
/// and changes nothing that can be seen on D-Bus.
class TelephonyTest {
public:
    explicit TelephonyTest(ObjectTree& objects) : m_objects(objects) {
        m_objects.add(path, telephonyTestInterface<TelephonyTest>(), this);
    }
    TelephonyTest(const TelephonyTest&) = delete;
    TelephonyTest& operator=(const TelephonyTest&) = delete;
    ~TelephonyTest() { m_objects.remove(path); }

private:
    template <class Served>
    friend const Interface& Serving::telephonyTestInterface();

    static constexpr const char* path = "/org/bluez/test";
    static constexpr guint32 highestLevel = 5;

    void accept(const CallPtr& call) { call->reply(); }
    void setLevel(const CallPtr& call) {
        if (call->number(0) > highestLevel)
            return call->fail(Errors::invalidArguments);
        call->reply();
    }

    ObjectTree& m_objects;
};

} // namespace Bluetooth::Sim

#endif
