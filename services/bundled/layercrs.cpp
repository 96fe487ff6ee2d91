#include "services/bundled/layercrs.h"

#include "services/bundled/formats.h"
#include "services/bundled/gdalcall.h"
#include "services/bundled/undefinedcrs.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <cpl_conv.h>
#include <ogrsf_frmts.h>

#include <memory>

namespace kelm::store {

namespace {

std::string WriteText(const OGRSpatialReference& oCrs, const std::string& subject,
                      const GdalCall& oCall) {
    if (oCrs.IsEmpty() || services::TestUndefinedCRS(oCrs.GetName()))
        return {};
    const char* const apszOptions[] = {"FORMAT=WKT2_2019", "MULTILINE=NO", nullptr};
    char* pszText = nullptr;
    const OGRErr eError = oCrs.exportToWkt(&pszText, apszOptions);
    const std::unique_ptr<char, decltype(&CPLFree)> poText(pszText, CPLFree);
    if (eError != OGRERR_NONE || !pszText || !*pszText)
        throw DataException(FormatString("The CRS of the %s cannot be written as WKT: %s",
                                         subject.c_str(), oCall.GetFailures().c_str()),
                            "services/bundled/layercrs", __PRETTY_FUNCTION__, __LINE__);
    return pszText;
}

} // namespace

std::string ReadCrsText(OGRLayer& oLayer, const std::string& subject) {
    std::string text;
    Warnings oWarnings;
    {
        GdalCall oCall;
        const Confinement oConfinement;
        if (const OGRSpatialReference* poCrs = oLayer.GetSpatialRef())
            text = WriteText(*poCrs, subject, oCall);
        oWarnings = oCall.TakeWarnings();
        if (oCall.HasFailed())
            AddWarning(oWarnings, oCall.GetFailures(), 1);
    }
    PassOn(oWarnings, "The CRS of the " + subject);
    return text;
}

} // namespace kelm::store
