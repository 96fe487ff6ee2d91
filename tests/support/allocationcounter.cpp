#include "tests/support/allocationcounter.h"

#include <cstdlib>

#ifndef KELM_TIN_FOREIGN_NEW

using kelm::tin::test::AllocationCounter;

// The array forms of the standard library call these.
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

#endif
