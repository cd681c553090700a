#include "unit/host/framework/AllocationCount.h"

#include <cstdlib>
#include <new>

namespace {

thread_local int t_allocations = 0;

} // namespace

int allocationCount() {
    return t_allocations;
}

// The replaceable allocation functions: the library's other forms come down to these.
void* operator new(std::size_t size) {
    ++t_allocations;
    if (void* const memory = std::malloc(size != 0 ? size : 1)) {
        return memory;
    }
    throw std::bad_alloc();
}
void operator delete(void* memory) noexcept {
    std::free(memory);
}
void operator delete(void* memory, std::size_t /*size*/) noexcept {
    std::free(memory);
}
