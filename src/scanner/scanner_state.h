// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_SCANNER_STATE_H
#define KESBLUETOOTH_SCANNER_SCANNER_STATE_H

#include <bluetooth/scanner_object.h>

#include "scanner/found_devices.h"

#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace Bluetooth {

class Adapter;
class RemoteObject;

/// A discovery that was started for a finder.
struct StartedDiscovery {
    std::shared_ptr<Adapter> adapter;  // subscribed; destroying it ends the subscriptions
    std::shared_ptr<AddressSet> found; // the finder's, or nobody's when there was a finder
};

/// What the threads of the scanner service share: finders and the discoveries behind them, what is
/// known of devices, and how long the service lives on.
///
/// LOCK. One lock, taken by each operation and by nobody else, guards all of it; the finders of a
/// scanner object and their sets too, which are therefore read and changed here only. Any thread
/// may call any operation at any time.
///
/// Under the lock nothing is called (no bus, no callback, but who copies what is shown), no other
/// lock is taken, and no Adapter is destroyed: that waits for the adapter's callbacks, and they use
/// this state. What is taken out is therefore returned, for the caller to destroy.
class ScannerState {
public:
    /// Holding a set keeps it alive; what it holds is guarded all the same.
    using Set = std::shared_ptr<AddressSet>;
    /// Copies the address and the properties of a device, under the lock: it does nothing else.
    using Show = std::function<void(const std::string& address, const std::string& text)>;

    /// Keeps a discovery, makes its set the adapter's finder where there is none, and lets the
    /// service live on.
    void addFinder(ScannerObject& object, const std::string& path,
                   const StartedDiscovery& discovery);
    /// @return null when the adapter has no finder
    Set finder(const ScannerObject& object, const std::string& path) const;
    void forgetFinder(ScannerObject& object, const std::string& path);

    /// Takes the oldest discovery on an adapter. @return one without adapter when there is none
    StartedDiscovery takeDiscovery(const std::string& path);
    /// Takes all discoveries and forgets all finders.
    std::vector<StartedDiscovery> takeAll(ScannerObject& object);
    /// Whether a proxy that calls back belongs to a discovery, and so is an Adapter. One that was
    /// taken may still call; it must not act any more, nor be looked at: it is being destroyed.
    bool isListening(const RemoteObject* sender) const;

    /// A device came into reach of a finder, or its properties changed. The one not heard of for
    /// longest goes from all finders when there are too many.
    /// @param set null when there is no finder: the properties are kept all the same
    void addDevice(const Set& set, const std::string& address, const std::string& text);
    /// A device left the reach of a finder. Its properties are kept.
    void removeDevice(const Set& set, const std::string& address);
    /// Shows the devices in the set that the daemon does not know.
    void showUnknownDevices(const AddressSet& set, const Show& show) const;

    /// See ScannerServer::putInfoToMap() and getInfoFromMap().
    void putText(const std::string& address, const std::string& text);
    std::string text(const std::string& address);

    /// Sets the devices that the daemon knows, which are left out of answers.
    void setFilter(AddressSet known);
    bool isInFilter(const std::string& address) const;

    /// Counts one tick of the timer. @return whether the service is to end now; once below 0 it
    /// never is, since only reaching 0 ends it
    bool countDown();

private:
    using Lock = std::unique_lock<std::mutex>;
    static constexpr int ticksToLive = 30;

    void keep(Lock lock, const std::string& address, const std::string& text);

    mutable std::mutex m_mutex; // guards what follows, and the finders of scanner objects
    std::vector<StartedDiscovery> m_discoveries;
    AddressSet m_filter;
    FoundDevices m_devices; // those in the finders' sets among them
    bool m_hadTooMany = false;
    int m_idleCountdown = ticksToLive;
};

} // namespace Bluetooth

#endif
