#include "tests/scripted/allocationfault.h"

#include "tests/support/scriptedservices.h"

#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <limits>
#include <new>

namespace {

constexpr long NEVER = std::numeric_limits<long>::max();

std::atomic<long> nFirstFailing{NEVER};
std::atomic<long> nLastFailing{NEVER};
std::atomic<long> nRequests{0};
std::atomic<long> nFailed{0};
std::atomic<long> nLiving{0};

/// Stands before each block, since a block of the services may be released by the library.
struct alignas(std::max_align_t) Head {
    bool mbCounted;
};

void* Allocate(std::size_t size) noexcept {
    const bool counted = !scripted::Serving::IsServing();
    if (counted && nFirstFailing != NEVER) {
        const long request = ++nRequests;
        if (request >= nFirstFailing && request <= nLastFailing) {
            ++nFailed;
            return nullptr;
        }
    }
    if (size > std::numeric_limits<std::size_t>::max() - sizeof(Head))
        return nullptr;
    auto* head = static_cast<Head*>(std::malloc(sizeof(Head) + size));
    if (head == nullptr)
        return nullptr;
    head->mbCounted = counted;
    nLiving += counted;
    return head + 1;
}

void* AllocateOrThrow(std::size_t size) {
    void* block = Allocate(size);
    if (block == nullptr)
        throw std::bad_alloc();
    return block;
}

void Release(void* block) noexcept {
    if (block == nullptr)
        return;
    Head* head = static_cast<Head*>(block) - 1;
    nLiving -= head->mbCounted;
    std::free(head);
}

} // namespace

faults::Injector::Injector(long nFirst, bool isLasting) {
    nRequests = 0;
    nFailed = 0;
    nLastFailing = isLasting ? NEVER : nFirst;
    nFirstFailing = nFirst;
}

faults::Injector::~Injector() {
    nFirstFailing = NEVER;
}

long faults::Injector::GetFailed() {
    return nFailed;
}

long faults::GetLiving() {
    return nLiving;
}

// All forms, since a sanitizer brings its own of each that is not here.
void* operator new(std::size_t size) {
    return AllocateOrThrow(size);
}
void* operator new[](std::size_t size) {
    return AllocateOrThrow(size);
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return Allocate(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return Allocate(size);
}
void operator delete(void* block) noexcept {
    Release(block);
}
void operator delete[](void* block) noexcept {
    Release(block);
}
void operator delete(void* block, std::size_t) noexcept {
    Release(block);
}
void operator delete[](void* block, std::size_t) noexcept {
    Release(block);
}
void operator delete(void* block, const std::nothrow_t&) noexcept {
    Release(block);
}
void operator delete[](void* block, const std::nothrow_t&) noexcept {
    Release(block);
}
