#include "tests/scripted/allocationfault.h"
#include "tests/scripted/readerfixture.h"
#include "tests/support/allocationcounter.h"
#include "tin/aabbtree.h"
#include "tin/triangulate.h"

#include <omp.h>

#include <cstdio>
#include <numeric>

using kelm::tin::AabbTree;

namespace {

/// A number that changes with any vertex of any triangle.
double Summarise(const Tin* surface) {
    if (surface == nullptr)
        return -1.0;
    double sum = surface->GetVertexCount();
    for (unsigned i = 0; i < surface->GetTriangleCount(); ++i)
        for (int k = 0; k < 3; ++k) {
            const point3_t<float>& v = *surface->GetTriangle(i)->GetVertex(k);
            sum = sum * 1.0000001 + double(v.x) + 3.0 * double(v.y) + 7.0 * double(v.z);
        }
    return sum;
}

double Summarise(const std::vector<unsigned>& list) {
    double sum = 0.0;
    for (const unsigned id : list)
        sum = sum * 1.0000001 + double(id) + 1.0;
    return sum;
}

/// Opens the searches and subsets that are not public.
struct Opened : Tin {
    using Tin::FindTrianglesByLine;
    using Tin::FindTrianglesByPoint;
    using Tin::FindTrianglesByRegion;
    using Tin::Subset;
    using Tin::Tin;
};

class AllocationFailureTest : public ReaderTest {
  protected:
    AllocationFailureTest() { omp_set_num_threads(4); }
    ~AllocationFailureTest() override { omp_set_num_threads(mnThreads); }

    void SetUp() override {
#ifdef KELM_TIN_FOREIGN_NEW
        GTEST_SKIP() << "the operators of the sanitizer are in force";
#endif
    }
    void TearDown() override {
        if (IsSkipped())
            return;
        std::printf("%ld runs with a failed allocation\n", mnInjected);
        EXPECT_GT(mnInjected, 0);
    }

    /// Runs an operation with its n-th request failing, once and lastingly, for each n to the end.
    /// The same objects must give the undisturbed answer right after each failure.
    template <typename Operation>
    void FailEach(const char* name, const Operation& operation) {
        const double expected = operation();
        for (const bool isLasting : {false, true})
            for (long n = 1; RunFailing(n, isLasting, operation, expected); ++n)
                ASSERT_FALSE(HasFailure())
                    << name << ", request " << n << ", lasting " << isLasting;
    }

    /// @return has a request failed?
    template <typename Operation>
    bool RunFailing(long n, bool isLasting, const Operation& operation, double expected) {
        const long living = faults::GetLiving();
        bool completed = false;
        double answer = 0.0;
        try {
            const faults::Injector injector(n, isLasting);
            answer = operation();
            completed = true;
        } catch (const std::bad_alloc&) {
        } catch (const kelm::Exception& e) {
            EXPECT_STREQ(e.what(), "Octree2 error");
        }
        const long failed = faults::Injector::GetFailed();
        EXPECT_LE(faults::GetLiving(), living) << "blocks are left over";
        EXPECT_EQ(completed, failed == 0) << "a failure passed in silence";
        if (completed) {
            EXPECT_EQ(answer, expected);
        }
        EXPECT_EQ(operation(), expected);
        EXPECT_EQ(faults::GetLiving(), living);
        mnInjected += failed != 0 ? 1 : 0;
        return failed != 0;
    }

    /// A strip, with a ring to cut, a shape that the store has not and one that is not simple.
    void ScriptLayer(unsigned vertices, double height) {
        script.shapes = CreateStrip(vertices, [=](unsigned i) { return height + 0.25 * i; });
        script.shapes.push_back(Close({{500000, 4600100, 1},
                                       {500010, 4600100, 2},
                                       {500010, 4600110, 3},
                                       {500005, 4600103, 4},
                                       {500000, 4600110, 5}}));
        script.shapes.push_back({{}, scripted::Shape::Null});
        script.shapes.push_back(Close({{0, 0, 0}, {4, 4, 0}, {4, 0, 0}, {0, 4, 0}}));
    }

