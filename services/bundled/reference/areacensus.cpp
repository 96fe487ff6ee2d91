#include "services/bundled/reference/areacensus.h"

#include "services/reporting.h"

#include <algorithm>

namespace kelm::ogc {

namespace {

/// One census under way.
struct Census {
    const std::vector<ProjOperation>& moOperations;
    const AreaOfUse& moMapArea;
    AreaCensus moResult;

    /// @param position longitude and latitude. @return true if any area holds it
    bool Count(const double* position);
    bool Holds(std::size_t operation, const double* position) const;
};

bool Census::Count(const double* position) {
    bool held = false;
    for (std::size_t i = 0; i < moOperations.size(); ++i) {
        if (!Holds(i, position))
            continue;
        // The first that holds it is the most accurate one there.
        if (!held)
            moResult.mdfFinest = std::min(moResult.mdfFinest, moOperations[i].mdfAccuracy);
        held = true;
        ++moResult.moInside[i];
    }
    return held;
}

/// If there is only one operation, the area of the map CRS is enough. That of EPSG:3035 includes
/// the Canaries; that of its operation, which is the one of ETRS89, does not.
bool Census::Holds(std::size_t operation, const double* position) const {
    return moOperations[operation].IsPointInside(position[0], position[1]) ||
           (moOperations.size() == 1 && moMapArea.IsPointInside(position[0], position[1]));
}

} // namespace

std::string AreaCensus::GetText(const std::vector<ProjOperation>& operations) const {
    std::string text;
    for (std::size_t i = 0; i < operations.size(); ++i)
        if (moInside[i] > 0)
            text +=
                FormatString("%s'%s' (%s, %s) holds %zu", text.empty() ? "" : "; ",
                             operations[i].moName.c_str(), operations[i].GetAccuracyText().c_str(),
                             operations[i].moAreaName.c_str(), moInside[i]);
    return text;
}

AreaCensus TakeCensus(const std::vector<ProjOperation>& operations, const AreaOfUse& mapArea,
                      const double* source, const std::vector<double>& degrees) {
    Census census{operations, mapArea, {}};
    census.moResult.moInside.assign(operations.size(), 0);
    for (std::size_t i = 0; i < degrees.size(); i += 3)
        if (!census.Count(&degrees[i]))
            census.moResult.moOutside.Add(source + i);
    return census.moResult;
}

} // namespace kelm::ogc
