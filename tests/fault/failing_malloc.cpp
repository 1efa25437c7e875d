#include "fault/failing_malloc.h"

#include "support/scale.h"

#include <atomic>
#include <cerrno>
#include <cstddef>

namespace Bluetooth::Test {

namespace {

thread_local int untilFailure = 0; // 0: none fails; below: it has
std::atomic<long> blocks{0};

} // namespace

FailingMalloc::FailingMalloc(int which) {
    untilFailure = which;
}

FailingMalloc::~FailingMalloc() {
    untilFailure = 0;
}

bool FailingMalloc::hasFailed() const {
    return untilFailure < 0;
}

long liveBlocks() {
    return blocks;
}

} // namespace Bluetooth::Test

// The library's failures are logged by the thousand here; recording them would take memory.
extern "C" void syslog(int /*priority*/, const char* /*format*/, ...) {}

#if !defined(__SANITIZE_ADDRESS__) &&                                                              \
    !defined(__SANITIZE_THREAD__) // they have a malloc of their own

namespace {

bool mayAllocate() {
    using Bluetooth::Test::untilFailure;
    if (untilFailure <= 0 || --untilFailure > 0)
        return true;
    untilFailure = -1;
    errno = ENOMEM;
    return false;
}

void* counted(void* block) {
    if (block)
        ++Bluetooth::Test::blocks;
    return block;
}

} // namespace

#define KES_REPLACES_LIBC __attribute__((visibility("default")))

extern "C" {

// NOLINTBEGIN(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp): the C library's names
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);
void __libc_free(void* block);
// NOLINTEND(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp)

KES_REPLACES_LIBC void* malloc(std::size_t size) {
    return mayAllocate() ? counted(__libc_malloc(size)) : nullptr;
}

KES_REPLACES_LIBC void* calloc(std::size_t count, std::size_t size) {
    return mayAllocate() ? counted(__libc_calloc(count, size)) : nullptr;
}

KES_REPLACES_LIBC void* realloc(void* block, std::size_t size) {
    if (!mayAllocate())
        return nullptr;
    void* moved = __libc_realloc(block, size);
    return block ? moved : counted(moved);
}

KES_REPLACES_LIBC void free(void* block) {
    if (block)
        --Bluetooth::Test::blocks;
    __libc_free(block);
}
}

#endif
