#pragma once

#include "tin/bbox.h"
#include "tin/index/nodeblocks.h"
#include "tin/point.h"
#include "tin/rules/frame.h"

#include <cstddef>
#include <cstdint>
#include <limits>
#include <utility>
#include <vector>

// What a crossing tree consists of.

namespace kelm::tin::crossing {

constexpr unsigned WIDTH = 8;             ///< children of a node, and triangles of a block
constexpr unsigned GROUP = WIDTH * WIDTH; ///< triangles below a node of blocks

/// Boxes of up to eight children: low x, y, z, then high x, y, z. The box of no child is inside out
/// and infinite, so that no segment meets it.
struct alignas(64) Node {
    float planes[6][WIDTH];
};

/// Eight triangles. Lanes that have none hold a triangle without an extent, which nothing crosses.
struct alignas(64) Block {
    float corners[3][3][WIDTH]; ///< x, y, z of each first corner, then of the others
    float extent;               ///< the longest side of the box of all eight in space
};

/// A node whose children are nodes.
struct alignas(64) UpperNode {
    Node boxes;
    unsigned children[WIDTH]; ///< below `groups` a node of blocks, else an upper node
};

/// A triangle whose stored box is not that of its corners: a corner has moved since.
struct StaleTriangle {
    point3_t<float> corners[3];
    BBox<float, point2_t<float>> box;
    unsigned id;
};

/// An array of plain values, aligned to cache lines and unset.
template <typename T>
class Array {
  public:
    Array() = default;
    explicit Array(std::size_t count)
        : mpItems(count == 0 ? nullptr : static_cast<T*>(index::AllocateBlock(GetBytes(count)))),
          mnItems(count) {}
    Array(Array&& other) noexcept { *this = std::move(other); }
    Array& operator=(Array&& other) noexcept {
        std::swap(mpItems, other.mpItems);
        std::swap(mnItems, other.mnItems);
        return *this;
    }
    ~Array() {
        if (mpItems != nullptr)
            index::FreeBlock(mpItems, GetBytes(mnItems));
    }

    T* GetData() const { return mpItems; }
    T& operator[](std::size_t i) const { return mpItems[i]; }
    std::size_t GetBytes() const { return GetBytes(mnItems); }

  private:
    /// A large block is mapped, and so is rounded to whole pages, which have up to 64 KiB.
    static std::size_t GetBytes(std::size_t count) {
        constexpr std::size_t LARGE = std::size_t{1} << 21;
        constexpr std::size_t PAGE = std::size_t{1} << 16;
        const std::size_t bytes = count * sizeof(T);
        return bytes < LARGE ? bytes : (bytes + PAGE - 1) / PAGE * PAGE;
    }

    T* mpItems = nullptr;
    std::size_t mnItems = 0;
};

/// All of an index: two trees, of the tight triangles and of the loose ones. Node n of blocks has
/// the blocks from 8 n on; upper nodes are numbered behind the nodes of blocks.
struct Index {
    BBox<float, point3_t<float>> box; ///< of the surface
    rules::Frame frame{0.0, 0.0};
    float extent = 0.0F; ///< the longest side of a triangle's box in space
    float low = 0.0F;    ///< height range of the triangles
    float high = 0.0F;
    /// Are so many triangles small against the surface that margins of its size would hold them
    /// all?
    bool isCrowded = false;
    std::vector<unsigned> roots; ///< numbers of nodes
    unsigned groups = 0;         ///< nodes of blocks
    Array<Node> nodes;
    Array<UpperNode> upperNodes;
    Array<Block> blocks;
    Array<unsigned> ids; ///< eight a block
    std::vector<StaleTriangle> stale;
};

} // namespace kelm::tin::crossing
