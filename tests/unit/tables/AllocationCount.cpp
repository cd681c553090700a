#include "AllocationCount.h"

#include <cstdlib>
#include <new>

// The program's operator new, which counts.

namespace {
thread_local long allocations = 0;
}

long allocationCount() noexcept {
    return allocations;
}

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
