#pragma once

#include "tin/index/cellframe.h"
#include "tin/index/lines.h"
#include "tin/point.h"

#include <cstdint>
#include <cstring>

namespace kelm::tin::heightgrid {

enum Kind : std::uint8_t {
    KIND_LIST = 0,  ///< triangles, and more of them in the next record
    KIND_FRAME = 1, ///< the cell has a grid of its own
    KIND_CROWD = 2  ///< the cell's triangles are in the crowd
};

/// What is known of one cell, in up to four lines.
///
/// A list holds its vertices once each, and for every four triangles twelve bytes: the places of
/// their first corners, then of the second and of the third, counted in floats from the start of
/// the record. The last four are filled up with the place of the first vertex.
class Record {
  public:
    static constexpr std::size_t BYTES = 256;
    static constexpr std::size_t LINES = BYTES / sizeof(index::Line);
    /// Groups of four triangles and vertices that fit together; both take twelve bytes.
    static constexpr unsigned MOST_ITEMS = (BYTES - 8) / 12;
    /// Triangles are told apart by the bits of a word.
    static constexpr unsigned MOST_TRIANGLES = 64;

    static const Record& At(const index::Line* line) {
        return *reinterpret_cast<const Record*>(line);
    }
    static Record& At(index::Line* line) { return *reinterpret_cast<Record*>(line); }

    /// Lines of a list.
    static std::size_t CountLines(unsigned groups, unsigned vertices) {
        return (8 + 12 * std::size_t{groups + vertices} - 1) / sizeof(index::Line) + 1;
    }

    Kind eKind;
    std::uint8_t nTriangles; ///< of a list
    std::uint16_t nUnused;
    std::uint32_t nNext; ///< line of the next record of a list, or of the cells of a frame; 0: none
    float fValues[3 * MOST_ITEMS + 2];

    index::CellFrame GetFrame() const {
        index::CellFrame frame;
        std::memcpy(&frame, fValues, sizeof frame);
        return frame;
    }
    void SetFrame(const index::CellFrame& frame) { std::memcpy(fValues, &frame, sizeof frame); }

    unsigned GetGroupCount() const { return (nTriangles + 3U) / 4U; }
    /// @return the places of one corner of the four triangles of a group
    const std::uint8_t* GetPlaces(unsigned group, unsigned corner) const {
        return reinterpret_cast<const std::uint8_t*>(this) + 8 + 12 * group + 4 * corner;
    }
    const float* GetValues(std::uint8_t place) const {
        return reinterpret_cast<const float*>(this) + place;
    }
    point3_t<float> GetVertex(unsigned triangle, unsigned corner) const {
        const float* values = GetValues(GetPlaces(triangle / 4, corner)[triangle % 4]);
        return {values[0], values[1], values[2]};
    }
};

static_assert(sizeof(Record) == Record::BYTES, "a cell has its record at its number");

} // namespace kelm::tin::heightgrid
