// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/own_dispatch.h"

#include <algorithm>
#include <atomic>
#include <mutex>
#include <new>
#include <thread>
#include <vector>

namespace Bluetooth {

struct OwnDispatch::Threads {
    std::atomic<int> count{0}; // spares programs that never dispatch the lock
    std::mutex mutex;          // for `inside`
    std::vector<std::thread::id> inside;
};

struct OwnDispatch::Mark {
    explicit Mark(std::shared_ptr<Threads> marked)
        : threads(std::move(marked)), thread(std::this_thread::get_id()) {
        const std::lock_guard<std::mutex> lock(threads->mutex);
        threads->inside.push_back(thread);
        ++threads->count;
    }
    ~Mark() {
        const std::lock_guard<std::mutex> lock(threads->mutex);
        threads->inside.erase(std::find(threads->inside.begin(), threads->inside.end(), thread));
        --threads->count;
    }
    Mark(const Mark&) = delete;
    Mark& operator=(const Mark&) = delete;

    std::shared_ptr<Threads> threads;
    std::thread::id thread;
};

OwnDispatch::OwnDispatch() : m_threads(std::make_shared<Threads>()) {}

void OwnDispatch::mark(DBusMessage* message) {
    static dbus_int32_t slot = -1;
    static const bool haveSlot = dbus_message_allocate_data_slot(&slot);
    if (!haveSlot)
        return;
    try {
        auto owned = std::make_unique<Mark>(m_threads);
        const auto destroy = [](void* data) { delete static_cast<Mark*>(data); };
        if (dbus_message_set_data(message, slot, owned.get(), destroy))
            owned.release();
    } catch (const std::bad_alloc&) {
        // Unmarked, a call in the handler waits in vain; without memory it would fail anyway.
    }
}

bool OwnDispatch::isHere() const {
    if (m_threads->count == 0)
        return false;
    const std::lock_guard<std::mutex> lock(m_threads->mutex);
    const auto& inside = m_threads->inside;
    return std::find(inside.begin(), inside.end(), std::this_thread::get_id()) != inside.end();
}

} // namespace Bluetooth
