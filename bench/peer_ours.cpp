#include "bench/peers.h"

namespace kelm::bench {

template <>
struct Index<Ours>::Input {
    std::shared_ptr<const tin::Tin> poSurface;
};

template <>
struct Index<Ours>::Tree {
    std::shared_ptr<const tin::Tin> poSurface;
    tin::AabbTree oTree;
};

template <>
const char* Index<Ours>::GetName() {
    return "ours";
}

template <>
std::shared_ptr<const Index<Ours>::Input>
Index<Ours>::Prepare(const std::shared_ptr<const Terrain>& poTerrain) {
    return std::make_shared<Input>(Input{GetSurface(poTerrain->sName)});
}

template <>
Index<Ours>::Index(const Input& oInput)
    : mpoTree(new Tree{oInput.poSurface, tin::AabbTree(oInput.poSurface.get())}) {}

template <>
Index<Ours>::~Index() = default;

template <>
bool Index<Ours>::GetHeight(float x, float y, float& h) const {
    return mpoTree->poSurface->GetHeight(x, y, h, &mpoTree->oTree);
}

template <>
bool Index<Ours>::GetLineIntersectHeight(const point3_t<float>& a, const point3_t<float>& b,
                                         float& h) const {
    return mpoTree->poSurface->GetLineIntersectHeight(a, b, h, &mpoTree->oTree);
}

} // namespace kelm::bench
