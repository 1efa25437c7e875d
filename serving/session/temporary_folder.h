// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_SESSION_TEMPORARY_FOLDER_H
#define KESBLUETOOTH_SERVING_SESSION_TEMPORARY_FOLDER_H

#include <string>

namespace Bluetooth::Serving {

/// A folder that nobody else can enter, and that goes with all that is in it.
class TemporaryFolder {
public:
    /// @param name  what its own name begins with
    /// @throw std::runtime_error  with a text for the user
    explicit TemporaryFolder(const std::string& name);
    TemporaryFolder(const TemporaryFolder&) = delete;
    TemporaryFolder& operator=(const TemporaryFolder&) = delete;
    ~TemporaryFolder();

    const std::string& path() const { return m_path; }

private:
    std::string m_path;
};

} // namespace Bluetooth::Serving

#endif
