#include "services/bundled/store/facets/refusallog.h"

#include "services/reporting.h"

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/facets/refusallog";
constexpr int MOST_WARNINGS = 1000;

std::string GetFeaturesText(std::int64_t first, std::int64_t last) {
    return first == last ? FormatString("feature %lld", static_cast<long long>(first))
                         : FormatString("features %lld to %lld", static_cast<long long>(first),
                                        static_cast<long long>(last));
}

} // namespace

void RefusalLog::Add(std::int64_t feature, FacetFault fault) {
    if (fault != meFault) {
        EndRun();
        meFault = fault;
        mnFirst = feature;
        mnShapes = 0;
    }
    mnLast = feature;
    ++mnShapes;
}

void RefusalLog::Finish() {
    EndRun();
    meFault = FacetFault::None;
    if (mnUnnamed > 0)
        tellus::Warning::Warn(FormatString("The %s: %lld further shapes cannot be used",
                                           moSubject.c_str(), static_cast<long long>(mnUnnamed)),
                              SOURCE, __LINE__);
}

void RefusalLog::EndRun() {
    if (meFault == FacetFault::None)
        return;
    if (mnWarnings == MOST_WARNINGS)
        mnUnnamed += mnShapes;
    else
        WarnOfRun();
}

void RefusalLog::WarnOfRun() {
    ++mnWarnings;
    tellus::Warning::Warn(FormatString("The %s: %s cannot be used (shapes left out: %lld): %s",
                                       moSubject.c_str(), GetFeaturesText(mnFirst, mnLast).c_str(),
                                       static_cast<long long>(mnShapes), GetFaultText(meFault)),
                          SOURCE, __LINE__);
}

} // namespace kelm::store
