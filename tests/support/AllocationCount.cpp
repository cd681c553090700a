#include "support/AllocationCount.h"

#include <cstdlib>
#include <new>

namespace {

thread_local long allocations = 0;

} // namespace

long allocationCount() noexcept {
    return allocations;
}

// The replaceable allocation functions: the library's other forms come down to these.

void* operator new(std::size_t size) {
    ++allocations;
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
