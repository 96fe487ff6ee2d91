#include "tin/aabbtree.h"
#include "tin/tin.h"

#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <limits>
#include <memory>
#include <pthread.h>

using namespace kelm::tin;

namespace {

using Corner = point3_t<float>;
using MakeCorner = std::function<Corner(unsigned triangle, unsigned corner)>;

std::unique_ptr<Tin> CreateSurface(unsigned triangles, const MakeCorner& makeCorner) {
    std::unique_ptr<Corner[]> vertices(new Corner[3 * std::size_t{triangles}]);
    std::unique_ptr<Triangle_Id[]> ids(new Triangle_Id[triangles]);
    for (unsigned i = 0; i < triangles; ++i) {
        for (unsigned k = 0; k < 3; ++k)
            vertices[3 * std::size_t{i} + k] = makeCorner(i, k);
        ids[i] = {3 * i, 3 * i + 1, 3 * i + 2};
    }
    return std::make_unique<Tin>(vertices.release(), 3 * triangles, ids.release(), triangles, 0.0,
                                 0.0);
}

/// A million, or what a sanitizer gets through in the same time.
#ifdef __SANITIZE_ADDRESS__
constexpr unsigned MANY = 100000;
#else
constexpr unsigned MANY = 1000000;
#endif

/// Runs the work in a thread of 512 KiB of stack.
void RunOnSmallStack(std::function<void()> work) {
    pthread_attr_t attributes;
    ASSERT_EQ(pthread_attr_init(&attributes), 0);
    ASSERT_EQ(pthread_attr_setstacksize(&attributes, 512 * 1024), 0);
    const auto run = [](void* p) -> void* {
        (*static_cast<std::function<void()>*>(p))();
        return nullptr;
    };
    pthread_t thread;
    ASSERT_EQ(pthread_create(&thread, &attributes, run, &work), 0);
    pthread_join(thread, nullptr);
    pthread_attr_destroy(&attributes);
}

/// Asks for the height in the middle of a triangle, and for the line over it, with the tree and
/// without.
void Compare(const Tin& surface, const AabbTree& tree, unsigned triangle) {
    float at[2];
    surface.GetTriangle(triangle)->GetCenterXY(at);
    float found = 0.5F;
    float scanned = 0.5F;
    EXPECT_EQ(surface.GetHeight(at[0], at[1], found, &tree),
              surface.GetHeight(at[0], at[1], scanned, nullptr));
    EXPECT_EQ(found, scanned);
    const Corner a{at[0], at[1], -9.0F};
    const Corner b{at[0] + 1.0F, at[1] + 1.0F, 9.0F};
    EXPECT_EQ(surface.GetLineIntersectHeight(a, b, found, &tree),
              surface.GetLineIntersectHeight(a, b, scanned, nullptr));
    EXPECT_EQ(found, scanned);
}

/// Builds, searches and destroys.
void Exercise(unsigned triangles, const MakeCorner& makeCorner) {
    RunOnSmallStack([&] {
        const auto surface = CreateSurface(triangles, makeCorner);
        for (const DivisionType eType : {DT_BestAxis, DT_LongestAxis}) {
            AabbTree tree;
            tree.GetInfo()->SetDivisionType(eType);
            tree.SetCapacity(1);
            tree.CreateTree(surface.get());
            EXPECT_LT(tree.GetNodeCount(), 2 * triangles);
            for (const unsigned triangle : {0U, triangles / 2, triangles - 1})
                Compare(*surface, tree, triangle);
            const std::unique_ptr<Tin> all(
                surface->SubsetByRegion(surface->GetTriangle(triangles - 1)->GetBBox(), &tree));
            EXPECT_TRUE(all && all->GetTriangleCount() > 0);
        }
    });
}

float Corner3(unsigned corner, float zeroth, float first, float second) {
    return corner == 0 ? zeroth : corner == 1 ? first : second;
}

TEST(DegenerateTest, VerticalTriangles) {
    Exercise(100000, [](unsigned i, unsigned k) {
        const float at = float(i) + Corner3(k, 0.0F, 1.0F, 0.0F);
        return Corner{at, at, Corner3(k, 0.0F, 2.0F, 5.0F)};
    });
}

TEST(DegenerateTest, OneTriangleManyTimes) {
    Exercise(100000, [](unsigned, unsigned k) {
        return Corner{Corner3(k, 1.0F, 4.0F, 2.0F), Corner3(k, 1.0F, 2.0F, 5.0F), float(k)};
    });
}

TEST(DegenerateTest, AMillionTrianglesOverOnePoint) {
    Exercise(MANY, [](unsigned i, unsigned k) {
        const float size = 1.0F + 1e-3F * float(i);
        return Corner{Corner3(k, -size, size, 0.0F), Corner3(k, -size, -size, size), 2.0F};
    });
}

TEST(DegenerateTest, CoordinatesAtTheEndOfTheFloatRange) {
    constexpr float FAR = std::numeric_limits<float>::max();
    Exercise(30000, [](unsigned i, unsigned k) {
        const float part = FAR / float(1U << i % 40U / 2U);
        return Corner{Corner3(k, -part, FAR, part), Corner3(k, part, -FAR, FAR),
                      i % 3 == 0 ? FAR : float(k)};
    });
}

TEST(DegenerateTest, AMillionSlivers) {
    Exercise(MANY, [](unsigned i, unsigned k) {
        return Corner{1e-3F * float(i + (k + i) % 2), Corner3(k, 0.0F, 5000.0F, -5000.0F), 1.0F};
    });
}

TEST(DegenerateTest, CentroidsInGeometricSteps) {
    // Half of a mean of which the last term is the greatest: each split peels off a few.
    Exercise(2500, [](unsigned i, unsigned k) {
        const float at = std::ldexp(1.0F, int(i % 250U) - 125);
        return Corner{at * Corner3(k, 1.0F, 1.25F, 1.0F), at * Corner3(k, 1.0F, 1.0F, 1.25F), 1.0F};
    });
    Exercise(3000, [](unsigned i, unsigned k) {
        const float at = 10.0F * std::pow(1.01F, float(i));
        return Corner{at * Corner3(k, 1.0F, 1.005F, 1.0F), Corner3(k, 0.0F, 0.0F, at), 1.0F};
    });
}

} // namespace
