#include "tin/crossingtree.h"

#include "tin/crossing/batch.h"
#include "tin/crossing/build/builder.h"
#include "tin/crossing/layout.h"
#include "tin/crossing/walk.h"
#include "tin/parallel/parallelbatch.h"
#include "tin/ray2.h"
#include "tin/tin.h"

#include <algorithm>
#include <atomic>
#include <limits>

namespace kelm::tin {

namespace {

/// Segments that are worth a thread.
constexpr std::size_t WORTH_A_THREAD = 256;

} // namespace

CrossingTree::CrossingTree(const Tin& surface, const BuildOptions& options)
    : mpoIndex(std::make_unique<crossing::Index>(crossing::Builder(surface, options).Build())) {}

CrossingTree::CrossingTree(CrossingTree&& other) noexcept = default;
CrossingTree& CrossingTree::operator=(CrossingTree&& other) noexcept = default;
CrossingTree::~CrossingTree() = default;

bool CrossingTree::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b,
                                          float& h) const {
    if (mpoIndex == nullptr || !IsIntersectedBBox(mpoIndex->box, a, b))
        return false;
    crossing::Walk walk;
    walk.Start(*mpoIndex, a, b);
    while (!walk.IsDone())
        walk.Step();
    // h may be a coordinate of a or b, so it is written last.
    h = walk.GetHighest().Get();
    return walk.GetHighest().IsFound();
}

bool CrossingTree::GetLineIntersectHeight(const point3_t<double>& a, const point3_t<double>& b,
                                          float& h) const {
    if (mpoIndex == nullptr)
        return false;
    return GetLineIntersectHeight(mpoIndex->frame.ToLocal(a), mpoIndex->frame.ToLocal(b), h);
}

std::size_t CrossingTree::GetLineIntersectHeights(const point3_t<double>* segments,
                                                  std::size_t count, float* heights,
                                                  int threads) const {
    if (mpoIndex == nullptr) {
        std::fill_n(heights, count, std::numeric_limits<float>::quiet_NaN());
        return 0;
    }
    std::atomic<std::size_t> found{0};
    const auto answer = [&](std::size_t first, std::size_t last) {
        found += crossing::Batch(*mpoIndex, segments, heights).Answer(first, last);
    };
    parallel::ParallelBatch(count, WORTH_A_THREAD, threads, answer);
    return found;
}

std::uint64_t CrossingTree::GetObjBytes() const {
    std::uint64_t bytes = sizeof *this;
    if (mpoIndex != nullptr)
        bytes += sizeof *mpoIndex + mpoIndex->roots.capacity() * sizeof(unsigned) +
                 mpoIndex->nodes.GetBytes() + mpoIndex->upperNodes.GetBytes() +
                 mpoIndex->blocks.GetBytes() + mpoIndex->ids.GetBytes() +
                 mpoIndex->stale.capacity() * sizeof(crossing::StaleTriangle);
    return bytes;
}

std::uint64_t CrossingTree::EstimateObjBytes(unsigned triangleCount) {
    using namespace crossing;
    if (triangleCount == 0)
        return sizeof(CrossingTree) + sizeof(Index);
    // Each of two trees may have a group that is not full.
    const std::uint64_t groups = std::uint64_t{triangleCount} / GROUP + 2;
    // At worst the lowest nodes have two groups each, and those above eight nodes.
    const std::uint64_t upperNodes = 4 * groups / 7;
    const std::uint64_t rounding = std::uint64_t{4} << 16;
    return sizeof(CrossingTree) + sizeof(Index) + rounding +
           groups * (sizeof(Node) + WIDTH * sizeof(Block) + GROUP * sizeof(unsigned)) +
           upperNodes * sizeof(UpperNode);
}

} // namespace kelm::tin
