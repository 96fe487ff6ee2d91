#include "services/exception.h"
#include "tests/support/sheets.h"

namespace kelm::tin::test {

// Leaks and double releases show under the address sanitizer.

TEST(Tin, IsEmptyAndTakesNothingOverIfACountIsZero) {
    Point vertices[3] = {{1, 2, 3}, {4, 5, 6}, {7, 9, 9}};
    Triangle triangle;
    for (const unsigned n : {0U, 1U}) {
        const Tin tin(vertices, 3 * n, new Triangle_Id[1]{{0, 1, 2}}, 1 - n, 10.5, 20);
        const Tin ready(vertices, 3 * n, &triangle, 1 - n, 10.5, 20);
        double x, y;
        ready.GetXYBase(x, y);
        EXPECT_TRUE(x == 10.5 && y == 20 && ready.GetObjBytes() == 88 && tin.GetObjBytes() == 88);
        EXPECT_TRUE(tin.GetVertex(0) == nullptr && ready.GetTriangle(0) == nullptr);
        EXPECT_TRUE(tin.GetBBox().min.x == 0 && tin.GetBBox().max.y == 0);
    }
    Triangle_Id ids[1] = {};
    EXPECT_THROW(Tin(nullptr, 3, ids, 1, 0, 0), DataException);
}

TEST(Tin, MakesTheTrianglesOfTheTriples) {
    for (const unsigned count : {1U, 1000U, 1001U, 5000U}) {
        Mesh mesh;
        for (unsigned i = 0; i < count + 2; ++i)
            mesh.vertices.push_back({0, static_cast<float>(i), 0});
        for (unsigned i = 0; i < count; ++i)
            mesh.ids.push_back({i + 2, i, i + 1});
        OpenTin tin = mesh.MakeTin();
        EXPECT_EQ(tin.GetTriangle(count - 1)->GetBBox().max.y, static_cast<float>(count + 1));
        for (unsigned i = 0; i < count + 2; ++i)
            tin.GetVertex(i)->y += 10;
        tin.ComputeTriBBox();
        for (unsigned i = 0; i < count; ++i) {
            Point* corners[3];
            tin.GetTriangle(i)->GetVertexList(corners);
            ASSERT_TRUE(corners[0] == tin.GetVertex(i + 2) && corners[1] == corners[0] - 2 &&
                        corners[2] == corners[0] - 1);
            ASSERT_EQ(tin.GetTriangle(i)->GetBBox().max.y, static_cast<float>(i + 12));
        }
        EXPECT_TRUE(tin.GetVertex(count + 2) == nullptr && tin.GetTriangle(count) == nullptr);
        EXPECT_EQ(tin.GetObjBytes(), 12 * (count + 2) + 48 * count + 88);
    }
    EXPECT_EQ(Tin::EstimateObjBytes(4000000000, 4000000000), 240000000088U);
}

TEST(Tin, BoxOfAllVerticesInBothFrames) {
    Mesh mesh;
    mesh.Add({3, 7, NOT_A_NUMBER}, {NOT_A_NUMBER, 2, -3}, {1.5F, NOT_A_NUMBER, 8});
    mesh.vertices.push_back({2, 50, 4}); // no triangle uses it
    OpenTin tin = mesh.MakeTin(100000000.25, -0.5);
    tin.SetHeightRange(tin.GetBBox().max.z, tin.GetBBox().min.z);
    BBox<double, point3_t<double>> box;
    tin.GetRawBBox(box);
    EXPECT_TRUE(box.min.x == 100000001.75 && box.min.y == 1.5 && box.min.z == 8);
    EXPECT_TRUE(box.max.x == 100000003.25 && box.max.y == 49.5 && box.max.z == -3);
}

TEST(Tin, CopiesShowTheSameArraysAndReleaseNothing) {
    Random random;
    OpenTin first = MakeSheet(2, 0, random).MakeTin(), second = MakeSheet(2, 0, random).MakeTin();
    {
        OpenTin copy(first);
        EXPECT_EQ(copy.GetTriangle(3), first.GetTriangle(3));
        first = copy; // goes on owning
        copy = second;
        EXPECT_EQ(copy.GetVertex(1), second.GetVertex(1));
    }
    EXPECT_EQ(first.GetVertex(8)->x, 20);
    first = second; // releases its own
    EXPECT_EQ(first.GetTriangle(0), second.GetTriangle(0));
}

} // namespace kelm::tin::test
