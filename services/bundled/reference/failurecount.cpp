#include "services/bundled/reference/failurecount.h"

#include "services/exception.h"
#include "services/reporting.h"

namespace kelm::ogc {

namespace {

constexpr const char* SOURCE = "services/bundled/reference/failurecount";

} // namespace

void FailureCount::Add(const double* triple) {
    if (mnFailed++ == 0) {
        mdfX = triple[0];
        mdfY = triple[1];
        mdfZ = triple[2];
    }
}

void FailureCount::Test(unsigned int count, const std::string& reason) const {
    if (mnFailed > 0)
        throw DataException(
            FormatString("%zu of %u points cannot be converted, the first at x %.17g, y %.17g, "
                         "z %.17g: %s",
                         mnFailed, count, mdfX, mdfY, mdfZ, reason.c_str()),
            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

} // namespace kelm::ogc
