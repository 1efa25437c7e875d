#ifndef KESBLUETOOTH_AUDIO_H
#define KESBLUETOOTH_AUDIO_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of all audio profiles of one remote device together (interface org.bluez.Audio).
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getAudio() and deleted by the caller.
class KESBLUETOOTH_API Audio : public BluezObject {
public:
    /// Prefer getAudio(), which tells when the daemon is absent.
    explicit Audio(const char* path);
    ~Audio() override;

    /// Makes the proxy of a device's audio when the daemon is there (ListNames of the bus).
    /// @param path the device's, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Audio, deleted by the caller; null when the daemon is not on the bus
    static Audio* getAudio(const char* path);

    /// Asks the daemon to connect all audio profiles that the device has (Connect). Watch the
    /// property "State" to learn what came of it.
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    /// Asks the daemon to disconnect them (Disconnect). @return as connect()
    int disconnect();
};

} // namespace Bluetooth

#endif
