#include "tin/octree2.h"

#include <gtest/gtest.h>
#include <pthread.h>

#include <cmath>
#include <numeric>

namespace {

using Corners = std::vector<kelm::containers::KeyPoint<double>>;
using List = std::vector<unsigned>;

/// @return the corners that welding keeps; each dropped one must lead to a kept twin before it
List Weld(Corners corners) {
    List keys(corners.size()), kept;
    std::iota(keys.begin(), keys.end(), 0U);
    const kelm::tin::Octree2 tree(corners, keys);
    for (unsigned i = 0; i < keys.size(); ++i)
        if (keys[i] == 1)
            kept.push_back(i);
        else if (const auto* twin = tree.FindTwin(corners[i]); twin == nullptr || twin->mnKey >= i)
            ADD_FAILURE() << "corner " << i << " leads nowhere";
    return kept;
}

TEST(OctreeTest, TwinsFallOnTheFirstWithinABox) {
    EXPECT_EQ(Weld(Corners(5000, {4e5, 4e6, 300})), (List{0}));
    EXPECT_EQ(Weld({{0, 0, 0}, {9e-10, 9e-10, -9e-10}}), (List{0})) << "a box, no ball";
    EXPECT_EQ(Weld({{0, 0, 0}, {1e-9, 0, 0}, {0, 1e-9, 0}, {0, 0, 1e-9}}), (List{0, 1, 2, 3}));
    EXPECT_EQ(Weld({{0, 0, 0}, {6e-10, 0, 0}, {12e-10, 0, 0}}), (List{0, 2})) << "no chain";
    // On the two sides of the root's centre, which lies at 0 and is on the low one.
    EXPECT_EQ(Weld({{-1, 0, 0}, {1, 0, 0}, {-2e-10, 0, 0}, {2e-10, 0, 0}}), (List{0, 1, 2, 3}));
    EXPECT_EQ(Weld({{-1, 0, 0}, {1, 0, 0}, {-2e-10, 0, 0}, {0, 0, 0}}), (List{0, 1, 2}));
}

// The depth is that of the widest cell, halved down to near twins at its low end.
void* WeldWildNumbers(void*) {
    constexpr double most = 0x1.fffffffffffffp1023;
    for (const double v : {0x1p53, 0x1p54, 1e300, 9e307, most, -most}) {
        EXPECT_EQ(Weld({{v, v, v}, {std::nextafter(v, 0), v, v}, {v, v, v}}), (List{0, 1}));
        EXPECT_EQ(Weld(Corners(3000, {v, 0, v})), (List{0})) << v;
    }
    EXPECT_EQ(Weld({{0, 0, 0}, {most, most, most}, {0.95e-9, 0, 0}, {0, 0, 1.2e-9}}).size(), 3U);
    return nullptr;
}

TEST(OctreeTest, NoNumberBreaksTheTreeOrAStackOf512KiB) {
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_attr_setstacksize(&attributes, 512 * 1024);
    pthread_t thread;
    ASSERT_EQ(pthread_create(&thread, &attributes, WeldWildNumbers, nullptr), 0);
    pthread_join(thread, nullptr);
}

} // namespace
