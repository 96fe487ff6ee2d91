#include "tin/heightgrid/crowd.h"

#include "tin/index/leafwalk.h"
#include "tin/rules/exactplan.h"

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

bool GetHeight(const Triangle& triangle, float x, float y, EdgeRule eRule, float& h) {
    if (eRule == ER_Float)
        return triangle.GetHeight(x, y, h);
    return rules::GetClosedHeight(*triangle.GetVertex(0), *triangle.GetVertex(1),
                                  *triangle.GetVertex(2), {x, y}, h);
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
    FirstHighest highest;
    if (mpoTree == nullptr)
        return highest.Get();
    const auto holds = [=](const BBox<float, point2_t<float>>& box) {
        return TestInside(box, x, y);
    };
    const auto ask = [&](const std::vector<unsigned>& leaves) {
        for (const unsigned id : leaves) {
            const Triangle& triangle = *mpoSurface->GetTriangle(id);
            float h;
            if (holds(triangle.GetBBox()) && GetHeight(triangle, x, y, eRule, h))
                highest.Add(h, id);
        }
    };
    index::VisitLeaves(static_cast<const AabbNode*>(mpoTree->GetRoot()), holds, ask);
    return highest.Get();
}

std::uint64_t Crowd::GetBytes() const {
    return mpoTree == nullptr ? 0 : mpoSurface->GetObjBytes() + mpoTree->GetObjBytes();
}

} // namespace kelm::tin::heightgrid
