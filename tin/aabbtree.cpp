#include "tin/aabbtree.h"

#include "services/exception.h"
#include "tin/tin.h"

#include <algorithm>
#include <limits>
#include <memory>
#include <numeric>
#include <utility>

namespace kelm::tin {

namespace {

std::uint64_t GetTreeBytes(std::uint64_t nodes, std::uint64_t triangles) {
    return (16 * nodes + triangles) * 4 + 32;
}

} // namespace

AabbTree::AabbTree(const Tin* poTin) {
    try {
        CreateTree(poTin);
    } catch (...) {
        delete mpoRoot;
        throw;
    }
}

AabbTree::AabbTree(AabbTree&& other) noexcept {
    *this = std::move(other);
}

AabbTree& AabbTree::operator=(AabbTree&& other) noexcept {
    std::swap(mpoRoot, other.mpoRoot);
    std::swap(mnNodeCount, other.mnNodeCount);
    std::swap(moInfo, other.moInfo);
    std::swap(mnTriangleCount, other.mnTriangleCount);
    return *this;
}

AabbTree::~AabbTree() {
    delete mpoRoot;
}

void AabbTree::CreateTree(const Tin* poTin) {
    if (poTin == nullptr)
        throw ParameterException("poTin", ParameterException::PT_Invalid, "", "",
                                 "The TIN used to create AabbTree cannot be empty", "tin/aabbtree",
                                 __PRETTY_FUNCTION__, __LINE__);
    delete mpoRoot;
    mpoRoot = nullptr;
    mnNodeCount = 0;
    mnTriangleCount = 0;

    Triangle* triangles;
    unsigned count;
    poTin->GetTriangleList(triangles, count);
    if (count == 0)
        return;
    mnTriangleCount = count;
    std::vector<unsigned> list(count);
    std::iota(list.begin(), list.end(), 0U);
    mpoRoot = new AabbNode;
    mpoRoot->Build(triangles, std::move(list), *this);
}

void AabbTree::FindLeaves(float x, float y, std::vector<unsigned>& list) const {
    if (mpoRoot != nullptr)
        mpoRoot->FindLeaves(x, y, list);
}

void AabbTree::FindLeaves(const BBox<float, point2_t<float>>& box,
                          std::vector<unsigned>& list) const {
    if (mpoRoot != nullptr)
        mpoRoot->FindLeaves(box, list);
}

std::uint64_t AabbTree::GetObjBytes() const {
    return GetTreeBytes(mnNodeCount, mnTriangleCount);
}

std::uint64_t AabbTree::EstimateObjBytes(unsigned n) const {
    // Leaves are taken as filled to 0.7 of the capacity.
    const double a = static_cast<double>(2U * n);
    const double b = static_cast<double>(GetCapacity()) * 0.7;
    const double quotient = std::min(a / b, static_cast<double>(std::numeric_limits<int>::max()));
    // The quotient of 0 and 0 is no number.
    const std::uint64_t nodes = quotient >= 0.0 ? static_cast<std::uint64_t>(quotient) : 0;
    return GetTreeBytes(nodes + 1, n);
}

} // namespace kelm::tin

std::uint64_t EstimateAabbTreeBytes(unsigned n) {
    return std::make_unique<kelm::tin::AabbTree>()->EstimateObjBytes(n);
}
