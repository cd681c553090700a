#include "host/framework/HandleTable.h"

#include <atomic>
#include <cstdint>
#include <mutex>
#include <new>

namespace zrm::host {

namespace {

// A slot's state: generation in the upper 16 bits, the closed flag, the number of pins. One 32-bit
// word, so that taking a pin and checking the generation are one atomic step.
constexpr unsigned generationShift = 16;
constexpr std::uint32_t closed = 0x8000;
constexpr std::uint32_t pins = 0x7fff;

constexpr unsigned chunkSize = 1024;
constexpr unsigned chunks = 64;
constexpr std::uint32_t none = 0xffffffff;

struct Slot {
    std::atomic<std::uint32_t> state{closed};
    std::atomic<ctreq*> request{nullptr};
    std::uint32_t nextFree = none; ///< guarded by the mutex
};

// Constant-initialised and without destructors: requests are still used while the process exits.
std::atomic<Slot*> g_chunks[chunks];
constinit std::mutex g_mutex;
// The free slots, oldest first; guarded by the mutex.
unsigned g_chunkCount = 0;
std::uint32_t g_firstFree = none;
std::uint32_t g_lastFree = none;

Slot& slotAt(std::uint32_t index) noexcept {
    return g_chunks[index / chunkSize].load(std::memory_order_acquire)[index % chunkSize];
}

Slot* slotOf(unsigned handle) noexcept {
    const std::uint32_t index = handle & 0xffff;
    Slot* const chunk = g_chunks[index / chunkSize].load(std::memory_order_acquire);
    return chunk != nullptr ? chunk + index % chunkSize : nullptr;
}

bool isOf(std::uint32_t state, unsigned handle) noexcept {
    return state >> generationShift == handle >> generationShift;
}

void pushFree(std::uint32_t index) noexcept {
    slotAt(index).nextFree = none;
    (g_lastFree != none ? slotAt(g_lastFree).nextFree : g_firstFree) = index;
    g_lastFree = index;
}

void addChunk() noexcept {
    if (g_chunkCount == chunks) {
        return;
    }
    auto* const chunk = new (std::nothrow) Slot[chunkSize];
    if (chunk == nullptr) {
        return;
    }
    const std::uint32_t first = g_chunkCount * chunkSize;
    g_chunks[g_chunkCount++].store(chunk, std::memory_order_release);
    for (std::uint32_t index = first; index < first + chunkSize; ++index) {
        pushFree(index);
    }
}

std::uint32_t popFree() noexcept {
    if (g_firstFree == none) {
        addChunk();
    }
    const std::uint32_t index = g_firstFree;
    if (index != none) {
        g_firstFree = slotAt(index).nextFree;
        if (g_firstFree == none) {
            g_lastFree = none;
        }
    }
    return index;
}

/// The generation after this one; never 0, so that no handle is 0.
std::uint32_t nextGeneration(std::uint32_t generation) noexcept {
    return generation == 0xffff ? 1 : generation + 1;
}

} // namespace

unsigned HandleTable::open(ctreq* request) noexcept {
    const std::lock_guard guard(g_mutex);
    const std::uint32_t index = popFree();
    if (index == none) {
        return 0;
    }
    Slot& slot = slotAt(index);
    const std::uint32_t generation =
        nextGeneration(slot.state.load(std::memory_order_relaxed) >> generationShift);
    slot.request.store(request, std::memory_order_relaxed);
    slot.state.store(generation << generationShift, std::memory_order_release);
    return generation << generationShift | index;
}

ctreq* HandleTable::pin(unsigned handle) noexcept {
    Slot* const slot = slotOf(handle);
    if (slot == nullptr) {
        return nullptr;
    }
    std::uint32_t state = slot->state.load(std::memory_order_relaxed);
    do {
        if (!isOf(state, handle) || (state & closed) != 0 || (state & pins) == pins) {
            return nullptr;
        }
    } while (!slot->state.compare_exchange_weak(state, state + 1, std::memory_order_acquire,
                                                std::memory_order_relaxed));
    return slot->request.load(std::memory_order_relaxed);
}

void HandleTable::unpin(unsigned handle) noexcept {
    Slot* const slot = slotOf(handle);
    if (slot == nullptr) {
        return;
    }
    std::uint32_t state = slot->state.load(std::memory_order_relaxed);
    do {
        if (!isOf(state, handle) || (state & pins) == 0) {
            return;
        }
    } while (!slot->state.compare_exchange_weak(state, state - 1, std::memory_order_release,
                                                std::memory_order_relaxed));
    if ((state & closed) != 0 && (state & pins) == 1) {
        slot->state.notify_all();
    }
}

void HandleTable::close(unsigned handle) noexcept {
    Slot* const slot = slotOf(handle);
    if (slot == nullptr) {
        return;
    }
    std::uint32_t state = slot->state.load(std::memory_order_relaxed);
    do {
        if (!isOf(state, handle) || (state & closed) != 0) {
            return;
        }
    } while (!slot->state.compare_exchange_weak(state, state | closed, std::memory_order_relaxed));
    // Acquire pairs with the release of the last unpin, making its holder's writes visible.
    while (((state = slot->state.load(std::memory_order_acquire)) & pins) != 0) {
        slot->state.wait(state, std::memory_order_acquire);
    }
    slot->request.store(nullptr, std::memory_order_relaxed);
    const std::lock_guard guard(g_mutex);
    pushFree(handle & 0xffff);
}

} // namespace zrm::host
