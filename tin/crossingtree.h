#pragma once

#include "tin/buildoptions.h"
#include "tin/point.h"
#include "tin/tinexport.h"

#include <cstddef>
#include <cstdint>
#include <memory>

namespace kelm::tin {

class Tin;

namespace crossing {
struct Index;
}

/// Index of a surface for lines: a tree of boxes in space over copies of its triangles.
///
/// Every answer is that of Tin::GetLineIntersectHeight without a tree, to the bit. It is a snapshot
/// of the surface as it was at the build, so it outlives the surface and knows nothing of later
/// changes.
///
/// Queries may run on any number of threads at a time.
class KELM_TIN_EXPORT CrossingTree {
  public:
    /// Builds over a surface, on all cores unless the options say less. The number of threads
    /// changes nothing in the index. It takes as much memory as EstimateObjBytes tells, and so
    /// reads no budget of bytes from the options. Triangles whose stored box is out of date are
    /// tested one by one in each query: see Tin::ComputeTriBBox.
    /// @throw std::bad_alloc; CancelledException, and what the progress function throws
    explicit CrossingTree(const Tin& surface, const BuildOptions& options = {});
    CrossingTree(const CrossingTree&) = delete;
    CrossingTree& operator=(const CrossingTree&) = delete;
    /// Leaves an index behind that finds nothing and writes no height.
    CrossingTree(CrossingTree&& other) noexcept;
    CrossingTree& operator=(CrossingTree&& other) noexcept;
    ~CrossingTree();

    /// The highest crossing of the segment from a to b with the surface, as the segment's own
    /// height there. `float` ends are surface-local, `double` ends are map coordinates.
    /// @param h untouched if the segment misses the surface's box in plan; the lowest finite
    /// `float` if it meets the box but crosses no triangle. It may be a coordinate of a or b
    /// @return is there a crossing?
    bool GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b, float& h) const;
    bool GetLineIntersectHeight(const point3_t<double>& a, const point3_t<double>& b,
                                float& h) const;

    /// The same for many segments in map coordinates: quicker than one by one even on one thread.
    /// @param segments 2 count points: start and end of each segment @param heights count values in
    /// the order of the segments; NaN for a segment without a crossing
    /// @param threads most threads; 0 for the runtime's default. A small batch stays on the calling
    /// thread
    /// @return how many segments have a crossing
    std::size_t GetLineIntersectHeights(const point3_t<double>* segments, std::size_t count,
                                        float* heights, int threads = 0) const;

    /// @return bytes held by this index
    std::uint64_t GetObjBytes() const;
    /// @return bytes that an index of so many triangles will hold at most, if no stored box is out
    /// of date; some 49 a triangle
    static std::uint64_t EstimateObjBytes(unsigned triangleCount);

  private:
    std::unique_ptr<const crossing::Index> mpoIndex;
};

} // namespace kelm::tin
