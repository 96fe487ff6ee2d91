#include "services/bundled/store/gdal/warnings.h"

#include "services/reporting.h"

namespace kelm::store {

namespace {

constexpr const char* SOURCE = "services/bundled/store/gdal/warnings";
constexpr std::size_t MOST_TEXTS = 1000;

std::string GetTimesText(std::int64_t times) {
    return times > 1 ? FormatString(" (%lld times)", static_cast<long long>(times)) : std::string();
}

} // namespace

void AddWarning(Warnings& warnings, const std::string& text, std::int64_t times) {
    if (warnings.size() < MOST_TEXTS || warnings.count(text) > 0)
        warnings[text] += times;
    else
        warnings["further warnings"] += times;
}

void PassOn(const Warnings& warnings, const std::string& subject) {
    for (const auto& [text, times] : warnings)
        tellus::Warning::Warn(
            FormatString("%s: %s%s", subject.c_str(), text.c_str(), GetTimesText(times).c_str()),
            SOURCE, __LINE__);
}

} // namespace kelm::store
