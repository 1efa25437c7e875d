// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/own_dispatch.h"

#include <algorithm>
#include <atomic>
#include <mutex>
#include <new>
#include <thread>
#include <vector>

namespace Bluetooth {

struct OwnDispatch::Mark {
    explicit Mark(std::shared_ptr<Threads> marked);
    ~Mark();
    Mark(const Mark&) = delete;
    Mark& operator=(const Mark&) = delete;

    std::shared_ptr<Threads> threads;
    const std::thread::id thread = std::this_thread::get_id();
};

/// The threads that are inside a dispatch: the last mark of each, unless that has ended.
struct OwnDispatch::Threads {
    std::atomic<int> count{0}; // spares programs that never dispatch the lock
    std::mutex mutex;          // for `inside`
    std::vector<const Mark*> inside;

    template <class Condition>
    void removeIf(Condition isOver) {
        const std::lock_guard<std::mutex> lock(mutex);
        inside.erase(std::remove_if(inside.begin(), inside.end(), isOver), inside.end());
        count = static_cast<int>(inside.size());
    }
};

OwnDispatch::Mark::Mark(std::shared_ptr<Threads> marked) : threads(std::move(marked)) {
    const std::lock_guard<std::mutex> lock(threads->mutex);
    threads->inside.push_back(this);
    ++threads->count;
}

OwnDispatch::Mark::~Mark() {
    threads->removeIf([this](const Mark* mark) { return mark == this; });
}

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
            static_cast<void>(owned.release()); // the message's now
    } catch (const std::bad_alloc&) {
        // Unmarked, a call in the handler waits in vain; without memory it would fail anyway.
    }
}

void OwnDispatch::end() {
    if (m_threads->count > 0)
        m_threads->removeIf(isOfThisThread);
}

bool OwnDispatch::isHere() const {
    if (m_threads->count == 0)
        return false;
    const std::lock_guard<std::mutex> lock(m_threads->mutex);
    const auto& inside = m_threads->inside;
    return std::any_of(inside.begin(), inside.end(), isOfThisThread);
}

bool OwnDispatch::isOfThisThread(const Mark* mark) {
    return mark->thread == std::this_thread::get_id();
}

} // namespace Bluetooth
