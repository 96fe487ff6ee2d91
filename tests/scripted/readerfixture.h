#pragma once

#include "services/exception.h"
#include "tests/support/scriptedservices.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <stdexcept>
#include <typeinfo>

using namespace kelm::ogc::cs;
using kelm::DataException;
using kelm::ParameterException;
using kelm::tin::Tin;
using kelm::tin::TinReader;
using scripted::Shape;

using Window = kelm::tin::BBox<double, point2_t<double>>;
using Surface = std::unique_ptr<Tin>;
using Reader = std::unique_ptr<TinReader>;

constexpr double NaN = std::numeric_limits<double>::quiet_NaN();

inline Window MakeWindow(double xMin, double yMin, double xMax, double yMax) {
    Window window;
    window.min = {xMin, yMin};
    window.max = {xMax, yMax};
    return window;
}

/// The ring with its first vertex repeated at the end.
inline Shape Close(std::vector<ZARVertex> ring) {
    ring.push_back(ring.front());
    return {std::move(ring)};
}

constexpr double STRIP_X = 500000.25;
constexpr double STRIP_Y = 4600000.5;

/// A strip of triangles over so many vertices in two rows, in the order in which they appear.
template <typename Height>
std::vector<Shape> CreateStrip(unsigned vertices, const Height& height) {
    const auto at = [&](unsigned i) {
        return ZARVertex{STRIP_X + 3.7 * i, STRIP_Y + 40.0 * (i % 2), height(i)};
    };
    std::vector<Shape> shapes;
    for (unsigned i = 0; i + 2 < vertices; ++i)
        shapes.push_back(Close({at(i), at(i + 1), at(i + 2)}));
    return shapes;
}

/// @return the exception of exactly this class that the work ends in
template <typename E, typename Work>
E Catch(const Work& work) {
    try {
        work();
    } catch (const E& e) {
        EXPECT_EQ(typeid(e), typeid(E));
        return e;
    }
    throw std::logic_error("the work has not failed");
}

/// A script with one triangle, whose first height is 5. Nothing served may be left after a test.
class ReaderTest : public testing::Test {
  protected:
    ReaderTest() { script.shapes = {Close({{10, 20, 5}, {14, 20, 6}, {10, 23, 7}})}; }
    ~ReaderTest() override {
        EXPECT_EQ(script.openFiles, 0);
        EXPECT_EQ(script.objects, 0);
    }

    static Reader Open(double offset = 0.0, double scale = 1.0, int source = VD_Ellipsoidal,
                       int layer = 1) {
        return Reader(kelm::tin::TinReaderFactory::CreateTinReader("some.file", layer, offset,
                                                                   scale, DatumType(source)));
    }
    static Surface Load(TinReader& reader, const Window* window = nullptr) {
        return Surface(reader.Load(window));
    }

    scripted::Script& script = scripted::NewScript();
};
