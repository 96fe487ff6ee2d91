#pragma once

#include "services/vectorlayer.h"

#include <cstdint>
#include <string>
#include <vector>

namespace kelm::store::landxml {

/// A triangle of a surface.
struct Facet {
    std::uint32_t mnCorners[3]; ///< indices of points
    /// Twice the number of its face in the file, from 1; plus 1 for the second half of a face of
    /// four corners.
    std::uint32_t mnKey;
};

/// The triangles of one surface of a file, in the file's order.
///
/// The id of a triangle is the number of its face in the surface, counted from 1; invisible and
/// damaged faces count. If any face has four corners, the id is that number times ten, plus the
/// number of the triangle in the face: 0 or 1.
class Surface {
  public:
    /// @param subject the surface, for a message: "surface s of file f"
    /// @param facets with rising keys, and indices that `points` has
    Surface(std::string subject, std::vector<ZARVertex> points, std::vector<Facet> facets);

    const std::string& GetSubject() const { return moSubject; }
    int GetCount() const { return static_cast<int>(moFacets.size()); }
    /// @return 10 if any face has four corners, else 1
    int GetFactor() const { return mnFactor; }
    /// @param index below the count
    int GetId(int index) const;
    /// @return the index of the triangle with an id, or -1
    int FindIndex(int id) const;
    /// Fills the ring of a triangle: its corners in the file's order, and the first one again.
    void CopyRing(int index, ZARVertex (&ring)[4]) const;

    /// @return a corner of the extents of the triangles; zero if there is none
    const ZARVertex& GetLow() const { return moLow; }
    const ZARVertex& GetHigh() const { return moHigh; }

  private:
    void MeasureExtents();

    std::string moSubject;
    std::vector<ZARVertex> moPoints;
    std::vector<Facet> moFacets;
    int mnFactor = 1;
    ZARVertex moLow{};
    ZARVertex moHigh{};
};

} // namespace kelm::store::landxml
