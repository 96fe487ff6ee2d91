#include "services/bundled/refusallog.h"

#include "services/reporting.h"

namespace kelm::store {

namespace {

constexpr int knMostWarnings = 1000;

void Warn(const std::string& text, unsigned nLine) {
    tellus::Warning::Warn(text, "services/bundled/refusallog", nLine);
}

} // namespace

void RefusalLog::Add(std::int64_t nFeature, FacetFault eFault) {
    if (eFault != meFault) {
        WarnOfRun();
        meFault = eFault;
        mnFirst = nFeature;
        mnShapes = 0;
    }
    mnLast = nFeature;
    ++mnShapes;
}

void RefusalLog::Finish() {
    WarnOfRun();
    meFault = FacetFault::None;
    if (mnUnnamed > 0)
        Warn(FormatString("The %s: %lld further shapes cannot be used", moSubject.c_str(),
                          static_cast<long long>(mnUnnamed)),
             __LINE__);
}

void RefusalLog::WarnOfRun() {
    if (meFault == FacetFault::None)
        return;
    if (mnWarnings == knMostWarnings) {
        mnUnnamed += mnShapes;
        return;
    }
    ++mnWarnings;
    const auto nFirst = static_cast<long long>(mnFirst);
    const auto nLast = static_cast<long long>(mnLast);
    const std::string features = mnFirst == mnLast
                                     ? FormatString("feature %lld", nFirst)
                                     : FormatString("features %lld to %lld", nFirst, nLast);
    Warn(FormatString("The %s: %s cannot be used (shapes left out: %lld): %s", moSubject.c_str(),
                      features.c_str(), static_cast<long long>(mnShapes), GetFaultText(meFault)),
         __LINE__);
}

} // namespace kelm::store
