#pragma once

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <new>
#include <type_traits>
#include <vector>

#if __has_include(<sys/mman.h>)
#include <sys/mman.h>
#endif

namespace kelm::memory {

constexpr std::size_t LARGE_PAGE = std::size_t{2} << 20;

/// Asks the system for large pages for an array that is about to be filled. To fetch a page costs
/// more than to fill it, and a load fills a hundred bytes a triangle and more. Only the speed
/// changes, if anything; small arrays are left alone.
/// @param first,bytes memory that is allocated and not touched yet
inline void AdviseLargePages(void* first, std::size_t bytes) noexcept {
#ifdef MADV_HUGEPAGE
    constexpr std::uintptr_t PAGE = 4096;
    if (bytes < 2 * LARGE_PAGE)
        return;
    const std::size_t behind = reinterpret_cast<std::uintptr_t>(first) % PAGE;
    const int error = errno;
    static_cast<void>(madvise(static_cast<char*>(first) - behind, bytes + behind, MADV_HUGEPAGE));
    errno = error;
#else
    static_cast<void>(first);
    static_cast<void>(bytes);
#endif
}

struct BlockRelease {
    void operator()(unsigned char* block) const { std::free(block); }
};
using LargeBlock = std::unique_ptr<unsigned char[], BlockRelease>;

/// @param bytes a multiple of LARGE_PAGE @return that many bytes, from the start of a large page on
/// @throw std::bad_alloc
inline LargeBlock CreateLargeBlock(std::size_t bytes) {
    LargeBlock block(static_cast<unsigned char*>(std::aligned_alloc(LARGE_PAGE, bytes)));
    if (!block)
        throw std::bad_alloc();
    AdviseLargePages(block.get(), bytes);
    return block;
}

/// Reserves room in a list, on large pages. @throw as std::vector::reserve
template <typename T>
void ReserveLarge(std::vector<T>& list, std::size_t count) {
    if (count <= list.capacity())
        return;
    std::vector<T> moved;
    moved.reserve(count);
    AdviseLargePages(moved.data(), count * sizeof(T));
    moved.assign(list.begin(), list.end());
    list.swap(moved);
}

/// @return a list of so many copies of a value, on large pages
template <typename T>
std::vector<T> CreateLargeList(std::size_t count, const T& value = T()) {
    std::vector<T> list;
    ReserveLarge(list, count);
    list.resize(count, value);
    return list;
}

/// @return what `new T[count]` gives, on large pages
template <typename T>
std::unique_ptr<T[]> CreateLargeArray(std::size_t count) {
    static_assert(std::is_trivially_destructible_v<T>); // or the array has a count in front
    void* const room = ::operator new[](count * sizeof(T));
    AdviseLargePages(room, count * sizeof(T));
    return std::unique_ptr<T[]>(new (room) T[count]);
}

} // namespace kelm::memory
