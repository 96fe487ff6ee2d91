// Corner lists: the octree holds or has a twin of each. The hash, where it decides, and the weld of
// triangles as they come agree with it.

#include "fuzz/bytes.h"
#include "tin/load/cornerhash.h"
#include "tin/load/welder.h"
#include "tin/octree2.h"

#include <numeric>

using fuzz::Require;
using kelm::tin::Octree2;

namespace {

using Corners = std::vector<kelm::containers::KeyPoint<double>>;

/// The corner that stands for a dropped one.
unsigned GetStandIn(const Octree2& tree, const kelm::containers::KeyPoint<double>& corner) {
    const auto* leaf = static_cast<const Octree2::Node*>(tree.FindLeaf(corner));
    if (leaf == nullptr || !Octree2::IsTwin(leaf->moPoint, corner))
        leaf = tree.FindTwin(corner);
    Require(leaf != nullptr && Octree2::IsTwin(leaf->moPoint, corner));
    return leaf->mnKey;
}

bool IsSame(double a, double b) {
    return a == b || std::memcmp(&a, &b, sizeof a) == 0;
}

/// @param numbers a corner's position among the kept ones @param firsts the kept ones
void TestWelder(const Corners& corners, const std::vector<unsigned>& numbers,
                const std::vector<unsigned>& firsts, bool isPart) {
    kelm::tin::load::Welder welder(static_cast<int>(corners.size() / 3), isPart);
    for (std::size_t i = 0; i < corners.size(); i += 3) {
        ZARVertex ring[3];
        for (std::size_t k = 0; k < 3; ++k)
            ring[k] = {corners[i + k].x, corners[i + k].y, corners[i + k].z};
        welder.AddTriangle({ring, 3});
    }
    const kelm::tin::load::Welded welded = welder.Finish();
    Require(welded.triangles.size() == corners.size() / 3);
    for (std::size_t i = 0; i < welded.triangles.size(); ++i) {
        const Triangle_Id& id = welded.triangles[i];
        Require(id.id0 == numbers[3 * i] && id.id1 == numbers[3 * i + 1] &&
                id.id2 == numbers[3 * i + 2]);
    }
    Require(welded.corners.size() == firsts.size());
    for (std::size_t i = 0; i < firsts.size(); ++i) {
        const auto& kept = welded.corners[i];
        const auto& wanted = corners[firsts[i]];
        Require(IsSame(kept.x, wanted.x) && IsSame(kept.y, wanted.y) && IsSame(kept.z, wanted.z));
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Bytes bytes(data, size);
    fuzz::Coordinates<double> coordinates(bytes, 3e-10);
    const double shift = size % 4 >= 2 ? 0.63 / 1048576.0 : 0.0; // to the sides of the hash's cells
    Corners corners;
    while (!bytes.IsEmpty() && corners.size() < 60)
        corners.push_back(
            {coordinates.Take() + shift, coordinates.Take() + shift, coordinates.Take() + shift});
    while (corners.size() % 3 != 0)
        corners.push_back(corners[0]);
    std::vector<unsigned> keys(corners.size());
    std::iota(keys.begin(), keys.end(), 0U);
    const Octree2 tree(corners, keys);

    // The corners in front of the first one that the hash leaves to the octree are decided.
    const bool isPart = size % 2 == 1; // the table of the hash then grows
    std::vector<std::uint32_t> hashed(corners.size());
    kelm::tin::load::CornerHash hash(isPart ? 0 : corners.size());
    const std::size_t decided = hash.Add(corners.data(), corners.size(), hashed.data());
    std::vector<unsigned> numbers(corners.size());
    std::vector<unsigned> firsts;
    for (unsigned i = 0; i < corners.size(); ++i) {
        Require(keys[i] <= 1);
        if (keys[i] == 1) {
            numbers[i] = static_cast<unsigned>(firsts.size());
            firsts.push_back(i);
        }
    }
    for (unsigned i = 0; i < corners.size(); ++i) {
        if (keys[i] == 0) {
            const unsigned standIn = GetStandIn(tree, corners[i]);
            Require(keys[standIn] == 1);
            numbers[i] = numbers[standIn];
        }
        Require(i >= decided || hashed[i] == numbers[i]);
    }
    Require(static_cast<std::size_t>(tree.GetPointCount()) == firsts.size());
    if (!corners.empty())
        TestWelder(corners, numbers, firsts, isPart);
    return 0;
}
