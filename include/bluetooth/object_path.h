#ifndef KESBLUETOOTH_OBJECT_PATH_H
#define KESBLUETOOTH_OBJECT_PATH_H

#include <bluetooth/export.h>

#include <string>

namespace Bluetooth {

/// A D-Bus object path held as text, such as "/org/bluez/1234/hci0".
///
/// The text is not checked here: an ObjectPath may hold any text, and only appending it to a
/// message (RemoteObject::append) rejects one that is not a path.
class KESBLUETOOTH_API ObjectPath {
public:
    /// The empty text.
    ObjectPath() = default;
    /// Copies the text. @param text must not be null
    ObjectPath(const char* text);
    /// Copies the text.
    ObjectPath(const std::string& text);

    /// Copies the text.
    ObjectPath(const ObjectPath&) = default;
    /// Copies the text.
    ObjectPath& operator=(const ObjectPath& other) = default;

    /// The held text, never null; valid while the object lives and is not changed.
    const char* c_str() const { return m_path.c_str(); }
    /// The held text, as c_str() gives it.
    operator const char*() const { return m_path.c_str(); }

    /// A copy of the held text.
    std::string str() const { return m_path; }
    /// A copy of the held text.
    operator std::string() const { return m_path; }

private:
    std::string m_path;
};

} // namespace Bluetooth

#endif
