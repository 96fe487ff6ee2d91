// Corner lists: the octree holds or has a twin of each, and the hash, where it decides, agrees.

#include "fuzz/bytes.h"
#include "tin/load/cornerhash.h"
#include "tin/octree2.h"

#include <numeric>

using fuzz::Require;
using kelm::tin::Octree2;

namespace {

/// The corner that stands for a dropped one.
unsigned GetStandIn(const Octree2& tree, const kelm::containers::KeyPoint<double>& corner) {
    const auto* leaf = static_cast<const Octree2::Node*>(tree.FindLeaf(corner));
    if (leaf == nullptr || !Octree2::IsTwin(leaf->moPoint, corner))
        leaf = tree.FindTwin(corner);
    Require(leaf != nullptr && Octree2::IsTwin(leaf->moPoint, corner));
    return leaf->mnKey;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    fuzz::Coordinates<double> coordinates(bytes, 3e-10);
    std::vector<kelm::containers::KeyPoint<double>> corners;
    while (!bytes.IsEmpty() && corners.size() < 300)
        corners.push_back({coordinates.Take(), coordinates.Take(), coordinates.Take()});
    std::vector<unsigned> keys(corners.size());
    std::iota(keys.begin(), keys.end(), 0U);
    const Octree2 tree(corners, keys);

    // The corners in front of the first one that the hash leaves to the octree are decided.
    std::vector<std::uint32_t> numbers(corners.size());
    kelm::tin::load::CornerHash hash(corners.size());
    const std::size_t decided = hash.Add(corners.data(), corners.size(), numbers.data());
    std::vector<unsigned> firsts;
    unsigned kept = 0;
    for (unsigned i = 0; i < corners.size(); ++i) {
        Require(keys[i] <= 1);
        kept += keys[i];
        const unsigned standIn = keys[i] == 1 ? i : GetStandIn(tree, corners[i]);
        Require(keys[standIn] == 1);
        if (i >= decided)
            continue;
        if (numbers[i] == firsts.size())
            firsts.push_back(i);
        Require(firsts.at(numbers[i]) == standIn);
    }
    Require(static_cast<unsigned>(tree.GetPointCount()) == kept);
    return 0;
}
