#include "tests/scripted/readerfixture.h"

#include <functional>

namespace {

using kelm::test::GetRefusal;

TEST_F(ReaderTest, AnUnfitFileOrArgumentIsRefusedInTheWordsOfItsFault) {
    const std::string factory = "tin/tinreaderfactory: The provided vector layer 3 in the input ";
    // Each fault comes on top of the former ones, and is seen before them.
    for (const auto& [spoil, refusal] : std::vector<std::pair<std::function<void()>, std::string>>{
             {[] {}, "tin/tinreader: dfScale=0.0!non-zero: The scale parameter may not be zero"},
             {[&] { script.dimension = 3; },
              "tin/tinreader: poCRS=Dimension = 3!Dimension = 2: SetDbmCRS(): DBM CRS dimension "
              "must be 2"},
             {[&] { script.dimension = 0; },
              "tin/tinreader: poCRS=NULL!non-NULL: SetDbmCRS(): CRS pointer may not be NULL"},
             {[&] {
                  script.record = ZARLayer_t{0, 1};
              },
              factory + "file some.file is empty."},
             {[&] {
                  script.record = ZARLayer_t{7, 0};
              },
              factory + "file some.file is empty."},
             {[&] { script.layerType = 1; },
              factory + "file some.file must be defined by polygons."},
             {[&] { script.hasLayer = false; },
              "tin/tinreaderfactory: ZARGetLayer failed on the provided vector layer 3 in the "
              "input file some.file."},
             {[&] { script.segmentCount = 0; },
              "tin/tinreaderfactory: This file some.file contains no vector layer"}}) {
        spoil();
        EXPECT_EQ(GetRefusal([] { Open(1.0, -0.0); }), refusal);
    }
}

TEST_F(ReaderTest, HeightsAreConvertedBetweenDifferentKnownDatumsOfAPlaceOnEarth) {
    const std::string warning = "The layer has a local CRS, or none: its heights are the same in "
                                "every vertical datum. (tin/tinreader)\n";
    const auto getRefusal = [](int source, int output) -> std::string {
        if (output < 2000 || output > 2999)
            return "!vertical datum: Only VD_Ellipsoidal or VD_Orthometric datum codes can be "
                   "specified for the output vertical datum";
        if ((output == 2000) == (source == 2000))
            return "";
        return source == 2000 ? "not VD_Other!VD_Other: Because the source vertical datum is "
                                "VD_Other, the output vertical datum must also be VD_Other"
                              : "VD_Other!not VD_Other: Because the source vertical datum is not "
                                "VD_Other, the output vertical datum may not be VD_Other";
    };
    for (const bool local : {false, true})
        for (const int source : {2000, 2001, 2002, 2999}) {
            script.isLocal = local;
            const Reader reader = Open(0, 1, source);
            int current = source;
            for (const int output : {2001, 2002, 2999, source, 2000, 1999, 3000, source}) {
                const std::string refusal = getRefusal(source, output);
                EXPECT_EQ(GetRefusal([&] { reader->SetOutputVerticalDatum(DatumType(output)); }),
                          refusal.empty() ? "" : "tin/tinreader: eType=" + refusal);
                current = refusal.empty() ? output : current;
                const bool isWarned = local && refusal.empty() && output != source;
                EXPECT_EQ(Take(), isWarned ? warning : "");
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
