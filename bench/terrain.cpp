#include "bench/terrain.h"

#include "bench/random.h"
#include "tin/tinreader.h"
#include "tin/tinreaderfactory.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <iterator>
#include <limits>
#include <stdexcept>

namespace kelm::bench {

namespace {

constexpr const char* REAL_TERRAIN = KELM_TIN_DATA_DIR "/jacksboro.gpkg";

/// Value of one octave at a lattice node, from 0 to below 2^16.
std::int64_t NodeValue(unsigned octave, std::uint32_t col, std::uint32_t row) {
    Random random((std::uint64_t{octave} << 58) ^ (std::uint64_t{col} << 29) ^ row);
    random.Below(1);
    return random.Below(1U << 16);
}

/// Sum of octaves of value noise in integers, in millimetres: each has twice the spacing and 1.7
/// times the amplitude of the one before; the first has 3 m over 20 m.
std::int64_t FractalHeight(std::uint32_t col, std::uint32_t row) {
    std::int64_t height = 0;
    std::int64_t amplitude = 3000;
    for (unsigned octave = 1; octave <= 10; ++octave) {
        const std::uint32_t c = col >> octave;
        const std::uint32_t r = row >> octave;
        const std::int64_t spacing = std::int64_t{1} << octave;
        const std::int64_t u = col & (spacing - 1);
        const std::int64_t v = row & (spacing - 1);
        const std::int64_t low =
            NodeValue(octave, c, r) * (spacing - u) + NodeValue(octave, c + 1, r) * u;
        const std::int64_t high =
            NodeValue(octave, c, r + 1) * (spacing - u) + NodeValue(octave, c + 1, r + 1) * u;
        height += (low * (spacing - v) + high * v) * amplitude / (spacing * spacing << 16);
        amplitude = amplitude * 17 / 10;
    }
    return height;
}

void Shuffle(std::vector<Triangle_Id>& oTriangles) {
    Random random(7);
    for (std::size_t i = oTriangles.size(); i > 1; --i)
        std::swap(oTriangles[i - 1], oTriangles[random.Below(static_cast<std::uint32_t>(i))]);
}

Terrain MakeFractal(unsigned triangles) {
    const auto cells = static_cast<unsigned>(std::lround(std::sqrt(triangles / 2.0)));
    const unsigned side = cells + 1;
    Random random(1);
    Terrain terrain;
    terrain.oVertices.reserve(std::size_t{side} * side);
    const auto place = [&](unsigned node) {
        return static_cast<float>((10000.0 * node + random.Below(3000)) / 1000.0);
    };
    for (unsigned row = 0; row < side; ++row)
        for (unsigned col = 0; col < side; ++col)
            terrain.oVertices.push_back(
                {place(col), place(row),
                 static_cast<float>(static_cast<double>(FractalHeight(col, row)) / 1000.0)});
    terrain.oTriangles.reserve(std::size_t{cells} * cells * 2);
    for (unsigned row = 0; row < cells; ++row)
        for (unsigned col = 0; col < cells; ++col) {
            const unsigned a = row * side + col;
            const unsigned c = a + side + 1;
            const unsigned turn = random.Below(2);
            terrain.oTriangles.push_back({a, a + 1, turn == 0 ? c : c - 1});
            terrain.oTriangles.push_back({turn == 0 ? a : a + 1, c, c - 1});
        }
    return terrain;
}

Terrain ReadReal() {
    const std::unique_ptr<tin::TinReader> reader(tin::TinReaderFactory::CreateTinReader(
        REAL_TERRAIN, 0, 0.0, 1.0, ogc::cs::DatumType::VD_Orthometric));
    const std::unique_ptr<tin::Tin> surface(reader->Load(nullptr));
    Terrain terrain;
    surface->GetXYBase(terrain.dfXBase, terrain.dfYBase);
    point3_t<float>* vertices;
    unsigned count;
    surface->GetVertexList(vertices, count);
    terrain.oVertices.assign(vertices, vertices + count);
    for (unsigned i = 0; i < surface->GetTriangleCount(); ++i) {
        const tin::Triangle& triangle = *surface->GetTriangle(i);
        const auto id = [&](int k) {
            return static_cast<std::uint32_t>(triangle.GetVertex(k) - vertices);
        };
        terrain.oTriangles.push_back({id(0), id(1), id(2)});
    }
    return terrain;
}

/// Maps the middle of the first and of the last row and column onto the terrain's box.
void StretchToGrid(Terrain& rTerrain) {
    const auto stretch = [&](float point3_t<float>::*axis) {
        const auto less = [axis](const auto& a, const auto& b) { return a.*axis < b.*axis; };
        const auto ends =
            std::minmax_element(rTerrain.oVertices.begin(), rTerrain.oVertices.end(), less);
        const double low = static_cast<double>((*ends.first).*axis);
        const double scale = (RASTER_SIDE - 1) / (static_cast<double>((*ends.second).*axis) - low);
        for (point3_t<float>& vertex : rTerrain.oVertices)
            vertex.*axis = static_cast<float>((static_cast<double>(vertex.*axis) - low) * scale);
    };
    stretch(&point3_t<float>::x);
    stretch(&point3_t<float>::y);
}

/// Every triangle becomes the first one.
void MakeSame(Terrain& rTerrain) {
    std::fill(rTerrain.oTriangles.begin(), rTerrain.oTriangles.end(), rTerrain.oTriangles[0]);
}

/// Crowds the vertices towards the origin, so that each 100th of the way there is a power of two.
void Crowd(Terrain& rTerrain) {
    const float end = rTerrain.oVertices.back().x;
    for (point3_t<float>& vertex : rTerrain.oVertices) {
        vertex.x = end * std::exp2(100.0F * (vertex.x / end - 1.0F));
        vertex.y = end * std::exp2(100.0F * (vertex.y / end - 1.0F));
    }
}

void MakeVertical(float i, point3_t<float>* poCorners) {
    poCorners[0] = {i, i, 0.0F};
    poCorners[1] = {i + 1.0F, i + 1.0F, 2.0F};
    poCorners[2] = {i, i, 5.0F};
}

void MakeTower(float i, point3_t<float>* poCorners) {
    poCorners[0] = {-i, -i, 2.0F};
    poCorners[1] = {i, -i, 2.0F};
    poCorners[2] = {0.0F, i, 2.0F};
}

void MakeSliver(float i, point3_t<float>* poCorners) {
    poCorners[0] = {i, 0.0F, 1.0F};
    poCorners[1] = {i + 1.0F, 5e6F, 1.0F};
    poCorners[2] = {i, -5e6F, 1.0F};
}

void MakeFar(float i, point3_t<float>* poCorners) {
    constexpr float FAR = std::numeric_limits<float>::max();
    const float inner = i * (FAR / 1e8F);
    poCorners[0] = {-FAR, inner, 1.0F};
    poCorners[1] = {FAR, -FAR, 1.0F};
    poCorners[2] = {inner, -FAR, 2.0F};
}

/// Gives every triangle three vertices of its own, by its number.
template <void (*MakeCorners)(float, point3_t<float>*)>
void Reshape(Terrain& rTerrain) {
    rTerrain.oVertices.resize(3 * rTerrain.oTriangles.size());
    for (std::size_t i = 0; i < rTerrain.oTriangles.size(); ++i) {
        const auto id = static_cast<std::uint32_t>(3 * i);
        rTerrain.oTriangles[i] = {id, id + 1, id + 2};
        MakeCorners(static_cast<float>(i), &rTerrain.oVertices[id]);
    }
}

/// Cuts an ending off a name. @return was it there?
bool TakeEnding(std::string& rName, const std::string& sEnding) {
    if (rName.size() < sEnding.size() ||
        rName.compare(rName.size() - sEnding.size(), sEnding.size(), sEnding) != 0)
        return false;
    rName.resize(rName.size() - sEnding.size());
    return true;
}

struct Change {
    const char* pszEnding;
    void (*Apply)(Terrain&);
};

/// What an ending of a name makes of a terrain, in the order in which endings stand and are
/// applied.
constexpr Change CHANGES[] = {
    {"-shuffled", [](Terrain& rTerrain) { Shuffle(rTerrain.oTriangles); }},
    {"-same", MakeSame},
    {"-crowded", Crowd},
    {"-vertical", Reshape<MakeVertical>},
    {"-tower", Reshape<MakeTower>},
    {"-slivers", Reshape<MakeSliver>},
    {"-far", Reshape<MakeFar>},
    {"-grid", StretchToGrid}};

std::unique_ptr<Terrain> MakeTerrain(const std::string& sName) {
    std::string base = sName;
    std::vector<Change> changes;
    for (auto change = std::rbegin(CHANGES); change != std::rend(CHANGES); ++change)
        if (TakeEnding(base, change->pszEnding))
            changes.insert(changes.begin(), *change);
    auto terrain = std::make_unique<Terrain>();
    if (base == "jacksboro") {
        *terrain = ReadReal();
    } else {
        char* unit;
        const unsigned long count = std::strtoul(base.c_str(), &unit, 10);
        const std::string sUnit = unit;
        if (count == 0 || (sUnit != "k" && sUnit != "M"))
            throw std::invalid_argument("there is no terrain " + sName);
        *terrain = MakeFractal(static_cast<unsigned>(count) * (sUnit == "k" ? 1000U : 1000000U));
    }
    for (const Change& change : changes)
        change.Apply(*terrain);
    terrain->sName = sName;
    return terrain;
}

} // namespace

std::shared_ptr<const Terrain> GetTerrain(const std::string& sName) {
    return Recall<Terrain>(sName, [&] { return MakeTerrain(sName); });
}

std::shared_ptr<const tin::Tin> GetSurface(const std::string& sName) {
    return Recall<tin::Tin>(sName, [&] {
        const auto source = GetTerrain(sName);
        const Terrain& terrain = *source;
        auto* vertices = new point3_t<float>[terrain.oVertices.size()];
        std::copy(terrain.oVertices.begin(), terrain.oVertices.end(), vertices);
        auto* ids = new Triangle_Id[terrain.oTriangles.size()];
        std::copy(terrain.oTriangles.begin(), terrain.oTriangles.end(), ids);
        return std::make_unique<tin::Tin>(vertices, static_cast<unsigned>(terrain.oVertices.size()),
                                          ids, static_cast<unsigned>(terrain.oTriangles.size()),
                                          terrain.dfXBase, terrain.dfYBase);
    });
}

std::vector<containers::KeyPoint<double>> GetCorners(const Terrain& oTerrain) {
    std::vector<containers::KeyPoint<double>> corners;
    corners.reserve(3 * oTerrain.oTriangles.size());
    for (const Triangle_Id& triangle : oTerrain.oTriangles)
        for (const std::uint32_t id : {triangle.id0, triangle.id1, triangle.id2}) {
            const point3_t<float>& v = oTerrain.oVertices[id];
            corners.push_back({oTerrain.dfXBase + static_cast<double>(v.x),
                               oTerrain.dfYBase + static_cast<double>(v.y),
                               static_cast<double>(v.z)});
        }
    return corners;
}

} // namespace kelm::bench
