#include "services/bundled/store/landxml/document/recordlog.h"

#include "services/reporting.h"

namespace kelm::store::landxml {

namespace {

constexpr const char* SOURCE = "services/bundled/store/landxml/document/recordlog";
constexpr std::int64_t MOST_NAMED = 100;

} // namespace

void RecordLog::Add(const char* kind, std::int64_t number, std::uint64_t line,
                    const std::string& fault) {
    if (++mnRecords <= MOST_NAMED)
        tellus::Warning::Warn(FormatString("The %s: %s %lld at line %llu is left out: %s",
                                           moSubject.c_str(), kind, static_cast<long long>(number),
                                           static_cast<unsigned long long>(line), fault.c_str()),
                              SOURCE, __LINE__);
}

void RecordLog::Finish() {
    if (mnRecords > MOST_NAMED)
        tellus::Warning::Warn(FormatString("The %s: %lld further records are left out",
                                           moSubject.c_str(),
                                           static_cast<long long>(mnRecords - MOST_NAMED)),
                              SOURCE, __LINE__);
}

} // namespace kelm::store::landxml
