// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_AUTO_CONNECT_FILE_H
#define KESBLUETOOTH_HOST_AUTO_CONNECT_FILE_H

#include <bluetooth/auto_connect.h>

#include <string>
#include <vector>

namespace Bluetooth {

/// The folder of the configuration files, with its slash.
constexpr const char* autoConnectFolder = "/etc/bluetooth/autoconnect/";

/// The configuration file of an adapter.
std::string autoConnectPath(const char* adapter);

/// What a configuration file held when this object was made: a flag, a comma, and addresses with
/// commas between them.
class AutoConnectFile {
public:
    /// @param access O_RDONLY, or O_RDWR to find out also whether it could be written
    AutoConnectFile(const std::string& path, int access);

    /// Whether it is a file and could be opened.
    bool isOpen() const { return m_isOpen; }
    /// Whether it is too large to be a list of addresses; nothing of such a file is read.
    bool isTooLarge() const { return m_isTooLarge; }
    /// Whether it could be read to its end. A list that is cut short must not be written back.
    bool isComplete() const { return m_error == 0; }
    /// Why it could not be opened or read, as errno has it; 0 when it could.
    int error() const { return m_error; }

    /// The number at the beginning is there and is not 0.
    bool readsNonZero() const;
    /// The number at the beginning is 1. Any other cannot be read as a flag.
    bool readsEnabled() const;
    /// The texts between the commas, from the third byte to the end of the file. What follows a
    /// comma at the very end is not an entry.
    std::vector<std::string> entries() const;

private:
    /// @return 0 or an error
    int read(int descriptor);

    std::string m_content;
    bool m_isOpen = false;
    bool m_isTooLarge = false;
    int m_error = 0;
};

/// A list as it stands in a file.
std::string contentOf(const AutoConnect::List& list);

/// An entry for the log: printable, told from what others look like, and not endless.
std::string shownEntry(const std::string& entry);

} // namespace Bluetooth

#endif
