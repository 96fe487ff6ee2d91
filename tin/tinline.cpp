#include "tin/tin.h"

#include "tin/aabbtree.h"
#include "tin/index/leafwalk.h"
#include "tin/index/prefetch.h"
#include "tin/index/search.h"
#include "tin/index/segmentprobe.h"
#include "tin/parallel/parallelbatch.h"
#include "tin/ray2.h"
#include "tin/rules/frame.h"

#include <array>
#include <atomic>
#include <limits>

namespace kelm::tin {

namespace {

/// Segments by a tree that are worth a thread.
constexpr std::size_t SMALLEST = 256;
/// Triangles that a scan passes in the time of a segment by a tree.
constexpr std::size_t TRIANGLES_SCANNED = 200;

/// Adds the height at which a segment crosses a triangle, if it does.
void AddCrossing(const Triangle& triangle, const point3_t<float>& a, const point3_t<float>& b,
                 rules::Highest& highest) {
    float h;
    if (triangle.IsIntersectedLine(a.x, a.y, b.x, b.y) &&
        triangle.GetLineIntersectHeight(a, b, h) == IR_Inside)
        highest.Add(h);
}

/// Crossings of a segment with the triangles of the leaves that it meets.
///
/// Triangles are tested in batches, in their order. Those of a batch, and then their vertices, are
/// asked for ahead, since a walk over a large surface mostly waits for memory.
class CrossingBatch {
  public:
    CrossingBatch(const Triangle* triangles, const point3_t<float>& a, const point3_t<float>& b,
                  rules::Highest& rHighest)
        : mpoTriangles(triangles), mrA(a), mrB(b), mrHighest(rHighest) {}

    void Add(const std::vector<unsigned>& leaves) {
        for (const unsigned id : leaves) {
            index::Prefetch(mpoTriangles + id);
            maoBatch[mnSize++] = mpoTriangles + id;
            if (mnSize == maoBatch.size())
                TestAll();
        }
    }

    void TestAll() {
        for (std::size_t i = 0; i < mnSize; ++i)
            for (int k = 0; k < 3; ++k)
                index::Prefetch(maoBatch[i]->GetVertex(k));
        for (std::size_t i = 0; i < mnSize; ++i)
            AddCrossing(*maoBatch[i], mrA, mrB, mrHighest);
        mnSize = 0;
    }

  private:
    const Triangle* mpoTriangles;
    const point3_t<float>& mrA;
    const point3_t<float>& mrB;
    rules::Highest& mrHighest;
    std::array<const Triangle*, 32> maoBatch;
    std::size_t mnSize = 0;
};

} // namespace

/// @param most threads of a scan
bool Tin::FindCrossing(const point3_t<float>& a, const point3_t<float>& b, float& h,
                       const AabbTree* tree, int most) const {
    if (!IsIntersectedBBox(moBBox, a, b))
        return false;
    const auto walk = [&](const AabbNode* root, rules::Highest& highest) {
        const index::SegmentProbe probe(a, b);
        const auto meets = [&](const BBox<float, point2_t<float>>& box) {
            return probe.IsMet(box);
        };
        CrossingBatch batch(mpoTriangles, a, b, highest);
        index::VisitLeaves(root, meets,
                           [&](const std::vector<unsigned>& leaves) { batch.Add(leaves); });
        batch.TestAll();
    };
    const auto ask = [&](rules::Highest& highest, unsigned id) {
        AddCrossing(mpoTriangles[id], a, b, highest);
    };
    // h may be a coordinate of a or b, so it is written last.
    const rules::Highest highest = index::Search(tree, mnTriangles, most).FindHighest(walk, ask);
    h = highest.Get();
    return highest.IsFound();
}

bool Tin::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b, float& h,
                                 const AabbTree* tree) const {
    TestTree(tree);
    return FindCrossing(a, b, h, tree, mnThreads);
}

bool Tin::GetLineIntersectHeight(const point3_t<double>& a, const point3_t<double>& b, float& h,
                                 const AabbTree* tree) const {
    const rules::Frame frame(mdfXBase, mdfYBase);
    return GetLineIntersectHeight(frame.ToLocal(a), frame.ToLocal(b), h, tree);
}

std::size_t Tin::GetLineIntersectHeights(const point3_t<double>* segments, std::size_t count,
                                         float* heights, const AabbTree* tree, int threads) const {
    TestTree(tree);
    const rules::Frame frame(mdfXBase, mdfYBase);
    std::atomic<std::size_t> found{0};
    const auto find = [&](std::size_t first, std::size_t last) {
        std::size_t foundHere = 0;
        for (; first < last; ++first) {
            if (FindCrossing(frame.ToLocal(segments[2 * first]),
                             frame.ToLocal(segments[2 * first + 1]), heights[first], tree, 1))
                ++foundHere;
            else
                heights[first] = std::numeric_limits<float>::quiet_NaN();
        }
        found += foundHere;
    };
    const std::size_t weight = tree == nullptr ? mnTriangles / TRIANGLES_SCANNED + 1 : 1;
    parallel::ParallelBatch(count, SMALLEST / weight + 1, threads, find);
    return found;
}

template <typename P>
void Tin::FindTrianglesByLine(const P& a, const P& b, std::vector<unsigned>& out,
                              const AabbTree* tree) const {
    TestTree(tree);
    const auto touches = [&](unsigned id) {
        return mpoTriangles[id].IsIntersectedLine(a.x, a.y, b.x, b.y);
    };
    const auto findLeaves = [&](const AabbNode& root, std::vector<unsigned>& list) {
        root.FindLeavesByLine(a, b, list);
    };
    index::Search(tree, mnTriangles, mnThreads).List(findLeaves, touches, touches, out);
}

template KELM_TIN_EXPORT void Tin::FindTrianglesByLine(const point2_t<float>&,
                                                       const point2_t<float>&,
                                                       std::vector<unsigned>&,
                                                       const AabbTree*) const;
template KELM_TIN_EXPORT void Tin::FindTrianglesByLine(const point3_t<float>&,
                                                       const point3_t<float>&,
                                                       std::vector<unsigned>&,
                                                       const AabbTree*) const;

} // namespace kelm::tin
