#include "benchmarks/Allocations.h"

#include <malloc.h>

#include <atomic>
#include <cstdlib>
#include <new>

namespace {

std::atomic<std::int64_t> allocated{0}, bytesUsed{0}, mostUsed{0};

void* allocate(std::size_t size) {
    void* block = std::malloc(size);
    if (!block) throw std::bad_alloc();
    allocated.fetch_add(1, std::memory_order_relaxed);
    const auto taken = static_cast<std::int64_t>(malloc_usable_size(block) + 8);
    const auto used = bytesUsed.fetch_add(taken, std::memory_order_relaxed) + taken;
    for (auto most = mostUsed.load(std::memory_order_relaxed);
         used > most && !mostUsed.compare_exchange_weak(most, used, std::memory_order_relaxed);) {
    }
    return block;
}

void release(void* block) noexcept {
    if (block) bytesUsed.fetch_sub(static_cast<std::int64_t>(malloc_usable_size(block) + 8), std::memory_order_relaxed);
    std::free(block);
}

}  // namespace

void* operator new(std::size_t size) {
    return allocate(size);
}
void* operator new[](std::size_t size) {
    return allocate(size);
}
void operator delete(void* block) noexcept {
    release(block);
}
void operator delete[](void* block) noexcept {
    release(block);
}
void operator delete(void* block, std::size_t) noexcept {
    release(block);
}
void operator delete[](void* block, std::size_t) noexcept {
    release(block);
}

namespace corvane::bench {

Allocations Allocations::now() {
    return {allocated.load(), bytesUsed.load(), mostUsed.load()};
}

void Allocations::restartPeak() {
    mostUsed = bytesUsed.load();
}

}  // namespace corvane::bench
