#include "tests/support/allocationcounter.h"

#include <cstdlib>
#include <new>

#ifndef KELM_TIN_FOREIGN_NEW

using kelm::tin::test::AllocationCounter;

// The other forms call these, the sanitizer's too: each form must come from here, or a block made
// by one is freed by another.
void* operator new(std::size_t size) {
    const bool counts = AllocationCounter::mbCounts;
    const bool fails = counts && ++AllocationCounter::mnRequests == AllocationCounter::mnFailAt;
    void* block = fails ? nullptr : std::malloc(size);
    if (block == nullptr)
        throw std::bad_alloc();
    AllocationCounter::mnBalance += counts;
    return block;
}
void operator delete(void* block) noexcept {
    AllocationCounter::mnBalance -= AllocationCounter::mbCounts && block != nullptr;
    std::free(block);
}
void operator delete(void* block, std::size_t) noexcept {
    operator delete(block);
}
void* operator new[](std::size_t size) {
    return operator new(size);
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return std::malloc(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return std::malloc(size);
}
void operator delete[](void* block) noexcept {
    operator delete(block);
}
void operator delete[](void* block, std::size_t) noexcept {
    operator delete(block);
}

#endif
