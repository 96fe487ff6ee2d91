#include "tests/scripted/readerfixture.h"
#include "tin/detail/cornerhash.h"
#include "tin/octree2.h"

#include <pthread.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <random>
#include <set>
#include <tuple>

namespace {

using Corner = kelm::containers::KeyPoint<double>;
using Corners = std::vector<Corner>;
using Kept = std::vector<unsigned>;
using kelm::tin::Octree2;

constexpr double HIGHEST = std::numeric_limits<double>::max();
constexpr double INF = std::numeric_limits<double>::infinity();

struct Welded {
    Kept kept;
    int strays = 0;      ///< dropped corners whose search misses the point they fell on
    bool hashed = false; ///< welded by hash with the same outcome
};

/// Welds and checks what holds for any input: each dropped corner leads to a kept twin.
Welded Weld(Corners corners) {
    std::vector<unsigned> keys(corners.size()), standIns(corners.size());
    for (unsigned i = 0; i < keys.size(); ++i)
        keys[i] = i;
    const Octree2 tree(corners, keys);
    Welded welded;
    welded.hashed = kelm::tin::detail::CornerHash::FindStandIns(corners, standIns);
    for (unsigned i = 0; i < keys.size(); ++i) {
        EXPECT_TRUE(!welded.hashed || keys[i] == (standIns[i] == i ? 1U : 0U)) << i;
        if (keys[i] == 1) {
            welded.kept.push_back(i);
            continue;
        }
        const Octree2::Node* leaf = tree.FindLeaf(corners[i]);
        if (leaf == nullptr || !Octree2::IsTwin(leaf->moPoint, corners[i])) {
            ++welded.strays;
            leaf = tree.FindTwin(corners[i]);
        }
        if (leaf == nullptr || keys[leaf->mnKey] != 1 ||
            !Octree2::IsTwin(corners[leaf->mnKey], corners[i]) ||
            (welded.hashed && leaf->mnKey != standIns[i]))
            ADD_FAILURE() << "corner " << i << " leads nowhere";
    }
    EXPECT_EQ(static_cast<int>(welded.kept.size()), tree.GetPointCount());
    EXPECT_EQ(welded.kept.front(), 0U) << "the first corner is always held";
    return welded;
}

/// Clusters of near twins: about the origin, about the side of a hash cell, or spread over ten
/// powers of ten.
Corners CreateClusters(unsigned seed, int count) {
    std::mt19937 random(seed);
    const auto below = [&](unsigned n) { return static_cast<double>(random() % n); };
    const double spread = seed % 4 == 0 ? 0.0 : std::pow(10.0, below(11) - 4.0);
    const double side = seed % 4 == 1 ? (1000 - 0.37) / 1048576 - 0.7e-9 : 0.0;
    const double step = seed % 5 == 0 ? 1.1e-9 : 0.3e-9;
    Corners corners;
    for (int i = 0; i < count; ++i) {
        const double far = random() % 3 == 0 ? spread : 0.0;
        corners.push_back({side + far * below(4) + step * below(6), side + step * below(6),
                           side + 0.1 * far * below(3) + step * below(3)});
    }
    return corners;
}

TEST(OctreeTest, OctantsCountYThenXThenZAndTheCentreIsLow) {
    struct Tree : Octree2::OctoTree {
        Tree() { moBounds = {{-2, -2, -2}, {2, 2, 2}}; }
        const Node& GetRoot() const { return *mpoRoot; }
    };
    Tree tree;
    unsigned key = 0;
    for (const double y : {-1.0, 1.0})
        for (const double x : {-1.0, 1.0})
            for (const double z : {-1.0, 1.0})
                EXPECT_TRUE(tree.Insert(key++, {x, y, z}));
    for (unsigned octant = 0; octant < 8; ++octant)
        EXPECT_EQ(tree.GetRoot().mpoChild[octant]->mnKey, octant);
    EXPECT_EQ(tree.GetRoot().mpoChild[2]->moBox.min.x, 0.0);
    EXPECT_EQ(tree.GetRoot().mpoChild[2]->moBox.max.y, 0.0);
    EXPECT_EQ(tree.GetRoot().mnKey, ~0U) << "an inner node has lost its point";
    EXPECT_EQ(tree.FindLeaf({0, 0, 0})->mnKey, 0U);
    EXPECT_EQ(tree.FindLeaf({1e-300, 0, 0})->mnKey, 2U);
    EXPECT_EQ(tree.FindLeaf({0, 1e-300, 0})->mnKey, 4U);
    EXPECT_EQ(tree.FindLeaf({0, 0, 1e-300})->mnKey, 1U);
    EXPECT_EQ(tree.FindLeaf({2, 2, 2})->mnKey, 7U);
    EXPECT_EQ(tree.FindLeaf({2.001, 2, 2}), nullptr);
    EXPECT_EQ(tree.FindLeaf({NaN, 0, 0}), nullptr);
    EXPECT_FALSE(tree.Insert(8, {-1 + 0.9e-9, -1, -1}));
    EXPECT_EQ(tree.GetPointCount(), 8);

    Corners one{{5, 5, 5}};
    std::vector<unsigned> keys{0};
    const Octree2 margin(one, keys);
    EXPECT_NE(margin.FindLeaf({6, 4, 5.9}), nullptr) << "one unit around all corners";
    EXPECT_EQ(margin.FindLeaf({6.001, 5, 5}), nullptr);
}

TEST(OctreeTest, TwinsFallOnTheFirstWithinABox) {
    EXPECT_EQ(Weld({{5, 5, 5}}).kept, (Kept{0}));
    EXPECT_EQ(Weld(Corners(5000, {4e5, 4e6, 300})).kept, (Kept{0}));
    EXPECT_EQ(Weld({{5, 5, 5}, {5, 5, 5.5}}).kept, (Kept{0, 1})) << "height counts";
    EXPECT_EQ(Weld({{0, 0, 0}, {9e-10, 9e-10, -9e-10}}).kept, (Kept{0})) << "a box, no ball";
    EXPECT_EQ(Weld({{0, 0, 0}, {1e-9, 0, 0}, {0, 1e-9, 0}, {0, 0, 1e-9}}).kept, (Kept{0, 1, 2, 3}));
    EXPECT_EQ(Weld({{0, 0, 0}, {6e-10, 0, 0}, {12e-10, 0, 0}}).kept, (Kept{0, 2})) << "no chain";
    // On the two sides of the root's centre, which lies at 0.
    EXPECT_EQ(Weld({{-1, 0, 0}, {1, 0, 0}, {-2e-10, 0, 0}, {2e-10, 0, 0}}).kept,
              (Kept{0, 1, 2, 3}));
}

TEST(OctreeTest, EveryDroppedCornerLeadsToAKeptTwin) {
    int strays = 0, hashed = 0;
    for (unsigned seed = 1; seed <= 200; ++seed) {
        SCOPED_TRACE(seed);
        Corners corners = CreateClusters(seed, 300);
        strays += Weld(corners).strays;
        corners.resize(1 + seed % 12); // few enough to have no near twins at times
        corners.push_back(corners[0]);
        hashed += Weld(corners).hashed;
    }
    EXPECT_GT(strays, 100) << "the searches that lead astray are what this is for";
    EXPECT_GT(hashed, 20);
}

TEST(OctreeTest, EqualCornersAreHeldOnceByTheFirst) {
    std::mt19937 random(1);
    const auto below = [&](unsigned n) { return static_cast<double>(random() % n); };
    Corners corners;
    std::set<std::tuple<double, double, double>> places;
    Kept firsts;
    for (unsigned i = 0; i < 20000; ++i) {
        corners.push_back({5e5 + below(100) * 0.1, 4e6 + below(100) * 0.1, below(3)});
        if (places.insert({corners[i].x, corners[i].y, corners[i].z}).second)
            firsts.push_back(i);
    }
    const Welded welded = Weld(corners);
    EXPECT_EQ(welded.kept, firsts);
    EXPECT_TRUE(welded.hashed);
}

void WeldWildNumbers() {
    // A search through the deepest tree: near twins at the low end of the widest cell. The second
    // parts the first from its twin and leaves that without a leaf.
    EXPECT_EQ(
        Weld({{0, 0, 0}, {HIGHEST, HIGHEST, HIGHEST}, {0.95e-9, 0, 0}, {0, 0, 1.2e-9}}).strays, 1);
    for (const double v : {0x1p53, 0x1p54, 1e300, 9e307, HIGHEST, -HIGHEST, -1e300}) {
        EXPECT_EQ(Weld({{v, v, v}, {std::nextafter(v, 0), v, v}, {v, v, v}}).kept, (Kept{0, 1}));
        EXPECT_EQ(Weld(Corners(3000, {v, 0, v})).kept, (Kept{0})) << v;
    }
    EXPECT_EQ(Weld(Corners(3000, {NaN, 1, 2})).kept.size(), 3000U);
    const double values[] = {0,     -0.0,   3e-10, 5e-10,   8e-10,    1,      1e-320,
                             1e300, -1e300, 9e307, 9.1e307, 1.7e308,  INF,    -INF,
                             NaN,   -9e307, 1e300, HIGHEST, -HIGHEST, 0x1p53, 0x1p53 + 2};
    std::mt19937 random(1);
    for (int round = 0; round < 50; ++round) {
        const auto any = [&] { return values[random() % std::size(values)]; };
        Corners corners;
        std::size_t wild = 0;
        for (int i = 0; i < 300; ++i) {
            corners.push_back({any(), any(), any()});
            wild += !Octree2::IsFinite(corners.back());
        }
        EXPECT_GE(Weld(corners).kept.size(), wild);
    }
}

TEST(OctreeTest, NoNumberBreaksTheTreeOrAStackOf512KiB) {
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_attr_setstacksize(&attributes, 512 * 1024);
    pthread_t thread;
    const auto run = [](void*) -> void* { return WeldWildNumbers(), nullptr; };
    ASSERT_EQ(pthread_create(&thread, &attributes, run, nullptr), 0);
    pthread_join(thread, nullptr);
    pthread_attr_destroy(&attributes);
}

using WeldingTest = ReaderTest;

// Clusters about the base, where a float still tells near twins apart.
TEST_F(WeldingTest, ASurfaceKeepsEveryCornerWithinTheTolerance) {
    for (unsigned seed = 2; seed <= 60; ++seed) {
        SCOPED_TRACE(seed);
        Corners corners = CreateClusters(seed, 300);
        corners[0] = {0, 0, 0};
        script.shapes.clear();
        for (std::size_t i = 0; i < corners.size(); i += 3)
            script.shapes.push_back(
                Close({{corners[i].x, corners[i].y, corners[i].z},
                       {corners[i + 1].x, corners[i + 1].y, corners[i + 1].z},
                       {corners[i + 2].x, corners[i + 2].y, corners[i + 2].z}}));
        const Surface surface = Load(*Open());
        ASSERT_EQ(surface->GetVertexCount(), Weld(corners).kept.size());
        for (unsigned i = 0; i < corners.size(); ++i) {
            const Corner& c = corners[i];
            const point3_t<float>& v = *surface->GetTriangle(i / 3)->GetVertex(int(i % 3));
            ASSERT_NEAR(double(v.x), c.x, 1e-9 + std::fabs(c.x) * 0x1p-23);
            ASSERT_NEAR(double(v.y), c.y, 1e-9 + std::fabs(c.y) * 0x1p-23);
            ASSERT_NEAR(double(v.z), c.z, 1e-9 + std::fabs(c.z) * 0x1p-23);
        }
    }
}

TEST_F(WeldingTest, AWildCornerDoesNotSpoilTheBase) {
    script.shapes = {Close({{7, INF, 3}, {NaN, 8, 3}, {100, 200, NaN}}),
                     Close({{100, 201, 7}, {1e300, INF, 4}, {103, 201, 5}})};
    const Surface surface = Load(*Open());
    EXPECT_EQ(surface->GetVertexCount(), 6U);
    double x, y;
    surface->GetXYBase(x, y);
    EXPECT_EQ(x, 100.0);
    EXPECT_EQ(y, 200.0);
    EXPECT_EQ(surface->GetVertex(5)->x, 3.0F);
    EXPECT_EQ(surface->GetVertex(5)->y, 1.0F);
}

} // namespace
