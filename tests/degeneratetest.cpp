#include "tests/support/sheets.h"

#include <pthread.h>

namespace kelm::tin::test {
namespace {

constexpr unsigned COUNTS[] = {100000, 100000, 1000000, 1000000, 30000, 500};

void* BuildSearchAndDestroy(void* pKind) {
    const unsigned kind = *static_cast<unsigned*>(pKind);
    Mesh mesh;
    for (unsigned n = 0; n < COUNTS[kind]; ++n) {
        const auto i = static_cast<float>(n), e = i * 1e34F;
        const float at = std::exp2(std::floor(i / 2) - 125), x = std::fmod(i, 2.0F) * at;
        const Point corners[][3] = {
            {{i, i, 0}, {i + 1, i + 1, 2}, {i, i, 5}},                     // vertical
            {{1, 1, 0}, {4, 2, 1}, {2, 5, 2}},                             // identical
            {{-i, -i, 2}, {i, -i, 2}, {0, i, 2}},                          // over one point
            {{i, 0, 1}, {i + 1, 5e6F, 1}, {i, -5e6F, 1}},                  // slivers
            {{LOWEST, e, -LOWEST}, {-LOWEST, LOWEST, 1}, {e, -LOWEST, 2}}, // the edge of float
            // Half of a mean is its greatest term: a split peels off a few, on each axis in turn.
            {{x, at - x, 1}, {x * 1.25F, at - x, 1}, {x, (at - x) * 1.25F, 1}}};
        mesh.Add(corners[kind][0], corners[kind][1], corners[kind][2]);
    }
    const OpenTin tin = mesh.MakeTin();
    for (const DivisionType eType : {DT_BestAxis, DT_LongestAxis}) {
        AabbTree tree;
        tree.GetInfo()->SetDivisionType(eType);
        tree.SetCapacity(1);
        tree.CreateTree(&tin);
        EXPECT_EQ(GetAllLeaves(tree), tin.GetAll());
        float h = LOWEST, wanted = LOWEST;
        EXPECT_EQ(tin.GetHeight(2.0F, 2.0F, h, &tree), tin.GetHeight(2.0F, 2.0F, wanted, nullptr));
        EXPECT_EQ(h, wanted);
        tin.GetLineIntersectHeight(Point{0, 0, 0}, Point{5, 5, 5}, h, &tree);
        tin.GetLineIntersectHeight(Point{0, 0, 0}, Point{5, 5, 5}, wanted, nullptr);
        EXPECT_EQ(h, wanted);
    }
    return nullptr;
}

using DegenerateTest = testing::TestWithParam<unsigned>;

TEST_P(DegenerateTest, IsBuiltSearchedAndDestroyedOnAStackOf512KiB) {
    unsigned kind = GetParam();
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    ASSERT_EQ(pthread_attr_setstacksize(&attributes, std::size_t{512} * 1024), 0);
    pthread_t thread;
    ASSERT_EQ(pthread_create(&thread, &attributes, BuildSearchAndDestroy, &kind), 0);
    pthread_join(thread, nullptr);
}

INSTANTIATE_TEST_SUITE_P(Surface, DegenerateTest, testing::Range(0U, 6U));

} // namespace
} // namespace kelm::tin::test
