#pragma once

#include "services/bundled/store/landxml/document/pointtable.h"
#include "services/bundled/store/landxml/document/recordlog.h"
#include "services/bundled/store/landxml/document/surface.h"

#include <array>
#include <string_view>

namespace kelm::store::landxml {

/// Gathers the points and faces of a surface as they come, and makes the surface of them.
///
/// A damaged point or face is left out with a warning. Faces may stand in front of their points.
class SurfaceBuilder {
  public:
    /// @param subject the surface, for a message: "surface s of file f"
    explicit SurfaceBuilder(const std::string& subject) : moLog(subject) {}

    /// @param number attribute `id`, or null. @param text northing, easting and elevation
    void AddPoint(const char* number, std::string_view text, std::uint64_t line);
    /// @param text the numbers of three or four points. @throw kelm::DataException if there are
    /// more faces than shape ids
    void AddFace(std::string_view text, bool invisible, std::uint64_t line);
    /// Called once, behind the last record.
    Surface Finish();

    const std::string& GetSubject() const { return moLog.GetSubject(); }

  private:
    using Corners = std::array<std::uint32_t, 4>;
    void AddCorners(const Corners& corners, int count, std::uint64_t line);
    bool FinishFace(std::size_t facet, std::size_t count);
    std::string Resolve(Corners& corners, std::size_t count) const;
    bool Cut(std::size_t facet, const Corners& corners);
    void ReportCounts(const Surface& surface) const;

    RecordLog moLog;
    PointTable moPoints;
    std::int64_t mnPoints = 0; ///< damaged ones included
    std::int64_t mnFaces = 0;  ///< invisible and damaged ones included
    std::int64_t mnInvisible = 0;
    /// Corners are numbers of points until Finish, then indices. A face of four corners stands as
    /// 1, 2, 3 and 3, 4, 1 until it is cut.
    std::vector<Facet> moFacets;
    std::vector<std::uint32_t> moLines; ///< of the facets; too great a line as the greatest number
};

} // namespace kelm::store::landxml
