#pragma once

#include "services/bundled/store/facets/facetfault.h"
#include "services/memory/largepages.h"
#include "services/vectorlayer.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <vector>

namespace kelm::store {

/// The facets of a layer as one walk has found them, kept in memory for one more walk.
///
/// They are given in their order, and their memory goes back block by block behind the walk. What
/// would take more than MOST_BYTES is not kept at all.
class KeptFacets {
  public:
    /// Most bytes that a layer keeps: three million triangles, or twice as many neighbours.
    static constexpr std::size_t MOST_BYTES = std::size_t{256} << 20;

    explicit KeptFacets(std::size_t mostBytes = MOST_BYTES) : mnMostBytes(mostBytes) {}

    /// Takes the next facet in reading order. Does nothing once something was dropped.
    /// @param number of the facet in its feature, from 0
    /// @param fault why the facet is not delivered @param vertices of the facet if it is delivered
    void Add(std::int64_t feature, std::size_t number, FacetFault fault,
             const std::vector<ZARVertex>& vertices);
    /// Gives the memory back. Nothing is kept from then on.
    void Drop();

    /// @return true if there are facets, and none was given away or dropped
    bool AreWhole() const { return !moBlocks.empty() && mnGone == 0; }
    /// Goes back to the position in front of the first facet. They must be whole.
    void Restart();
    /// Moves to the next facet. @return false behind the last one; all memory is then given back
    bool Advance();

    // Questions about the facet that the last Advance has found.
    std::int64_t GetFeature() const { return moHead.mnFeature; }
    std::size_t GetFacetNumber() const { return static_cast<std::size_t>(moHead.mnNumber); }
    /// @return the number of the facet in the layer, from 1
    std::int64_t GetShapes() const { return mnShapes; }
    /// Copies what is delivered. @param vertices replaced @return None, or why nothing is
    FacetFault Read(std::vector<ZARVertex>& vertices) const;

  private:
    /// What stands in front of the vertices of a facet.
    struct Head {
        std::int64_t mnFeature = 0;
        std::int32_t mnNumber = 0;
        /// The number of a fault; TRIANGLE and the places of its corners, 2 bits each; or RING and
        /// the number of vertices.
        std::int32_t mnKind = 0;
    };
    /// A ring of four whose ends are equal to the bit. A corner that the triangle in front has,
    /// too, is kept as its place there, another one as ELSEWHERE: neighbours follow each other in
    /// most layers, and pages that are not filled need not be fetched.
    static constexpr std::int32_t TRIANGLE = 64;
    static constexpr std::int32_t RING = 128;
    static constexpr unsigned ELSEWHERE = 3;
    using Corners = std::array<ZARVertex, 3>;

    struct Block {
        memory::LargeBlock mpBytes;
        std::size_t mnSize = 0;
        std::size_t mnUsed = 0;
    };

    void AddTriangle(Head head, const std::vector<ZARVertex>& vertices);
    unsigned FindPlace(const ZARVertex& corner) const;
    void TakeTriangle();
    void Append(const Head& head, const ZARVertex* vertices);
    unsigned char* GetRoom(std::size_t bytes);
    static std::size_t CountVertices(const Head& head);

    std::size_t mnMostBytes;
    std::deque<Block> moBlocks;
    std::size_t mnBytes = 0; ///< of all blocks, given away or not
    std::size_t mnGone = 0;  ///< blocks that were given away
    bool mbDropped = false;
    std::size_t mnNext = 0; ///< position of the next facet in the first block that is there
    Head moHead;
    const unsigned char* mpVertices = nullptr; ///< that follow the head
    Corners maTriangle{};                      ///< the present triangle, or the last one in front
    std::int64_t mnShapes = 0;
};

} // namespace kelm::store
