#include "services/exception.h"
#include "tests/support/model.h"
#include "tests/support/sheets.h"
#include "tin/ray2.h"
#include "tin/vector3.h"

#include <cmath>

namespace kelm::tin::test {

namespace {

/// Legs of 4 along both axes from the origin, heights 10, 20 and 30.
class RightTriangle : public testing::Test {
  protected:
    RightTriangle() { triangle.SetVertices(&v[0], &v[1], &v[2]); }
    Point v[3] = {{0, 0, 10}, {4, 0, 20}, {0, 4, 30}};
    Triangle triangle;
};

bool IsSame(float a, float b) {
    return a == b && std::signbit(a) == std::signbit(b);
}

/// Whole numbers so small that edges and triangles without area are met, a large square, or a place
/// far from the origin.
Point MakePoint(Random& random, unsigned kind) {
    const auto digit = [&] { return static_cast<float>(random.Below(5)); };
    const auto wide = [&] { return random.Between(kind == 1 ? -4410.0F : 4400.0F, 4410.0F); };
    return kind == 0 ? Point{digit(), digit(), digit()} : Point{wide(), wide(), wide() / 99};
}

} // namespace

TEST_F(RightTriangle, BoundsAreInclusiveAndNotANumberPassesThem) {
    float h = UNTOUCHED;
    EXPECT_FALSE(triangle.GetHeight(3, 3, h));
    EXPECT_EQ(triangle.GetLineIntersectHeight({0, 0, 20}, {2, 2, 40}, h), IR_Disjoint);
    EXPECT_EQ(triangle.GetLineIntersectHeight({5, 5, 99}, {5, 5, 0}, h), IR_Outside);
    EXPECT_EQ(h, UNTOUCHED);
    for (const Point& p : v)
        EXPECT_TRUE(triangle.GetHeight(p.x, p.y, h) && h == p.z);
    EXPECT_FALSE(triangle.IsPointInsideLT(2, std::nextafter(2.0F, 3.0F)));
    // So little below the edge that the weights do not show it; the box does.
    EXPECT_TRUE(triangle.IsPointInsideLT(2, -1e-45F) && !triangle.IsPointInside(2, -1e-45F));
    EXPECT_FALSE(triangle.IsPointInside(NOT_A_NUMBER, 1));
    EXPECT_TRUE(triangle.GetHeight(NOT_A_NUMBER, 1, h) && std::isnan(h));
    EXPECT_EQ(triangle.GetLineIntersectHeight({1, 1, NOT_A_NUMBER}, {1, 1, 0}, h = 0), IR_Inside);
    EXPECT_TRUE(std::isnan(h));
    Point* list[3] = {&v[2], &v[1], nullptr};
    EXPECT_THROW(Triangle{list}, DataException);
    EXPECT_THROW(triangle.SetVertices(list), DataException);
    EXPECT_EQ(triangle.GetVertex(0), &v[0]);
}

TEST_F(RightTriangle, MeetsBoxesByItsEdgesAndTrianglesInPlan) {
    const auto meetsBox = [&](float left, float right, float bottom, float top) {
        Box box;
        box.min = {left, bottom};
        box.max = {right, top};
        return triangle.IsIntersected(box);
    };
    EXPECT_TRUE(meetsBox(1, 2, -1, 0) && meetsBox(2, 3, 2, 3) && meetsBox(-1, 0, 1, 2));
    EXPECT_FALSE(meetsBox(0.5F, 1, 0.5F, 1) || meetsBox(3, 4, 3, 4) || meetsBox(5, -1, 5, -1));
    const auto meets = [&](Point a, Point b, Point c) {
        Triangle other;
        other.SetVertices(&a, &b, &c);
        return triangle.IsIntersected(other) + other.IsIntersected(triangle);
    };
    EXPECT_EQ(meets(v[0], v[1], v[2]) + meets({4, 0, 0}, {9, 1, 0}, {9, 9, 0}), 4);
    EXPECT_EQ(meets({1, 1, 0}, {2, 1, 0}, {1, 2, 0}) + meets({-1, 3, 0}, {3, 3, 0}, {-1, 4, 0}), 4);
    EXPECT_EQ(meets({3, 3, 0}, {9, 1, 0}, {9, 9, 0}), 0);
}

TEST(Triangle, EveryStepIsRoundedAsWritten) {
    Random random;
    unsigned inside = 0, crossed = 0, touched = 0;
    for (unsigned i = 0; i < 150000; ++i) {
        const auto make = [&] { return MakePoint(random, i % 3); };
        model::Corners c = {make(), make(), make()};
        Point a = make(), b = make();
        if (i % 2 == 0) // near an edge
            a = {(c[0].x + c[1].x) / 2, (c[0].y + c[1].y) / 2, a.z};
        if (i % 4 == 0) // on level 0 each step shows
            c[0].z = c[1].z = c[2].z = 0;
        Triangle t;
        t.SetVertices(&c[0], &c[1], &c[2]);
        const auto height = model::GetHeight(c, a.x, a.y);
        float h = UNTOUCHED;
        ASSERT_EQ(t.GetHeight(a.x, a.y, h), height.has_value()) << i;
        ASSERT_TRUE(IsSame(h, height.value_or(UNTOUCHED))) << i;
        const model::F x = (model::F(c[0].x) + c[1].x) + c[2].x;
        const model::F y = (model::F(c[0].y) + c[1].y) + c[2].y;
        ASSERT_TRUE(IsSame(static_cast<float>(t.GetCenterAt(AX_X)), (x / 3.0F).v)) << i;
        ASSERT_TRUE(IsSame(static_cast<float>(t.GetCenterAt(AX_Y)), (y / 3.0F).v)) << i;
        float crossing = UNTOUCHED;
        const IntersectRelation relation = model::GetCrossing(c, a, b, crossing);
        ASSERT_EQ(t.GetLineIntersectHeight(a, b, h = UNTOUCHED), relation) << i;
        ASSERT_TRUE(IsSame(h, crossing)) << i;
        const bool touches = model::TestLine(c, a, b);
        ASSERT_EQ(t.IsIntersectedLine(a.x, a.y, b.x, b.y), touches) << i;
        inside += height.has_value();
        crossed += relation == IR_Inside;
        touched += touches;
    }
    EXPECT_GT(std::min({inside, crossed, touched}), 9999U);
}

TEST(Ray2, SlabsOfSegmentsAndBoxes) {
    const Ray2<float> ray(Point{1, 2, 9}, Point{-0.0F, 4, 9});
    EXPECT_TRUE(ray.GetSign(0) == 1 && ray.GetSign(1) == 0 && ray.GetDirInv().y == 0.25F);
    BBox<float, Point> box, inverted;
    box.max = inverted.min = {4, 4, 0};
    Box flat;
    flat.max = {4, 4};
    const auto meets = [&](float x1, float y1, float x2, float y2) {
        const Point a{x1, y1, 50}, b{x2, y2, 60};
        const bool result = IsIntersectedBBox(box, a, b);
        EXPECT_TRUE(IsIntersectedBBox(flat, b, a) == result && !IsIntersectedBBox(inverted, a, b));
        return result && IsIntersectedBBox(flat, Point2{x1, y1}, Point2{x2, y2});
    };
    EXPECT_TRUE(meets(2, 2, 2, 2) && meets(4, 4, 4, 4) && meets(1, 1, 3, 2));   // points, within
    EXPECT_TRUE(meets(0, -1, 0, 5) && meets(-1, 4, 5, 4) && meets(4, 1, 4, 3)); // along a side
    EXPECT_TRUE(meets(-1, 1, 1, -1) && meets(-1, 2, 0, 2));                     // touching
    EXPECT_FALSE(meets(5, 2, 5, 2) || meets(-1, 0, -1, 4) || meets(0, 4.001F, 4, 4.001F));
    EXPECT_FALSE(meets(-3, 2, -1, 2) || meets(5, 2, 7, 2) || meets(-1, 0.5F, 1, -1));
    EXPECT_FALSE(meets(4, -3, 4, -1) || meets(0, -3, 0, -1)); // in line with a side
}

TEST(Vector3, OrderOfSumsAndScaling) {
    EXPECT_EQ(Vector3(1e16, -1e16, 1) * Vector3(1, 1, 1), 1.0); // the z term last
    EXPECT_TRUE(std::isinf(Vector3(1e200, 0, 0).Length()) && std::signbit((-Vector3(0, 0, 0)).x));
    Vector3 v(0, 0, 49), tiny(1e-310, 0, 0);
    v.Normalize();
    tiny.Normalize();
    EXPECT_TRUE(v.z < 1.0 && tiny.x == 1e-310); // by the reciprocal; not at all
}

} // namespace kelm::tin::test
