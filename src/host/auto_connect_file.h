// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_AUTO_CONNECT_FILE_H
#define KESBLUETOOTH_HOST_AUTO_CONNECT_FILE_H

#include <fstream>
#include <string>
#include <vector>

namespace Bluetooth {

/// The folder of the configuration files, with its slash.
constexpr const char* autoConnectFolder = "/etc/bluetooth/autoconnect/";

/// The configuration file of an adapter.
std::string autoConnectPath(const char* adapter);

/// An open configuration file: a flag, a comma, and addresses with commas between them.
class AutoConnectFile {
public:
    /// The open mode is std::fstream's.
    AutoConnectFile(const std::string& path, std::ios::openmode mode);

    bool isOpen() const { return m_file.is_open(); }
    /// Whether it is too large to be a list of addresses; such a file is not to be read.
    bool isTooLarge();
    /// The number at the beginning is there and is not 0.
    bool readsNonZero();
    /// The number at the beginning is 1. Any other cannot be read as a flag.
    bool readsEnabled();
    /// The texts between the commas, from the third byte to the end of the file. What follows a
    /// comma at the very end is not an entry.
    std::vector<std::string> readEntries();
    /// Whether the last readEntries() came to the end of the file. A list that is cut short by a
    /// read error must not be written back.
    bool isComplete() const { return m_complete; }

private:
    std::fstream m_file;
    bool m_complete = false;
};

/// The list of entries without those equal to `device`, as it stands behind the flag.
std::string listWithout(const std::vector<std::string>& entries, const std::string& device);

/// Overwrites a file with `content`.
/// @return false, with nothing of the file certain, on a full disk for example
bool writeAutoConnectFile(std::ofstream& file, const std::string& content);

} // namespace Bluetooth

#endif
