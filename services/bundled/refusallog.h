#pragma once

#include "services/bundled/facets.h"

#include <cstdint>
#include <string>
#include <utility>

namespace kelm::store {

/// Warns of the facets of a layer that cannot be delivered. Facets that follow each other with the
/// same fault share a warning, and one that counts the rest ends a list which grows too long: a
/// drawing can hold a million texts beside its facets.
class RefusalLog {
  public:
    /// @param subject what is read, for the texts
    explicit RefusalLog(std::string subject) : moSubject(std::move(subject)) {}

    /// Takes the next facet in reading order, FacetFault::None included.
    void Add(std::int64_t nFeature, FacetFault eFault);
    /// Gives the warnings that are still due.
    void Finish();

  private:
    void WarnOfRun();

    std::string moSubject;
    FacetFault meFault = FacetFault::None;
    std::int64_t mnFirst = 0;
    std::int64_t mnLast = 0;
    std::int64_t mnShapes = 0;
    int mnWarnings = 0;
    std::int64_t mnUnnamed = 0;
};

} // namespace kelm::store
