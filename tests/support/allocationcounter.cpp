#include "tests/support/allocationcounter.h"

#include <cstdlib>

using Counter = kelm::tin::test::AllocationCounter;

// The operators of clang's thread sanitizer cannot be replaced.
#ifdef __clang__
#if __has_feature(thread_sanitizer)
#define KELM_TIN_FOREIGN_NEW
const bool Counter::IS_ACTIVE = false;
#endif
#endif
#ifndef KELM_TIN_FOREIGN_NEW
const bool Counter::IS_ACTIVE = true;
// Each form must come from here, or a block made by one is freed by another, a sanitizer's for one.
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    if (!Counter::mbCounts)
        return std::malloc(size);
    const long request = ++Counter::mnRequests;
    const bool fails = request >= Counter::mnFailFrom && request <= Counter::mnFailTo;
    void* const block = fails ? nullptr : std::malloc(size);
    Counter::mnBalance += block != nullptr;
    return block;
}
void* operator new(std::size_t size) {
    void* const block = operator new(size, std::nothrow);
    if (block == nullptr)
        throw std::bad_alloc();
    return block;
}
void* operator new[](std::size_t size) {
    return operator new(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return operator new(size, std::nothrow);
}
void operator delete(void* block) noexcept {
    Counter::mnBalance -= Counter::mbCounts && block != nullptr;
    std::free(block);
}
void operator delete(void* block, std::size_t) noexcept {
    operator delete(block);
}
void operator delete[](void* block) noexcept {
    operator delete(block);
}
void operator delete[](void* block, std::size_t) noexcept {
    operator delete(block);
}

#endif
