#include "tests/scripted/readerfixture.h"

#include <cmath>

namespace {

class VerticalTest : public ReaderTest {
  protected:
    /// Height of the first corner, stored as 5.
    static float GetHeight(TinReader& reader) { return Load(reader)->GetVertex(0)->z; }

    template <typename Work>
    static void ExpectRefusal(const Work& work, const std::string& message,
                              const std::string& parameter, const std::string& actual,
                              const std::string& expected) {
        const auto e = Catch<ParameterException>(work);
        EXPECT_EQ(e.what(), message);
        EXPECT_EQ(e.GetParameter(), parameter);
        EXPECT_EQ(e.GetActual(), actual);
        EXPECT_EQ(e.GetExpected(), expected);
        EXPECT_EQ(e.GetType(), 1);
        EXPECT_EQ(e.GetSourcePath(), "tin/tinreader");
    }
    void ExpectDatumRefusal(int source, int output, const std::string& message,
                            const std::string& actual, const std::string& expected) const {
        const Reader reader = Open(0, 1, source);
        const std::size_t calls = script.calls.size();
        ExpectRefusal([&] { reader->SetOutputVerticalDatum(DatumType(output)); }, message, "eType",
                      actual, expected);
        EXPECT_EQ(reader->GetOutputVerticalDatum(), source);
        EXPECT_EQ(script.calls.size(), calls);
    }
};

TEST_F(VerticalTest, UnfitArgumentsAreRefusedAndChangeNothing) {
    for (const double zero : {0.0, -0.0})
        ExpectRefusal([=] { Open(1, zero); }, "The scale parameter may not be zero", "dfScale",
                      "0.0", "non-zero");
    EXPECT_EQ(script.compounds.size(), 2U) << "the source side is set up before the scale is seen";
    script.dimension = 3;
    ExpectRefusal([] { Open(); }, "SetDbmCRS(): DBM CRS dimension must be 2", "poCRS",
                  "Dimension = 3", "Dimension = 2");
    script.hasCRS = false;
    ExpectRefusal([] { Open(); }, "SetDbmCRS(): CRS pointer may not be NULL", "poCRS", "NULL",
                  "non-NULL");
    script.hasCRS = true;
    script.dimension = 2;
    EXPECT_THROW(Open(0, 1, 1999), ParameterException);
    for (const int code : {1999, 3000, 0})
        for (const int source : {VD_Other, VD_Orthometric})
            ExpectDatumRefusal(source, code,
                               "Only VD_Ellipsoidal or VD_Orthometric datum codes can be specified "
                               "for the output vertical datum",
                               "", "vertical datum");
    ExpectDatumRefusal(VD_Other, VD_Ellipsoidal,
                       "Because the source vertical datum is VD_Other, the output vertical datum "
                       "must also be VD_Other",
                       "not VD_Other", "VD_Other");
    ExpectDatumRefusal(VD_Ellipsoidal, VD_Other,
                       "Because the source vertical datum is not VD_Other, the output vertical "
                       "datum may not be VD_Other",
                       "VD_Other", "not VD_Other");
}

TEST_F(VerticalTest, ObjectsAreRebuiltAndHeightsTransformedAsTheDatumsAsk) {
    using List = std::vector<int>;
    struct Row {
        int source, output;
        List compounds; ///< that the first change to the output makes
        float height;   ///< unless the CRS is local
    };
    for (const bool local : {false, true})
        for (const Row& row : {Row{VD_Other, VD_Other, {VD_Ellipsoidal}, 5},
                               Row{VD_Orthometric, VD_Orthometric, {}, 5},
                               Row{VD_Orthometric, VD_Ellipsoidal, {VD_Ellipsoidal}, 6},
                               Row{VD_Ellipsoidal, 2999, {2999}, 6}}) {
            script.isLocal = local;
            script.compounds.clear();
            const Reader reader = Open(0, 1, row.source);
            const int stored = row.source == VD_Other ? VD_Ellipsoidal : row.source;
            EXPECT_EQ(script.compounds, (List{stored, stored}));
            const ICRS* const source = reader->Get3DCRS();
            script.compounds.clear();
            reader->SetOutputVerticalDatum(DatumType(row.output));
            EXPECT_EQ(script.compounds, row.compounds);
            EXPECT_EQ(GetHeight(*reader), local ? 5.0F : row.height);
            reader->SetOutputVerticalDatum(DatumType(row.output));
            EXPECT_EQ(script.compounds.size(),
                      row.compounds.size() + (row.source == VD_Other ? 1 : 0));
            EXPECT_EQ(reader->GetOutputVerticalDatum(), row.output);
            reader->SetOutputVerticalDatum(DatumType(row.source));
            EXPECT_EQ(GetHeight(*reader), 5.0F);
            EXPECT_EQ(reader->Get3DCRS(), source);
            EXPECT_EQ(reader->GetSourceVerticalDatum(), row.source);
            EXPECT_EQ(script.objects, 4) << "CRS, two compounds, transform";
        }
}

TEST_F(VerticalTest, AFailedRebuildKeepsTheFormerDatum) {
    const Reader reader = Open(0, 1, VD_Orthometric);
    reader->SetOutputVerticalDatum(VD_Ellipsoidal);
    for (const int failing : {0, 1}) {
        script.failingCall = static_cast<int>(script.calls.size()) + failing;
        EXPECT_THROW(reader->SetOutputVerticalDatum(DatumType(2005)), scripted::Failure);
        EXPECT_EQ(reader->GetOutputVerticalDatum(), VD_Ellipsoidal);
        EXPECT_EQ(GetHeight(*reader), 6.0F);
    }
}

TEST_F(VerticalTest, TheFactorAddsFirstAndANeutralOneTouchesNoBit) {
    EXPECT_EQ(GetHeight(*Open(5.0, 2.0)), 20.0F);
    EXPECT_EQ(GetHeight(*Open(0.0, -1.0)), -5.0F);
    EXPECT_TRUE(std::isnan(GetHeight(*Open(0.0, NaN))));
    EXPECT_TRUE(std::isnan(GetHeight(*Open(NaN, 1.0))));
    script.shapes[0].ring[0].z = -0.0; // which becomes +0 if anything is added
    EXPECT_TRUE(std::signbit(GetHeight(*Open(0.0, 1.0))));
    EXPECT_FALSE(std::signbit(GetHeight(*Open(1e-300, 1.0))));
    EXPECT_FALSE(std::signbit(GetHeight(*Open(0.0, 1.0000000000000002))));
}

} // namespace