    const int mnThreads = omp_get_max_threads();
    long mnInjected = 0;
};

TEST_F(AllocationFailureTest, OpeningAndLoadingWithPolygonsAndADatumChange) {
    ScriptLayer(40, 10.0);
    const auto openAndLoad = [&] {
        script.calls.clear();
        const Reader reader = Open(0.5, 2.0);
        reader->SetOutputVerticalDatum(VD_Orthometric);
        return Summarise(Load(*reader).get());
    };
    FailEach("welded by hash", openAndLoad);
    // A twin that is not equal takes the octree.
    script.shapes[0].ring[1].x += 5e-10;
    FailEach("welded by octree", openAndLoad);
}

TEST_F(AllocationFailureTest, LoadsOfOneReaderWithInterpolatedHeights) {
    ScriptLayer(1001, 20.0);
    const Reader reader = Open(0.5, 2.0);
    reader->SetOutputVerticalDatum(VD_Orthometric);
    FailEach("load", [&] {
        script.calls.clear();
        script.sources.clear();
        return Summarise(Load(*reader).get());
    });
}

TEST_F(AllocationFailureTest, SurfaceIndexSearchesAndSubsets) {
    static constexpr unsigned SIDE = 12;
    static constexpr unsigned TRIANGLES = 2 * (SIDE - 1) * (SIDE - 1);
    const auto create = [] {
        std::unique_ptr<point3_t<float>[]> vertices(new point3_t<float>[SIDE * SIDE]);
        for (unsigned i = 0; i < SIDE * SIDE; ++i)
            vertices[i] = {float(i % SIDE), float(i / SIDE), float(i * i % 31)};
        std::unique_ptr<Triangle_Id[]> ids(new Triangle_Id[TRIANGLES]);
        unsigned n = 0;
        for (unsigned i = 0; i < SIDE * (SIDE - 1); ++i)
            if (i % SIDE != SIDE - 1) {
                ids[n++] = {i, i + 1, i + SIDE};
                ids[n++] = {i + 1, i + SIDE + 1, i + SIDE};
            }
        auto surface = std::make_unique<Opened>(vertices.get(), SIDE * SIDE, ids.get(), TRIANGLES,
                                                1000.0, 2000.0);
        vertices.release();
        ids.release();
        return surface;
    };
    FailEach("surface from arrays", [&] { return Summarise(create().get()); });

    const auto surface = create();
    AabbTree tree;
    for (const int capacity : {1, 5}) {
        tree.SetCapacity(capacity);
        FailEach("tree", [&] {
            tree.CreateTree(surface.get());
            return double(tree.GetNodeCount());
        });
    }
    FailEach("tree by constructor", [&] {
        return double(AabbTree(surface.get()).GetNodeCount()) + double(EstimateAabbTreeBytes(9));
    });
    FailEach("copies", [&] {
        const Tin copy(*surface);
        auto leaf = std::make_unique<kelm::tin::AabbNode>();
        std::vector<unsigned> list(4, 7U);
        leaf->CreateChild(surface->GetTriangle(0), list, std::make_unique<AabbTree>().get());
        const kelm::tin::AabbNode copied(*leaf);
        return Summarise(&copy) + Summarise(copied.GetLeaves());
    });

    kelm::tin::BBox<float, point2_t<float>> region;
    region.min = {2.5F, 3.5F};
    region.max = {6.5F, 7.5F};
    const point2_t<double> path[] = {{1000.5, 2000.5}, {1009.5, 2003.25}, {1002.0, 2010.0}};
    const std::vector<unsigned char> mask(TRIANGLES, 1);
    for (const AabbTree* index :
         {static_cast<const AabbTree*>(nullptr), const_cast<const AabbTree*>(&tree)}) {
        const auto search = [&](auto&& find) {
            std::vector<unsigned> list;
            find(list);
            return Summarise(list);
        };
        FailEach("searches", [&] {
            float height = 0.0F;
            float crossing = 0.0F;
            surface->GetHeight(1003.3, 2004.4, height, index);
            surface->GetLineIntersectHeight(point3_t<float>{0.5F, 0.5F, 40.0F},
                                            point3_t<float>{9.5F, 9.0F, -5.0F}, crossing, index);
            return double(height) + 100.0 * double(crossing) +
                   search([&](auto& l) { surface->FindTrianglesByPoint(5.0F, 5.0F, l, index); }) +
                   search([&](auto& l) { surface->FindTrianglesByRegion(region, l, index); }) +
                   search([&](auto& l) {
                       surface->FindTrianglesByLine(point2_t<float>{0.5F, 0.5F},
                                                    point2_t<float>{9.5F, 9.0F}, l, index);
                   });
        });
        FailEach("subsets", [&] {
            const Surface parts[] = {Surface(surface->SubsetByRegion(region, index)),
                                     Surface(surface->SubsetByLineString(path, 3, index)),
                                     Surface(surface->Subset(mask)),
                                     Surface(surface->Subset(std::vector<unsigned>{5, 5, 3}))};
            return std::accumulate(
                std::begin(parts), std::end(parts), 0.0,
                [](double sum, const Surface& s) { return sum + Summarise(s.get()); });
        });
    }
    FailEach("grid", [&] {
        std::vector<int> cells;
        std::vector<float> heights;
        return double(surface->GetTriangle(0)->GetGridPoints(9, 9, cells, heights));
    });
}

} // namespace
