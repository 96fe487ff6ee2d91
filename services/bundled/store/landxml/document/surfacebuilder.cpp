#include "services/bundled/store/landxml/document/surfacebuilder.h"

#include "services/bundled/store/landxml/document/diagonal.h"
#include "services/bundled/store/landxml/xml/numberlist.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace kelm::store::landxml {

namespace {

constexpr const char* SOURCE = "services/bundled/store/landxml/document/surfacebuilder";

/// So many that ten times the number of a face, plus one, is an int.
constexpr std::int64_t MOST_RECORDS = std::numeric_limits<int>::max() / 10 - 1;

void TestCount(std::int64_t count, const char* what, const std::string& subject) {
    if (count > MOST_RECORDS)
        throw DataException(FormatString("The %s has more than %lld %s", subject.c_str(),
                                         static_cast<long long>(MOST_RECORDS), what),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
}

/// @return true, with the position, if the text is northing, easting and elevation
bool ReadPosition(std::string_view text, ZARVertex& position) {
    std::array<double, 3> numbers;
    if (ReadNumbers(text, numbers) != 3)
        return false;
    position = {numbers[1], numbers[0], numbers[2]};
    return std::isfinite(position.x) && std::isfinite(position.y) && std::isfinite(position.z);
}

/// Some writers give triangles a fourth corner that repeats one beside it.
/// @return the number of corners without the repetition
template <class Corners>
int DropRepeated(Corners& corners, int count) {
    for (std::size_t n = 0; count == 4 && n < 4; ++n)
        if (corners[n] == corners[(n + 1) % 4]) {
            std::copy(corners.begin() + n + 1, corners.end(), corners.begin() + n);
            count = 3;
        }
    return count;
}

} // namespace

void SurfaceBuilder::AddPoint(const char* number, std::string_view text, std::uint64_t line) {
    TestCount(++mnPoints, "points", GetSubject());
    std::array<std::uint32_t, 1> id;
    ZARVertex position;
    if (number == nullptr || ReadNumbers(number, id) != 1)
        moLog.Add("point record", mnPoints, line, "its id is missing or no point number");
    else if (!ReadPosition(text, position))
        moLog.Add("point", id[0], line, "it is not three numbers: northing, easting, elevation");
    else
        moPoints.Add(id[0], position);
}

void SurfaceBuilder::AddFace(std::string_view text, bool invisible, std::uint64_t line) {
    TestCount(++mnFaces, "faces", GetSubject());
    mnInvisible += invisible;
    if (invisible)
        return;
    Corners corners;
    const int count = DropRepeated(corners, ReadNumbers(text, corners));
    if (count < 3)
        moLog.Add("face", mnFaces, line, "it is not three or four point numbers");
    else
        AddCorners(corners, count, line);
}

void SurfaceBuilder::AddCorners(const Corners& corners, int count, std::uint64_t line) {
    constexpr std::uint64_t LAST_LINE = std::numeric_limits<std::uint32_t>::max();
    const auto key = static_cast<std::uint32_t>(mnFaces * 2);
    moFacets.push_back({{corners[0], corners[1], corners[2]}, key});
    if (count == 4)
        moFacets.push_back({{corners[2], corners[3], corners[0]}, key + 1});
    moLines.resize(moFacets.size(), static_cast<std::uint32_t>(std::min(line, LAST_LINE)));
}

Surface SurfaceBuilder::Finish() {
    moPoints.Sort();
    std::size_t kept = 0;
    for (std::size_t facet = 0; facet < moFacets.size();) {
        const bool cut = facet + 1 < moFacets.size() && moFacets[facet + 1].mnKey % 2 == 1;
        const std::size_t end = facet + (cut ? 2 : 1);
        if (FinishFace(facet, cut ? 4 : 3))
            for (std::size_t from = facet; from < end; ++from)
                moFacets[kept++] = moFacets[from];
        facet = end;
    }
    moFacets.resize(kept);
    moLog.Finish();
    Surface surface(GetSubject(), moPoints.TakePositions(), std::move(moFacets));
    ReportCounts(surface);
    return surface;
}

/// @param facet the first of a face. @return false if the face is to be left out
bool SurfaceBuilder::FinishFace(std::size_t facet, std::size_t count) {
    const Facet& first = moFacets[facet];
    Corners corners{first.mnCorners[0], first.mnCorners[1], first.mnCorners[2], 0};
    if (count == 4)
        corners[3] = moFacets[facet + 1].mnCorners[1];
    const std::string fault = Resolve(corners, count);
    if (!fault.empty())
        moLog.Add("face", first.mnKey / 2, moLines[facet], fault);
    else if (count == 4)
        return Cut(facet, corners);
    else
        std::copy_n(corners.begin(), 3, moFacets[facet].mnCorners);
    return fault.empty();
}

/// Replaces the numbers of points by indices. @return what is wrong with them, or empty
std::string SurfaceBuilder::Resolve(Corners& corners, std::size_t count) const {
    const auto end = corners.begin() + static_cast<std::ptrdiff_t>(count);
    for (auto corner = corners.begin(); corner != end; ++corner) {
        const std::uint32_t number = *corner, index = moPoints.Find(number);
        if (index == PointTable::UNKNOWN)
            return FormatString("it names point %u, which the surface does not have", number);
        if (index == PointTable::AMBIGUOUS)
            return FormatString("it names point %u, which the surface has at several places",
                                number);
        if (std::find(corners.begin(), corner, index) != corner)
            return FormatString("it names point %u twice", number);
        *corner = index;
    }
    return {};
}

/// Cuts a face of four corners. @return false, with a warning, if it cannot be cut
bool SurfaceBuilder::Cut(std::size_t facet, const Corners& corners) {
    const auto [a, b, c, d] = corners;
    const std::vector<ZARVertex>& points = moPoints.GetPositions();
    const Diagonal diagonal = ChooseDiagonal(points[a], points[b], points[c], points[d]);
    if (diagonal == Diagonal::None) {
        moLog.Add("face", moFacets[facet].mnKey / 2, moLines[facet], "it crosses itself");
        return false;
    }
    const bool third = diagonal == Diagonal::FirstToThird;
    const std::uint32_t key = moFacets[facet].mnKey;
    moFacets[facet] = {{a, b, third ? c : d}, key};
    moFacets[facet + 1] = {{third ? a : b, c, d}, key + 1};
    return true;
}

void SurfaceBuilder::ReportCounts(const Surface& surface) const {
    if (mnInvisible > 0)
        tellus::Report::AddInfo(
            FormatString("The %s: %lld of %lld faces are invisible, left out", GetSubject().c_str(),
                         static_cast<long long>(mnInvisible), static_cast<long long>(mnFaces)));
    if (surface.GetFactor() > 1)
        tellus::Report::AddInfo(FormatString("The %s: shape id = number of the face x %d + number "
                                             "of the triangle in the face, from 0",
                                             GetSubject().c_str(), surface.GetFactor()));
}

} // namespace kelm::store::landxml
