#include "tin/tin.h"

#include "tin/aabbtree.h"
#include "tin/detail/leafwalk.h"
#include "tin/detail/parallelscan.h"
#include "tin/detail/prefetch.h"
#include "tin/detail/segmentprobe.h"
#include "tin/ray2.h"

#include <array>
#include <limits>

namespace kelm::tin {

namespace {

constexpr float LOWEST = -std::numeric_limits<float>::max();

/// The crossing rule: the highest wins, and a NaN replaces nothing.
void KeepHighest(const Triangle& triangle, const point3_t<float>& a, const point3_t<float>& b,
                 float& height) {
    float h;
    if (triangle.GetLineIntersectHeight(a, b, h) == IR_Inside && h > height)
        height = h;
}

/// Highest crossing of a segment with the triangles of the leaves that it meets.
///
/// They are tested in batches, in their order: a batch once its triangles, and then their vertices,
/// have been asked for, since a walk over a large surface mostly waits for memory.
class CrossingBatch {
  public:
    CrossingBatch(const Triangle* triangles, const point3_t<float>& a, const point3_t<float>& b)
        : mpoTriangles(triangles), mrA(a), mrB(b) {}

    void Add(const std::vector<unsigned>& leaves) {
        for (const unsigned id : leaves) {
            detail::Prefetch(mpoTriangles + id);
            mao[mnSize++] = mpoTriangles + id;
            if (mnSize == mao.size())
                TestAll();
        }
    }

    /// Tests what is left first.
    float GetHighest() {
        TestAll();
        return mfHighest;
    }

  private:
    void TestAll() {
        for (std::size_t i = 0; i < mnSize; ++i)
            for (int k = 0; k < 3; ++k)
                detail::Prefetch(mao[i]->GetVertex(k));
        for (std::size_t i = 0; i < mnSize; ++i)
            if (mao[i]->IsIntersectedLine(mrA.x, mrA.y, mrB.x, mrB.y))
                KeepHighest(*mao[i], mrA, mrB, mfHighest);
        mnSize = 0;
    }

    const Triangle* mpoTriangles;
    const point3_t<float>& mrA;
    const point3_t<float>& mrB;
    std::array<const Triangle*, 32> mao;
    std::size_t mnSize = 0;
    float mfHighest = LOWEST;
};

} // namespace

bool Tin::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b, float& h,
                                 const AabbTree* tree) const {
    if (!IsIntersectedBBox(moBBox, a, b))
        return false;
    h = LOWEST;
    if (tree != nullptr) {
        const detail::SegmentProbe probe(a, b);
        const auto meets = [&](const BBox<float, point2_t<float>>& box) {
            return probe.IsMet(box);
        };
        CrossingBatch batch(mpoTriangles, a, b);
        detail::VisitLeaves(tree->GetRoot(), meets,
                            [&](const std::vector<unsigned>& leaves) { batch.Add(leaves); });
        h = batch.GetHighest();
    } else {
        std::vector<unsigned> list;
        FindTrianglesByLine(a, b, list, nullptr);
        for (const unsigned id : list)
            KeepHighest(mpoTriangles[id], a, b, h);
    }
    return h > LOWEST;
}

bool Tin::GetLineIntersectHeight(const point3_t<double>& a, const point3_t<double>& b, float& h,
                                 const AabbTree* tree) const {
    const auto toLocal = [this](const point3_t<double>& p) {
        return point3_t<float>{static_cast<float>(p.x - mdfXBase),
                               static_cast<float>(p.y - mdfYBase), static_cast<float>(p.z)};
    };
    return GetLineIntersectHeight(toLocal(a), toLocal(b), h, tree);
}

template <typename P>
void Tin::FindTrianglesByLine(const P& a, const P& b, std::vector<unsigned>& out,
                              const AabbTree* tree) const {
    const auto touches = [&](unsigned id) {
        return mpoTriangles[id].IsIntersectedLine(a.x, a.y, b.x, b.y);
    };
    if (tree == nullptr) {
        detail::ParallelScan(mnTriangles, mnThreads, touches, out);
        return;
    }
    if (tree->GetRoot() != nullptr)
        tree->GetRoot()->FindLeavesByLine(a, b, out);
    std::vector<unsigned> touched;
    for (const unsigned id : out)
        if (touches(id))
            touched.push_back(id);
    out.swap(touched);
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
