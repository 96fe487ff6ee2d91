#include "tin/tinreader.h"

#include "tin/load/heightconversion.h"

namespace kelm::tin {

namespace {

/// Vertex count from which heights are interpolated in a grid.
constexpr unsigned GRID_FROM = 1000;

} // namespace

load::ElevationFactor TinReader::GetElevationFactor() const {
    return {mdfElOffset, mdfElScale};
}

load::HeightColumn TinReader::GetColumn(point3_t<float>* poPoints, unsigned int nCount) const {
    return {poPoints, nCount, {mdfXBase, mdfYBase}};
}

double TinReader::ApplyElFactor(float h) const {
    return GetElevationFactor().Apply(h);
}

double TinReader::CopyHeight(float h) const {
    return static_cast<double>(h);
}

bool TinReader::HeightConvert(const aabb_t<point2_t<float>>* poWindow, point3_t<float>* poPoints,
                              unsigned int nCount) const {
    if (nCount >= GRID_FROM)
        return HeightConvertManyPoints(poWindow, poPoints, nCount);
    return HeightConvertFewPoints(poPoints, nCount);
}

bool TinReader::HeightConvertSimple(const aabb_t<point2_t<float>>*, point3_t<float>* poPoints,
                                    unsigned int nCount) const {
    load::ApplyFactor(GetColumn(poPoints, nCount), GetElevationFactor());
    return false;
}

bool TinReader::HeightConvertFewPoints(point3_t<float>* poPoints, unsigned int nCount) const {
    load::ConvertFewHeights(GetColumn(poPoints, nCount), GetElevationFactor(), *mpoTransform);
    return false;
}

bool TinReader::HeightConvertManyPoints(const aabb_t<point2_t<float>>* poWindow,
                                        point3_t<float>* poPoints, unsigned int nCount) const {
    load::ConvertManyHeights(GetColumn(poPoints, nCount), *poWindow, GetElevationFactor(),
                             *mpoTransform);
    return false;
}

void TinReader::BuildInterpGridForWindow(const aabb_t<point2_t<float>>* poWindow, float fZMin,
                                         float fZMax, InterpGrid3D& oGrid) const {
    load::BuildGrid(*poWindow, {mdfXBase, mdfYBase}, fZMin, fZMax, *mpoTransform, oGrid);
}

} // namespace kelm::tin
