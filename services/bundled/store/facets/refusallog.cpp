#include "services/bundled/store/facets/refusallog.h"

#include "services/reporting.h"

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/facets/refusallog";
constexpr std::size_t MOST_NAMED = 3;

std::string GetFeaturesText(const std::vector<std::int64_t>& features) {
    std::string text = features.size() == 1 ? "feature" : "features";
    for (std::size_t i = 0; i < features.size() && i < MOST_NAMED; ++i)
        text += (i == 0 ? " " : ", ") + std::to_string(features[i]);
    return features.size() > MOST_NAMED ? text + " and others" : text;
}

} // namespace

void RefusalLog::Add(std::int64_t feature, FacetFault fault, double area) {
    ++mnShapes;
    mdfArea += area;
    if (fault == FacetFault::None)
        return;
    Refused& refused = moRefused[fault];
    ++refused.mnShapes;
    refused.mdfArea += area;
    std::vector<std::int64_t>& features = refused.moFeatures;
    if (features.size() <= MOST_NAMED && (features.empty() || features.back() != feature))
        features.push_back(feature);
}

void RefusalLog::Finish() const {
    for (const auto& [fault, refused] : moRefused)
        tellus::Warning::Warn(
            FormatString("The %s: %lld of %lld shapes cannot be used%s: %s (%s)", moSubject.c_str(),
                         static_cast<long long>(refused.mnShapes), static_cast<long long>(mnShapes),
                         GetShareText(refused).c_str(), GetFaultText(fault),
                         GetFeaturesText(refused.moFeatures).c_str()),
            SOURCE, __LINE__);
}

std::string RefusalLog::GetShareText(const Refused& refused) const {
    return refused.mdfArea > 0.0
               ? FormatString(", %.3g %% of the area", 100.0 * refused.mdfArea / mdfArea)
               : std::string();
}

} // namespace kelm::store
