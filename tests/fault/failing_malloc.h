#ifndef KESBLUETOOTH_TESTS_FAULT_FAILING_MALLOC_H
#define KESBLUETOOTH_TESTS_FAULT_FAILING_MALLOC_H

namespace Bluetooth::Test {

/// Makes one allocation of this thread fail while it lives: the `which`th, from 1. The executable's
/// own malloc() takes the place of the C library's, for libdbus and the C++ library too.
class FailingMalloc {
public:
    explicit FailingMalloc(int which);
    ~FailingMalloc();
    FailingMalloc(const FailingMalloc&) = delete;
    FailingMalloc& operator=(const FailingMalloc&) = delete;

    /// Whether that many allocations were made, so that one has failed.
    bool hasFailed() const;
};

/// How many blocks the process holds.
long liveBlocks();

} // namespace Bluetooth::Test

#endif
