#include "tin/load/weld.h"

#include "services/memory/largepages.h"
#include "tin/load/cornerhash.h"
#include "tin/octree2.h"
#include "tin/parallel/parallelblocks.h"

#include <numeric>
#include <utility>

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

/// Moves the kept corners to the front, and turns their marks into their new positions.
void Compact(Points& points, std::vector<unsigned>& keys) {
    unsigned kept = 0;
    for (std::size_t i = 0; i < keys.size(); ++i) {
        if (keys[i] != 1)
            continue;
        points[kept] = points[i];
        keys[i] = kept++;
    }
    points.resize(kept);
}

} // namespace

Welded Weld(Points& points, std::vector<Triangle_Id>& ids) {
    auto numbers = memory::CreateLargeList<std::uint32_t>(points.size());
    CornerHash hash(points.size());
    if (hash.Add(points.data(), points.size(), numbers.data()) < points.size())
        return WeldByOctree(points, ids);
    Renumber(ids, [&](unsigned corner) { return numbers[corner]; });
    Points().swap(points);
    return {std::move(hash.GetKept()), std::exchange(ids, {})};
}

Welded WeldByOctree(Points& points, std::vector<Triangle_Id>& ids) {
    auto keys = memory::CreateLargeList<unsigned>(points.size());
    std::iota(keys.begin(), keys.end(), 0U);
    {
        const Octree2 tree(points, keys);
        Renumber(ids, [&](unsigned corner) { return FindStandIn(tree, points, keys, corner); });
    }
    Compact(points, keys);
    Renumber(ids, [&](unsigned corner) { return keys[corner]; });
    return {std::exchange(points, {}), std::exchange(ids, {})};
}

} // namespace kelm::tin::load
