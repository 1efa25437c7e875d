// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_FINDERS_H
#define KESBLUETOOTH_SCANNER_FINDERS_H

#include "scanner/scanner_state.h"

#include <memory>
#include <string>

namespace Bluetooth {

class ScannerServer;

/// Makes, looks up and ends the finders of a server's scanner object, or of any other: what the
/// Bluetooth daemon is asked for them, around what ScannerState keeps.
///
/// May be used on any thread. No lock is held while the daemon is asked, so two threads may make a
/// finder for the same adapter at once: the first is kept.
class Finders {
public:
    using Set = ScannerState::Set;

    /// In bytes. A client may name an adapter by a string that the system bus would not carry: it
    /// disconnects who tries.
    static constexpr std::size_t longestAdapterId = 255;

    Finders(ScannerServer& server, ScannerState& state, ScannerObject& served)
        : m_server(server), m_state(state), m_served(served) {}

    /// @return null when there is no Bluetooth daemon or it does not know the adapter; also for
    ///         "any", which the daemon knows, but cannot discover with, and for what is too long
    ///         to be passed on
    std::unique_ptr<Adapter> findAdapter(const char* pattern);

    /// See ScannerObject::addFinder().
    Set add(ScannerObject& object, const std::string& adapterId);
    /// See ScannerObject::getListByName().
    Set of(ScannerObject& object, const std::string& path);
    /// Ends the oldest discovery on an adapter, and its finder.
    void remove(ScannerObject& object, Adapter& adapter);

    /// Asks the daemon which devices it knows, and shows the others in the set.
    void showUnknownDevices(const AddressSet& set, const ScannerState::Show& show);
    /// Waits while much of the answers before is still to be written: programs can ask faster than
    /// the bus takes answers, and each of these would be kept in memory.
    void awaitAnswersWritten();

    /// Callbacks for the signals of an adapter.
    void deviceFound(const RemoteObject* sender, const std::string& address,
                     const std::string& text);
    void deviceDisappeared(const RemoteObject* sender, const std::string& address);

private:
    ScannerServer& m_server;
    ScannerState& m_state;
    ScannerObject& m_served;
};

/// The finders of the current server, to which handlers and callbacks go; null before the first
/// server is complete.
Finders* currentFinders();

} // namespace Bluetooth

#endif
