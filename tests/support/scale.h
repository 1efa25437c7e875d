#ifndef KESBLUETOOTH_TESTS_SCALE_H
#define KESBLUETOOTH_TESTS_SCALE_H

namespace Bluetooth::Test {

#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
inline constexpr bool isSanitized = true;
#else
inline constexpr bool isSanitized = false;
#endif

} // namespace Bluetooth::Test

#endif
