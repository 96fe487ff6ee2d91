#pragma once

#include "services/bundled/store/facets/facetfault.h"

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace kelm::store {

/// Warns of the facets of a layer that cannot be used: one warning a reason, with their number,
/// their share of the layer's area in plan, and the first features.
class RefusalLog {
  public:
    /// @param subject what is read, for the texts
    explicit RefusalLog(std::string subject) : moSubject(std::move(subject)) {}

    /// Takes the next facet in reading order; those without a fault too, for the share.
    void Add(std::int64_t feature, FacetFault fault, double area);
    /// Gives the warnings.
    void Finish() const;

  private:
    /// The facets of one reason.
    struct Refused {
        std::int64_t mnShapes = 0;
        double mdfArea = 0.0;
        std::vector<std::int64_t>
            moFeatures; ///< the first ones, and one more to tell that there is
    };

    std::string GetShareText(const Refused& refused) const;

    std::string moSubject;
    std::int64_t mnShapes = 0;
    double mdfArea = 0.0; ///< of all facets
    std::map<FacetFault, Refused> moRefused;
};

} // namespace kelm::store
