#pragma once

#include "bench/terrain.h"
#include "tin/aabbtree.h"
#include "tin/point.h"

#include <memory>
#include <vector>

namespace kelm::bench {

/// Embree's ways of batching.
enum class Batching {
    Single, ///< one ray a call
    Stream, ///< an array of rays a call
    Packet  ///< 16 rays a call where the processor has them at once, else 8
};

/// A competing index. A new one is one name below and one source file that defines the members for
/// it: Input, Tree and the functions.
///
/// The same calls for all: an index is built over what its library works on, which Prepare makes of
/// a terrain beforehand, and answers from another translation unit, as ours does.
template <typename Peer>
class Index {
  public:
    /// The terrain in the form that the peer's build takes.
    struct Input;

    static const char* GetName();
    static std::shared_ptr<const Input> Prepare(const std::shared_ptr<const Terrain>& poTerrain);

    /// Builds. @param oInput outlives the index
    explicit Index(const Input& oInput);
    Index(const Index&) = delete;
    Index& operator=(const Index&) = delete;
    ~Index();

    /// The greatest height at a surface-local position. @return is there one?
    bool GetHeight(float x, float y, float& h) const;
    /// Height of the highest crossing of the segment from a to b. @return is there one?
    bool GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b, float& h) const;

    /// The heights of many positions by the library's own way of batching, NO_HEIGHT where there is
    /// none. Embree alone has such ways.
    void GetHeights(Batching eBatching, const std::vector<point2_t<float>>& oPositions,
                    std::vector<float>& rHeights) const;

    struct Tree;
    const Tree& GetTree() const { return *mpoTree; }

  private:
    std::unique_ptr<Tree> mpoTree;
};

struct Ours;       ///< AabbTree with its defaults
struct Cgal;       ///< AABB_tree of 3-D triangles
struct Embree;     ///< robust scene; the first hit from above is the highest
struct EmbreeHits; ///< the same scene; a filter lists every hit and the highest is looked up
struct Boost;      ///< R-tree of the triangles' boxes in plan, packed; then the triangle itself

/// The highest crossing of each segment, by all hits of the robust scene; packets are of 8 rays.
/// @param pfHeights NaN for a segment without a crossing
void AnswerSegments(const Index<EmbreeHits>& oIndex, Batching eBatching,
                    const point3_t<float>* poSegments, std::size_t nCount, float* pfHeights);

/// Hands a peer to a generic function.
template <typename Peer>
struct PeerTag {
    using Type = Peer;
};

/// Calls call(PeerTag) for each peer this program was built with, ours first.
template <typename Call>
void ForEachPeer(const Call& call) {
    call(PeerTag<Ours>{});
#ifdef KELM_BENCH_CGAL
    call(PeerTag<Cgal>{});
#endif
#ifdef KELM_BENCH_EMBREE
    call(PeerTag<Embree>{});
    call(PeerTag<EmbreeHits>{});
#endif
#ifdef KELM_BENCH_BOOST
    call(PeerTag<Boost>{});
#endif
}

} // namespace kelm::bench
