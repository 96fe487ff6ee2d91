#include "tests/scripted/readerfixture.h"

namespace {

TEST_F(ReaderTest, AnUnfitFileOrArgumentIsRefusedInTheWordsOfItsFault) {
    // Each fault comes on top of the former ones, and is seen before them.
    for (const auto& spoil : std::vector<std::function<void()>>{
             [] {}, [&] { script.dimension = 3; }, [&] { script.dimension = 0; },
             [&] { script.record.shapeCount = 0; }, [&] { script.record.shapeCountValid = 0; },
             [&] { script.layerType = 1; }, [&] { script.hasLayer = false; },
             [&] { script.segmentCount = 0; }}) {
        spoil();
        EXPECT_TRUE(transcript.Refuses([] { Open(1.0, -0.0); }));
    }
}

TEST_F(ReaderTest, HeightsAreConvertedBetweenDifferentKnownDatumsOfAPlaceOnEarth) {
    for (const bool local : {false, true})
        for (const int source : {2000, 2001, 2002, 2999}) {
            script.isLocal = local;
            const Reader reader = Open(0, 1, source);
            int current = source;
            for (const int output : {2001, 2002, 2999, source, 2000, 1999, 3000, source}) {
                const bool isRefused =
                    transcript.Refuses([&] { reader->SetOutputVerticalDatum(DatumType(output)); });
                const bool isDatum = output >= 2000 && output <= 2999;
                EXPECT_NE(isRefused, isDatum && (output == 2000) == (source == 2000));
                current = isRefused ? current : output;
                EXPECT_EQ(reader->GetOutputVerticalDatum(), current);
                const double converted = scripted::Convert(10, 20, 5, current - source);
                EXPECT_EQ(Load(*reader)->GetVertex(0)->z,
                          current == source || local ? 5.0F : float(converted));
            }
        }
}

TEST_F(ReaderTest, ABoxThatTheCallerHasSetCountsAndEstimatesDoNotOverflow) {
    script.layerType = 2;
    const Reader reader = Open();
    EXPECT_EQ(reader->GetArea(), 2e13);
    EXPECT_EQ(reader->GetBBox().min.z, -3.0);
    const Window window(11, 0, 20, 30);
    EXPECT_NE(Load(*reader, &window), nullptr);
    reader->GetBBox().max.x = 10.0;
    EXPECT_EQ(Load(*reader, &window), nullptr);
    script.record.shapeCount = 1200000000;
    EXPECT_EQ(Open()->EstimateObjBytes_Tin(), (1800000000 + 4800000000) * 12 + 88);
    script.record.shapeCount = 2147483647;
    EXPECT_EQ(Open()->EstimateLoadBytes(), 2147483647 * (96UL + 2 * 152) + 80);
}

} // namespace
