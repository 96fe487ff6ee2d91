#include "services/bundled/reference/proj/areaofuse.h"

#include "services/reporting.h"

#include <cmath>

namespace kelm::ogc {

namespace {

/// Areas of use are registered to a hundredth of a degree.
constexpr double MARGIN = 0.01;

/// What PROJ gives for a bound that it does not know.
constexpr double UNKNOWN_BOUND = -1000.0;

} // namespace

bool AreaOfUse::IsWorld() const {
    return mdfWest <= -180.0 && mdfSouth <= -90.0 && mdfEast >= 180.0 && mdfNorth >= 90.0;
}

bool AreaOfUse::IsPointInside(double longitude, double latitude) const {
    const double turned = std::remainder(longitude, 360.0);
    const bool eastOfWest = turned >= mdfWest - MARGIN;
    const bool westOfEast = turned <= mdfEast + MARGIN;
    const bool inLongitude =
        mdfWest <= mdfEast ? eastOfWest && westOfEast : eastOfWest || westOfEast;
    return inLongitude && latitude >= mdfSouth - MARGIN && latitude <= mdfNorth + MARGIN;
}

bool AreaOfUse::IsAreaInside(const AreaOfUse& other) const {
    if (other.mdfSouth < mdfSouth || other.mdfNorth > mdfNorth)
        return false;
    if (mdfWest <= -180.0 && mdfEast >= 180.0)
        return true;
    const bool sameForm = (mdfWest <= mdfEast) == (other.mdfWest <= other.mdfEast);
    return sameForm && other.mdfWest >= mdfWest && other.mdfEast <= mdfEast;
}

double AreaOfUse::GetSize() const {
    const double width = mdfEast - mdfWest;
    return (width < 0.0 ? width + 360.0 : width) * (mdfNorth - mdfSouth);
}

std::string AreaOfUse::GetText() const {
    return FormatString("longitude %g to %g, latitude %g to %g", mdfWest, mdfEast, mdfSouth,
                        mdfNorth);
}

bool ReadArea(ProjSession& session, const PJ* object, AreaOfUse& area, const char*& name) {
    AreaOfUse read;
    if (!proj_get_area_of_use(session.Get(), object, &read.mdfWest, &read.mdfSouth, &read.mdfEast,
                              &read.mdfNorth, &name) ||
        !(read.mdfWest > UNKNOWN_BOUND))
        return false;
    area = read;
    return true;
}

} // namespace kelm::ogc
