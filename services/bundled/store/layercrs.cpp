#include "services/bundled/store/layercrs.h"

#include "services/bundled/store/gdal/crstext.h"
#include "services/bundled/store/gdal/gdalcall.h"
#include "services/bundled/undefinedcrs.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <ogrsf_frmts.h>

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/layercrs";

/// The store delivers x as easting or longitude. Drivers turn coordinates to that order, and tell
/// so.
void TestAxes(const OGRSpatialReference& crs, const std::string& subject) {
    OGRSpatialReference turned(crs);
    turned.SetAxisMappingStrategy(OAMS_TRADITIONAL_GIS_ORDER);
    if (turned.GetDataAxisToSRSAxisMapping() != crs.GetDataAxisToSRSAxisMapping())
        throw DataException(FormatString("The coordinates of the %s do not stand in the order "
                                         "easting, northing",
                                         subject.c_str()),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

std::string WriteText(const OGRSpatialReference& crs, const std::string& subject,
                      const GdalCall& call) {
    if (crs.IsEmpty() || services::IsUndefinedCRS(crs.GetName()))
        return {};
    TestAxes(crs, subject);
    std::string text = ExportCrs(crs);
    if (text.empty())
        throw DataException(FormatString("The CRS of the %s cannot be written as PROJJSON: %s",
                                         subject.c_str(), call.GetFailures().c_str()),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return text;
}

} // namespace

std::string ReadCrsText(OGRLayer& layer, const std::string& subject) {
    std::string text;
    Warnings warnings;
    {
        GdalCall call;
        if (const OGRSpatialReference* crs = layer.GetSpatialRef())
            text = WriteText(*crs, subject, call);
        warnings = call.TakeWarnings();
        if (call.HasFailed())
            AddWarning(warnings, call.GetFailures(), 1);
    }
    PassOn(warnings, "The CRS of the " + subject);
    return text;
}

} // namespace kelm::store
