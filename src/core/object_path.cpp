// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/object_path.h>

namespace Bluetooth {

ObjectPath::ObjectPath(const char* text) : m_path(text ? text : "") {}

ObjectPath::ObjectPath(const std::string& text) : m_path(text) {}

} // namespace Bluetooth
