#include "tin/heightgrid/crowd.h"

#include "tin/index/leafwalk.h"
#include "tin/index/prefetch.h"
#include "tin/rules/exactplan.h"

#include <array>
#include <cstddef>

namespace kelm::tin::heightgrid {

namespace {

/// Opens the subsets of a surface, whose arrays it shares.
struct Opened : Tin {
    explicit Opened(const Tin& other) : Tin(other) {}
    using Tin::Subset;
};

std::unique_ptr<const Tin> CopyTriangles(const Tin& tin, const std::vector<unsigned>& ids) {
    std::unique_ptr<Tin> copy(Opened(tin).Subset(ids));
    // The boxes as they are stored, also where vertices have moved since.
    for (unsigned i = 0; i < copy->GetTriangleCount(); ++i)
        copy->GetTriangle(i)->GetBBox() = tin.GetTriangle(ids[i])->GetBBox();
    return copy;
}

/// Leaves come in the tree's order, so of equal heights the triangle decides.
class FirstHighest {
  public:
    void Add(float height, unsigned id) {
        if (height > moHighest.Get()) {
            moHighest.Add(height);
            mnId = id;
        } else if (height == moHighest.Get() && id < mnId && moHighest.IsFound()) {
            moHighest = rules::Highest();
            moHighest.Add(height);
            mnId = id;
        }
    }
    const rules::Highest& Get() const { return moHighest; }

  private:
    rules::Highest moHighest;
    unsigned mnId = 0;
};

/// Triangles of some leaves, whose memory is fetched together: leaves that follow each other go
/// back in memory, which no processor foresees.
class Candidates {
  public:
    Candidates(const Tin& surface, float x, float y, EdgeRule eRule)
        : mrSurface(surface), mfX(x), mfY(y), meRule(eRule) {}

    void Add(unsigned id) {
        const auto* triangle = reinterpret_cast<const char*>(mrSurface.GetTriangle(id));
        index::Prefetch(triangle);
        index::Prefetch(triangle + sizeof(Triangle) - 1);
        maWaiting[mnWaiting++] = id;
        if (mnWaiting == maWaiting.size())
            Ask();
    }
    /// Puts the position to all that wait.
    void Ask();
    const rules::Highest& GetHighest() const { return moHighest.Get(); }

  private:
    const Tin& mrSurface;
    float mfX;
    float mfY;
    EdgeRule meRule;
    FirstHighest moHighest;
    std::array<unsigned, 64> maWaiting;
    std::size_t mnWaiting = 0;
};

bool GetHeight(const Triangle& triangle, float x, float y, EdgeRule eRule, float& h) {
    if (eRule == ER_Float)
        return triangle.GetHeight(x, y, h);
    return rules::GetClosedHeight(*triangle.GetVertex(0), *triangle.GetVertex(1),
                                  *triangle.GetVertex(2), {x, y}, h);
}

void Candidates::Ask() {
    std::size_t near = 0;
    for (std::size_t i = 0; i < mnWaiting; ++i) {
        const Triangle& triangle = *mrSurface.GetTriangle(maWaiting[i]);
        if (!TestInside(triangle.GetBBox(), mfX, mfY))
            continue;
        for (int k = 0; k < 3; ++k)
            index::Prefetch(triangle.GetVertex(k));
        maWaiting[near++] = maWaiting[i];
    }
    for (std::size_t i = 0; i < near; ++i) {
        float h;
        if (GetHeight(*mrSurface.GetTriangle(maWaiting[i]), mfX, mfY, meRule, h))
            moHighest.Add(h, maWaiting[i]);
    }
    mnWaiting = 0;
}

} // namespace

Crowd::Crowd(const Tin& tin, const std::vector<unsigned>& ids) {
    // Larger leaves than a tree has by default, and so fewer nodes.
    constexpr int CAPACITY = 16;
    if (ids.empty())
        return;
    mpoSurface = CopyTriangles(tin, ids);
    auto tree = std::make_unique<AabbTree>();
    tree->SetCapacity(CAPACITY);
    tree->CreateTree(mpoSurface.get());
    mpoTree = std::move(tree);
}

rules::Highest Crowd::Find(float x, float y, EdgeRule eRule) const {
    if (mpoTree == nullptr)
        return {};
    Candidates candidates(*mpoSurface, x, y, eRule);
    const auto holds = [=](const BBox<float, point2_t<float>>& box) {
        return TestInside(box, x, y);
    };
    index::VisitLeaves(static_cast<const AabbNode*>(mpoTree->GetRoot()), holds,
                       [&](const std::vector<unsigned>& leaves) {
                           for (const unsigned id : leaves)
                               candidates.Add(id);
                       });
    candidates.Ask();
    return candidates.GetHighest();
}

std::uint64_t Crowd::GetBytes() const {
    return mpoTree == nullptr ? 0 : mpoSurface->GetObjBytes() + mpoTree->GetObjBytes();
}

} // namespace kelm::tin::heightgrid
