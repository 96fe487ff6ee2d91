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
static void* Allocate(std::size_t size, std::size_t alignment) {
    const bool counts = Counter::mbCounts;
    const long request = counts ? ++Counter::mnRequests : 0;
    if (counts && request >= Counter::mnFailFrom && request <= Counter::mnFailTo)
        return nullptr;
    void* const block =
        alignment == 0
            ? std::malloc(size)
            : std::aligned_alloc(alignment, (size + alignment - 1) / alignment * alignment);
    Counter::mnBalance += counts && block != nullptr;
    return block;
}
static void* Need(void* block) {
    if (block == nullptr)
        throw std::bad_alloc();
    return block;
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return Allocate(size, 0);
}
void* operator new(std::size_t size) {
    return Need(Allocate(size, 0));
}
void* operator new(std::size_t size, std::align_val_t alignment) {
    return Need(Allocate(size, std::size_t(alignment)));
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
void operator delete(void* block, std::align_val_t) noexcept {
    operator delete(block);
}
void operator delete(void* block, std::size_t, std::align_val_t) noexcept {
    operator delete(block);
}
void operator delete[](void* block) noexcept {
    operator delete(block);
}
void operator delete[](void* block, std::size_t) noexcept {
    operator delete(block);
}

#endif
