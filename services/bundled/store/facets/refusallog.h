#pragma once

#include "services/bundled/store/facets/facetfault.h"

#include <cstdint>
#include <string>
#include <utility>

namespace kelm::store {

/// Warns of the facets of a layer that cannot be delivered.
///
/// Facets that follow each other with the same fault share a warning. A drawing can hold a million
/// texts beside its facets, so the number of warnings is limited; a last one counts the facets that
/// the others do not name.
class RefusalLog {
  public:
    /// @param subject what is read, for the texts
    explicit RefusalLog(std::string subject) : moSubject(std::move(subject)) {}

    /// Takes the next facet in reading order; those without a fault too, as they end a run.
    void Add(std::int64_t feature, FacetFault fault);
    /// Gives the warnings that are still due.
    void Finish();

  private:
    void EndRun();
    void WarnOfRun();

    std::string moSubject;
    FacetFault meFault = FacetFault::None; ///< of the present run
    std::int64_t mnFirst = 0;              ///< first feature of the run
    std::int64_t mnLast = 0;               ///< last feature of the run
    std::int64_t mnShapes = 0;             ///< facets of the run
    int mnWarnings = 0;
    std::int64_t mnUnnamed = 0; ///< facets beyond the limit of warnings
};

} // namespace kelm::store
