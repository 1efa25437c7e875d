#ifndef KESBLUETOOTH_SCANNER_H
#define KESBLUETOOTH_SCANNER_H

#include <bluetooth/remote_object.h>

#include <string>
#include <utility>
#include <vector>

namespace Bluetooth {

/// The client of the scanner service (bus name com.kestrine.bluetooth on the session bus, see
/// ScannerServer), with which several programs share one discovery:
/// @code
///     Scanner scanner;
///     while (watching) {
///         auto* devices = scanner.listDevices("hci0", true);
///         ...
///         sleep(1);
///     }
///     scanner.removeFinder("hci0");
/// @endcode
///
/// The first question about an adapter starts discovery there, and the service itself where the
/// session bus can activate it; devices appear in the answers that follow. The service ends about
/// 30 s after discovery began on some adapter for the last time, and discovery with it; the next
/// question starts it anew.
///
/// Errors: see RemoteObject; each operation first forgets the error before.
/// Threads: one thread at a time may use a Scanner.
class KESBLUETOOTH_API Scanner : public RemoteObject {
public:
    Scanner();
    ~Scanner() override;

    /// Asks for the devices that are in reach of an adapter and not yet known to the Bluetooth
    /// daemon (ListDevices).
    /// @param adapterId the adapter's name, e.g. "hci0", or its address
    /// @param logErrors whether a failure of the service is written to the log; getErrorMessage()
    ///                  tells it either way. What the Bluetooth daemon refuses is always logged.
    /// @return a new list of (address, properties), deleted by the caller together with each Dict
    ///         in it; empty when no device was found yet. Null on failure; the service is not
    ///         asked when the Bluetooth daemon is absent or does not know the adapter.
    ///
    /// A Dict holds what the daemon tells of a found device (Address, Class, Icon, RSSI, Name,
    /// ...), in its order, every value as text: RSSI is "-60", Paired "0".
    ///
    /// Blocks until the service answers, at most 25 s each for the daemon and the service.
    std::vector<std::pair<std::string, Dict*>>* listDevices(const char* adapterId, bool logErrors);

    /// Ends the service's discovery on an adapter (RemoveFinder), for all its clients: the next
    /// listDevices() of any of them starts it again.
    /// @param adapterId see listDevices()
    /// @return whether the call was handed to the bus, which is all that is known; false also when
    ///         the Bluetooth daemon is absent or does not know the adapter. A failure is logged.
    bool removeFinder(const char* adapterId);
};

} // namespace Bluetooth

#endif
