#pragma once

#include "tests/digest/digest.h"
#include "tests/support/scriptedservices.h"
#include "tests/support/transcript.h"
#include "tin/aabbtree.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

using kelm::ogc::cs::DatumType;
using kelm::tin::AabbTree;
using kelm::tin::TinReader;
using scripted::Ring;

using Surface = std::unique_ptr<kelm::tin::Tin>;
using Reader = std::unique_ptr<TinReader>;

struct Window : kelm::tin::BBox<double, point2_t<double>> {
    Window(double xMin, double yMin, double xMax, double yMax) {
        min = {xMin, yMin};
        max = {xMax, yMax};
    }
};

constexpr double STRIP_X = 500000.25, STRIP_Y = 4600000.5;

/// The ring with its first vertex repeated at the end.
inline Ring Close(Ring ring) {
    ring.push_back(ring.front());
    return ring;
}

/// Vertex of a strip in two rows, which has this many different heights.
inline ZARVertex GetStripVertex(unsigned i, unsigned heights) {
    return {STRIP_X + 3.7 * i, STRIP_Y + 40.0 * (i % 2), 700.0 + 0.37 * (i * 7919 % heights)};
}

/// The triangles of a strip over so many vertices, in the order in which they appear.
inline std::vector<Ring> CreateStrip(unsigned vertices, unsigned heights) {
    std::vector<Ring> shapes;
    for (unsigned i = 0; i + 2 < vertices; ++i)
        shapes.push_back(Close({GetStripVertex(i, heights), GetStripVertex(i + 1, heights),
                                GetStripVertex(i + 2, heights)}));
    return shapes;
}

/// A number that changes with any vertex of any triangle.
inline double Summarise(const Surface& surface) {
    double sum = -1.0;
    for (unsigned i = 0; surface && i < 3 * surface->GetTriangleCount(); ++i) {
        const point3_t<float>& v = *surface->GetTriangle(i / 3)->GetVertex(int(i % 3));
        sum = sum * 1.0000001 + double(v.x) + 3.0 * double(v.y) + 7.0 * double(v.z);
    }
    return sum;
}

/// Opens the searches and subsets that are not public.
struct Opened : kelm::tin::Tin {
    explicit Opened(const Tin& rTin) : Tin(rTin) {}

    /// @return a number that changes with the answer to any kind of query, at a place of a strip
    double Ask(const AabbTree* tree, unsigned place) const {
        const double x = STRIP_X + 11.3 * place, y = STRIP_Y + place % 41;
        float height = -1.0F, crossing = -1.0F;
        GetHeight(x, y, height, tree);
        GetLineIntersectHeight(point3_t<double>{x, y, 900}, {x + 30, y, -900}, crossing, tree);
        std::vector<unsigned> met;
        FindTrianglesByPoint(11.3F * float(place), 20.0F, met, tree);
        const point2_t<double> path[] = {{x, y}, {x + 20.0, y + 5.0}, {x, y + 30.0}};
        const Surface parts[] = {Surface(SubsetByRegion(Window(x, y, x + 400, y + 9), tree)),
                                 Surface(SubsetByLineString(path, 3, tree)),
                                 Surface(Subset(std::vector<unsigned char>(place, 1))),
                                 Surface(Subset(std::vector<unsigned>{5, 5, place}))};
        std::vector<int> cells;
        std::vector<float> heights;
        Tin(*this).GetTriangle(place)->GetGridPoints(900, 90, cells, heights);
        double sum = double(height) + 10.0 * double(crossing) + double(met.size() + cells.size());
        for (const Surface& part : parts)
            sum = 3.0 * sum + Summarise(part);
        return sum;
    }
};

/// A script with one triangle, whose first height is 5.
struct ReaderTest : testing::Test {
    ReaderTest() {
        script.shapes = {Close({{10, 20, 5}, {14, 20, 6}, {10, 23, 7}})};
        Recording::poTranscript = &transcript.moLines;
    }
    ~ReaderTest() override { Recording::poTranscript = nullptr; }

    static Reader Open(double offset = 0.0, double scale = 1.0, int source = 2002) {
        return Reader(kelm::tin::TinReaderFactory::CreateTinReader("some.file", 0, offset, scale,
                                                                   DatumType(source)));
    }
    static Surface Load(TinReader& reader, const Window* window = nullptr) {
        return Surface(reader.Load(window));
    }

    scripted::Script script;
    kelm::test::Transcript transcript;
};
