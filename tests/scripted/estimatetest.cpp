#include "tests/scripted/readerfixture.h"

namespace {

using EstimateTest = ReaderTest;

TEST_F(EstimateTest, EstimatesFollowTheShapeCountAndNeverFall) {
    struct Row {
        int shapes;
        std::size_t vertices; // the estimate behind all three
    };
    std::size_t last = 0;
    for (const Row& row : {Row{1, 1}, Row{2, 3}, Row{3, 4}, Row{1000, 1500},
                           Row{1200000000, 1800000000}, // twice that is no signed number
                           Row{2147483647, 2147483647}}) {
        script.recordedCount = row.shapes;
        const Reader reader = Open();
        const auto shapes = static_cast<std::size_t>(row.shapes);
        const std::size_t octree = 2 * row.vertices * 152 + 80;
        EXPECT_EQ(reader->EstimateObjBytes_Tin(), (row.vertices + 4 * shapes) * 12 + 88);
        EXPECT_EQ(reader->EstimateObjBytes_Octree(), octree);
        EXPECT_EQ(reader->EstimateLoadBytes(), shapes * 96 + octree);
        EXPECT_LT(last, reader->EstimateLoadBytes());
        last = reader->EstimateLoadBytes();
    }
}

} // namespace
