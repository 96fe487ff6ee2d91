#include "tin/load/weld.h"

#include "tin/load/cornerhash.h"
#include "tin/octree2.h"
#include "tin/parallel/parallelblocks.h"

#include <numeric>

namespace kelm::tin::load {

namespace {

using Points = std::vector<containers::KeyPoint<double>>;

/// The kept corner that stands for a corner. A kept one stands for itself. For a dropped one it is
/// the point of the leaf that its search reaches. If a later split has led that search away from
/// the point it is a twin of, it is the twin of lowest index. There is one: a held point stays.
unsigned FindStandIn(const Octree2& tree, const Points& points, const std::vector<unsigned>& keys,
                     unsigned corner) {
    if (keys[corner] == 1)
        return corner;
    const auto* leaf = static_cast<const Octree2::Node*>(tree.FindLeaf(points[corner]));
    if (leaf == nullptr || !Octree2::IsTwin(leaf->moPoint, points[corner]))
        leaf = tree.FindTwin(points[corner]);
    return leaf->mnKey;
}

template <typename StandIn>
void Renumber(std::vector<Triangle_Id>& ids, const StandIn& getStandIn) {
    parallel::ParallelBlocks(
        static_cast<unsigned>(ids.size()), omp_get_max_threads(),
        [&](unsigned, unsigned first, unsigned last) {
            for (unsigned i = first; i < last; ++i)
                for (std::uint32_t* id : {&ids[i].id0, &ids[i].id1, &ids[i].id2})
                    *id = getStandIn(*id);
        });
}

/// Welds where no octree is needed. @return the number of kept corners, 0 if one is
unsigned WeldByHash(const Points& points, std::vector<Triangle_Id>& ids,
                    std::vector<unsigned>& keys) {
    if (!CornerHash::FindStandIns(points, keys))
        return 0;
    Renumber(ids, [&](unsigned corner) { return keys[corner]; });
    unsigned kept = 0;
    for (unsigned i = 0; i < keys.size(); ++i) {
        keys[i] = keys[i] == i ? 1 : 0;
        kept += keys[i];
    }
    return kept;
}

} // namespace

unsigned Weld(Points& points, std::vector<Triangle_Id>& ids, std::vector<unsigned>& keys) {
    if (const unsigned kept = WeldByHash(points, ids, keys); kept != 0)
        return kept;
    std::iota(keys.begin(), keys.end(), 0U);
    const Octree2 tree(points, keys);
    Renumber(ids, [&](unsigned corner) { return FindStandIn(tree, points, keys, corner); });
    return static_cast<unsigned>(tree.GetPointCount());
}

} // namespace kelm::tin::load
