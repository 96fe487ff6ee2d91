#pragma once

#include <string>

namespace kelm::ogc {

/// Counts points that failed and keeps the first of them.
struct FailureCount {
    std::size_t mnFailed = 0;
    double mdfX = 0.0;
    double mdfY = 0.0;
    double mdfZ = 0.0;

    void Add(const double* triple);
    /// @param count the number of all points. @throw kelm::DataException if any point failed
    void Test(unsigned int count, const std::string& reason) const;
};

} // namespace kelm::ogc
