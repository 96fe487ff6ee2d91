#include "tin/heightgrid/recordwriter.h"

namespace kelm::tin::heightgrid {

void RecordWriter::Clear() {
    mnTriangles = 0;
    mnVertices = 0;
    manSlots.fill(0);
}

/// Adds the vertex if it is new.
std::uint8_t RecordWriter::FindVertex(std::uint32_t id) {
    unsigned slot = id * 0x9E3779B1U >> 26;
    for (; manSlots[slot] != 0; slot = (slot + 1) % SLOTS)
        if (manVertices[manSlots[slot] - 1U] == id)
            return static_cast<std::uint8_t>(manSlots[slot] - 1);
    manVertices[mnVertices] = id;
    manSlots[slot] = static_cast<std::uint8_t>(++mnVertices);
    return static_cast<std::uint8_t>(mnVertices - 1);
}

bool RecordWriter::Add(const Triangle& triangle) {
    if (mnTriangles == Record::MOST_TRIANGLES)
        return false;
    const unsigned before = mnVertices;
    Places places;
    for (unsigned corner = 0; corner < 3; ++corner)
        places[corner] = FindVertex(
            static_cast<std::uint32_t>(triangle.GetVertex(static_cast<int>(corner)) - mpoVertices));
    maoTriangles[mnTriangles++] = places;
    if (CountGroups() + mnVertices <= Record::MOST_ITEMS)
        return true;
    // The slots of the vertices that are given up are of no use to a full record.
    --mnTriangles;
    mnVertices = before;
    return false;
}

void RecordWriter::Write(Record& rRecord) const {
    std::memset(&rRecord, 0, CountLines() * sizeof(index::Line));
    rRecord.nTriangles = static_cast<std::uint8_t>(mnTriangles);
    auto* places = reinterpret_cast<std::uint8_t*>(rRecord.fValues);
    std::memset(places, GetPlace(0), 12 * std::size_t{CountGroups()});
    for (unsigned i = 0; i < mnTriangles; ++i)
        for (unsigned corner = 0; corner < 3; ++corner)
            places[12 * (i / 4) + 4 * corner + i % 4] = GetPlace(maoTriangles[i][corner]);
    float* values = rRecord.fValues + 3 * CountGroups();
    for (unsigned i = 0; i < mnVertices; ++i)
        std::memcpy(values + 3 * i, mpoVertices + manVertices[i], sizeof(point3_t<float>));
}

} // namespace kelm::tin::heightgrid
