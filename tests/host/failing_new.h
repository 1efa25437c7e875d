#ifndef KESBLUETOOTH_TESTS_HOST_FAILING_NEW_H
#define KESBLUETOOTH_TESTS_HOST_FAILING_NEW_H

namespace Bluetooth::Test {

/// How many of this thread's next allocations with `new` succeed before one fails; -1: all.
extern thread_local int allocationsLeft;

} // namespace Bluetooth::Test

#endif
