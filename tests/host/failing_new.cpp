#include "host/failing_new.h"

#include <cstdlib>
#include <new>

namespace Bluetooth::Test {

thread_local int allocationsLeft = -1;

namespace {

bool shallFail() {
    return allocationsLeft >= 0 && allocationsLeft-- == 0;
}

} // namespace

} // namespace Bluetooth::Test

void* operator new(std::size_t size) {
    void* const memory = Bluetooth::Test::shallFail() ? nullptr : malloc(size);
    return memory ? memory : throw std::bad_alloc();
}

void operator delete(void* memory) noexcept {
    free(memory);
}

void operator delete(void* memory, std::size_t /*size*/) noexcept {
    free(memory);
}
