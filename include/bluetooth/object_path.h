// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_OBJECT_PATH_H
#define KESBLUETOOTH_OBJECT_PATH_H

#include <bluetooth/export.h>

#include <string>

namespace Bluetooth {

/// A D-Bus object path, such as "/org/bluez/1234/hci0".
///
/// It is not checked here: an ObjectPath may hold any string, and only appending it to a message
/// (RemoteObject::append) rejects an invalid path.
class KESBLUETOOTH_API ObjectPath {
public:
    /// The empty string.
    ObjectPath() = default;
    /// Copies the string. @param text must not be null
    ObjectPath(const char* text);
    /// Copies the string.
    ObjectPath(const std::string& text);

    /// Copies the string.
    ObjectPath(const ObjectPath&) = default;
    /// Copies the string.
    ObjectPath& operator=(const ObjectPath& other) = default;

    /// The string, never null; valid while the object lives and is not changed.
    const char* c_str() const { return m_path.c_str(); }
    /// The string, as c_str() returns it.
    operator const char*() const { return m_path.c_str(); }

    /// A copy of the string.
    std::string str() const { return m_path; }
    /// A copy of the string.
    operator std::string() const { return m_path; }

private:
    std::string m_path;
};

} // namespace Bluetooth

#endif
