#pragma once

#include "tin/heightgrid/record.h"
#include "tin/triangle.h"

#include <array>
#include <vector>

namespace kelm::tin::heightgrid {

/// Packs triangles into the record of a list until it is full.
class RecordWriter {
  public:
    /// @param vertices the array that the triangles' vertices lie in
    explicit RecordWriter(const point3_t<float>* vertices) : mpoVertices(vertices) { Clear(); }

    void Clear();
    bool IsEmpty() const { return mnTriangles == 0; }
    /// @return false, with nothing changed, if the record has no room for it
    bool Add(const Triangle& triangle);
    std::size_t CountLines() const { return Record::CountLines(CountGroups(), mnVertices); }
    /// Writes what was added. @param rRecord CountLines() lines
    void Write(Record& rRecord) const;

  private:
    using Places = std::array<std::uint8_t, 3>;
    static constexpr unsigned SLOTS = 64;

    unsigned CountGroups() const { return (mnTriangles + 3) / 4; }
    std::uint8_t FindVertex(std::uint32_t id);
    std::uint8_t GetPlace(unsigned vertex) const {
        return static_cast<std::uint8_t>(2 + 3 * (CountGroups() + vertex));
    }

    const point3_t<float>* mpoVertices;
    unsigned mnTriangles;
    unsigned mnVertices;
    std::array<Places, Record::MOST_TRIANGLES> maoTriangles; ///< by number of the vertex
    std::array<std::uint32_t, Record::MOST_ITEMS + 3> manVertices;
    std::array<std::uint8_t, SLOTS> manSlots; ///< 1 + number of a vertex; a table by hash
};

} // namespace kelm::tin::heightgrid
