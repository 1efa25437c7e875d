// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SCANNERD_SERVICE_NAME_H
#define KESBT_SCANNERD_SERVICE_NAME_H

#include <bluetooth/remote_object.h>

#include <string>

namespace Scannerd {

/// The service's name on the session bus, and who owns it.
class ServiceName : public Bluetooth::RemoteObject {
public:
    ServiceName();

    /// @return the owner's unique name; "" when nobody owns it
    std::string owner();
    /// Gives it up: calls made from now on go to the next owner, or start one. Takes 1 s at most.
    void release();
};

} // namespace Scannerd

#endif
