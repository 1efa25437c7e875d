#ifndef KESBLUETOOTH_SCANNER_FINDERS_H
#define KESBLUETOOTH_SCANNER_FINDERS_H

#include <bluetooth/scanner_object.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace Bluetooth {

class Adapter;
class RemoteObject;
class ScannerServer;

/// The finders of a scanner object, whose other half (discoveries, texts, lock) is the server's.
/// May be used on any thread.
class Finders {
public:
    using Set = std::shared_ptr<AddressSet>;

    Finders(ScannerServer& server, ScannerObject& object) : m_server(server), m_object(object) {}

    /// @return null when there is no Bluetooth daemon or it does not know the adapter
    static std::unique_ptr<Adapter> findAdapter(ScannerServer& server, const char* pattern);

    /// See ScannerObject::addFinder().
    Set add(const std::string& adapterId);
    /// See ScannerObject::getListByName().
    Set of(const std::string& path);
    /// Ends the oldest discovery on an adapter, and its finder.
    void remove(Adapter& adapter);

    /// @return address and properties of the devices in the set that the daemon does not know
    std::vector<std::pair<std::string, std::string>> unknownDevices(const AddressSet& set);

    /// Callbacks for the signals of an adapter.
    static void deviceFound(ScannerServer& server, const RemoteObject* sender,
                            const std::string& address, const std::string& text);
    static void deviceDisappeared(ScannerServer& server, const RemoteObject* sender,
                                  const std::string& address);

private:
    static bool isListening(ScannerServer& server, const RemoteObject* sender);

    ScannerServer& m_server;
    ScannerObject& m_object;
};

/// The server that handlers and callbacks go to; null before the first is complete.
ScannerServer* currentServer();

} // namespace Bluetooth

#endif
