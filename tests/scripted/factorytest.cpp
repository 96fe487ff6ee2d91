#include "tests/scripted/readerfixture.h"

namespace {

class FactoryTest : public ReaderTest {
  protected:
    static std::string GetRefusal(int layer = 5) {
        const auto e = Catch<DataException>([=] { Open(0, 1, VD_Ellipsoidal, layer); });
        EXPECT_EQ(e.GetSourcePath(), "tin/tinreaderfactory");
        return e.what();
    }
};

TEST_F(FactoryTest, AnUnfitFileIsRefusedInTheWordsOfItsFault) {
    script.isCountValid = false;
    const std::string empty = "The provided vector layer 5 in the input file some.file is empty.";
    EXPECT_EQ(GetRefusal(), empty);
    script.isCountValid = true;
    for (const int count : {0, -1}) {
        script.recordedCount = count;
        EXPECT_EQ(GetRefusal(), empty);
    }
    for (const int type : {0, 1, 3, 5}) {
        script.layerType = type;
        EXPECT_EQ(GetRefusal(), "The provided vector layer 5 in the input file some.file must be "
                                "defined by polygons.");
    }
    script.hasLayer = false;
    for (const int layer : {5, 0, -5})
        EXPECT_EQ(GetRefusal(layer), "ZARGetLayer failed on the provided vector layer " +
                                         std::to_string(layer < 1 ? 3 : 5) +
                                         " in the input file some.file.");
    script.segmentCount = 0;
    EXPECT_EQ(GetRefusal(), "This file some.file contains no vector layer");
    script.failingCall = static_cast<int>(script.calls.size());
    EXPECT_EQ(GetRefusal(), "The format of file some.file is not supported by ZAR");
    EXPECT_THROW(kelm::tin::TinReaderFactory::CreateTinReader(nullptr, 1, 0, 1, VD_Other),
                 DataException);
}

TEST_F(FactoryTest, AReaderAnswersWithoutTheFile) {
    script.low = {10, 20, -3};
    script.high = {14, 28, 9};
    for (const int type : {2, 4}) {
        script.layerType = type;
        const Reader reader = Open();
        script.calls.clear();
        EXPECT_EQ(reader->GetShapeCount(), 1);
        EXPECT_EQ(reader->GetArea(), 32.0);
        EXPECT_EQ(reader->GetBBox().min.z, -3.0);
        EXPECT_EQ(reader->GetBBox().max.z, 9.0);
        EXPECT_TRUE(script.calls.empty());
        reader->GetBBox().max.x = 10.0;
        EXPECT_EQ(reader->GetArea(), 0.0);
        const Window beside = MakeWindow(11, 0, 20, 30);
        EXPECT_EQ(reader->Load(&beside), nullptr) << "the box that the caller has set counts";
    }
}

// From the open file on, whichever call fails: what is thrown arrives, and nothing is left behind.
TEST_F(FactoryTest, AFailureOfAnyCallLeavesNothing) {
    const auto work = [&] {
        script.calls.clear();
        const Reader reader = Open(0, 1, VD_Orthometric, 0);
        reader->SetOutputVerticalDatum(VD_Ellipsoidal);
        return Load(*reader)->GetTriangleCount();
    };
    EXPECT_EQ(work(), 1U);
    const std::vector<std::string> steps = {
        "ZAROpen",         "ZARSegCount",          "ZARSegNext",         "ZARGetLayer",
        "ZARGetLayerType", "ZARGetProjectionInfo", "CreateCRS",          "GetDimension",
        "IsCRSLocal",      "CreateCompoundCS",     "CreateCompoundCS",   "CreateCRSTransform",
        "ZARGetExtents",   "CreateCompoundCS",     "CreateCRSTransform", "ZARGetNext",
        "ZARGetShapeRef",  "ZARGetNext",           "TransformPoints"};
    EXPECT_EQ(script.calls, steps);
    for (std::size_t k = 1; k < steps.size(); ++k)
        if (steps[k] != "ZARGetShapeRef") {
            script.failingCall = static_cast<int>(k);
            EXPECT_THROW(work(), scripted::Failure) << steps[k];
            EXPECT_EQ(script.openFiles + script.objects, 0) << steps[k];
        }
}

TEST_F(FactoryTest, AReaderOnNothingLoadsNothing) {
    ZARLayer_t* layer = nullptr;
    TinReader reader(layer, 0.0, 1.0, VD_Orthometric);
    reader.SetOutputVerticalDatum(VD_Ellipsoidal);
    EXPECT_EQ(reader.Load(nullptr), nullptr);
    EXPECT_TRUE(script.calls.empty());
}

} // namespace
