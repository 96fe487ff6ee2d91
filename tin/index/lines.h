#pragma once

#include "tin/index/nodeblocks.h"

#include <cstddef>
#include <cstring>
#include <utility>

namespace kelm::tin::index {

/// A cache line, the unit in which records are laid.
struct alignas(64) Line {
    unsigned char bytes[64];
};

/// Memory of a fixed number of lines, unset. It moves and does not copy.
class Lines {
  public:
    Lines() = default;
    /// @throw std::bad_alloc
    explicit Lines(std::size_t count)
        : mnBytes(Round(count * sizeof(Line))),
          mpoLines(count == 0 ? nullptr : static_cast<Line*>(AllocateBlock(mnBytes))) {}
    Lines(Lines&& other) noexcept
        : mnBytes(other.mnBytes), mpoLines(std::exchange(other.mpoLines, nullptr)) {}
    Lines& operator=(Lines&& other) noexcept {
        std::swap(mnBytes, other.mnBytes);
        std::swap(mpoLines, other.mpoLines);
        return *this;
    }
    ~Lines() {
        if (mpoLines != nullptr)
            FreeBlock(mpoLines, mnBytes);
    }

    Line* Get() { return mpoLines; }
    const Line* Get() const { return mpoLines; }
    std::size_t GetBytes() const { return mpoLines == nullptr ? 0 : mnBytes; }

  private:
    static std::size_t Round(std::size_t bytes) {
        constexpr std::size_t PAGE = 4096;
        return bytes < PAGE ? bytes : (bytes + PAGE - 1) / PAGE * PAGE;
    }

    std::size_t mnBytes = 0;
    Line* mpoLines = nullptr;
};

} // namespace kelm::tin::index
