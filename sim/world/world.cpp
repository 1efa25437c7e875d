// SPDX-License-Identifier: LGPL-2.1-or-later
#include "world/world.h"

#include <algorithm>

namespace Bluetooth::Sim {

std::shared_ptr<AdapterHardware> World::adapter(const std::string& id) const {
    const auto found = std::find_if(adapters.begin(), adapters.end(),
                                    [&](const auto& adapter) { return adapter->id() == id; });
    return found == adapters.end() ? nullptr : *found;
}

std::shared_ptr<PeerDevice> World::peer(const std::string& address) const {
    const auto found = std::find_if(peers.begin(), peers.end(),
                                    [&](const auto& peer) { return peer->address == address; });
    return found == peers.end() ? nullptr : *found;
}

unsigned World::freeIndex() const {
    unsigned index = 0;
    while (adapter("hci" + std::to_string(index)))
        ++index;
    return index;
}

void World::store(AdapterHardware& adapter, const PeerDevice& peer) {
    if (!peer.known || (!peer.adapter.empty() && peer.adapter != adapter.id()))
        return;
    StoredDevice& stored = adapter.storage[peer.address];
    stored.known = true;
    stored.paired = peer.paired;
    stored.trusted = peer.trusted;
    stored.blocked = peer.blocked;
    stored.name = peer.name;
    stored.alias = peer.alias;
    stored.deviceClass = peer.deviceClass;
    stored.uuids = peer.uuids;
    std::sort(stored.uuids.begin(), stored.uuids.end());
    stored.vendor = peer.vendor;
    stored.product = peer.product;
    stored.version = peer.version;
}

} // namespace Bluetooth::Sim
