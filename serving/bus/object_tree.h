// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_OBJECT_TREE_H
#define KESBLUETOOTH_SERVING_BUS_OBJECT_TREE_H

#include "serving/bus/interface.h"

#include <map>
#include <string>
#include <vector>

namespace Bluetooth::Serving {

/// Which object serves which interfaces at which path.
///
/// Answers as libdbus and the daemon do: an unknown interface, method or signature is
/// UnknownMethod, an unknown path UnknownObject. A path with something below it exists, and can be
/// introspected.
class ObjectTree {
public:
    /// @param object  what the table's handlers cast back to; not owned
    void add(const std::string& path, const Interface& interface, void* object);
    /// An object that serves nothing: it exists, but has no methods.
    void add(const std::string& path) { m_objects[path]; }
    void remove(const std::string& path);

    void dispatch(const CallPtr& call) const;

private:
    struct Served {
        const Interface* interface;
        void* object;
    };

    void introspect(const CallPtr& call) const;
    std::vector<std::string> childrenOf(const std::string& path) const;

    std::map<std::string, std::vector<Served>> m_objects;
};

} // namespace Bluetooth::Serving

#endif
