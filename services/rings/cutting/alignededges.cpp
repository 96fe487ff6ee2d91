#include "services/rings/cutting/alignededges.h"

#include "services/rings/box.h"

#include <algorithm>
#include <vector>

namespace kelm::rings {

namespace {

/// Directions that differ by more, as places on the square around the origin, are not nearly
/// parallel.
constexpr double MOST_TURN = 0x1p-42;

struct Direction {
    double turn;     ///< place on half the square around the origin, from -1 up to 3
    unsigned number; ///< of the edge
};

struct Line {
    double offset;
    unsigned kind; ///< edges of one kind are exactly parallel
    unsigned number;
};

Point GetEdge(const Point* points, unsigned number) {
    const Point& a = points[number];
    const Point& b = points[number + 1];
    return {b.x - a.x, b.y - a.y};
}

double GetTurn(const Point& r) {
    return std::fabs(r.x) >= std::fabs(r.y) ? r.y / r.x : 2.0 - r.x / r.y;
}

/// Compares products without rounding. Such edges have a computed product of zero.
bool TestParallel(const Point& r, const Point& q) {
    const double left = r.x * q.y;
    const double right = r.y * q.x;
    return left == right && std::fma(r.x, q.y, -left) == std::fma(r.y, q.x, -right);
}

class AlignedEdges {
  public:
    AlignedEdges(const Point* points, unsigned edges, StepLimit& rLimit)
        : mpoPoints(points), moLimit(rLimit) {
        moDirections.reserve(edges);
        Box box;
        for (unsigned i = 0; i < edges; ++i) {
            moDirections.push_back({GetTurn(GetEdge(points, i)), i});
            box.Add(points[i]);
        }
        box.Add(points[edges]);
        mdfSize = std::max(box.GetSize().x, box.GetSize().y);
        CloseCircle();
        std::sort(moDirections.begin(), moDirections.end(),
                  [](const Direction& a, const Direction& b) { return a.turn < b.turn; });
    }

    /// A bundle is all directions within MOST_TURN of its first, and those within MOST_TURN of the
    /// next one. So all pairs that are nearly parallel are in one, and no bundle is wide.
    bool TestMeet() {
        for (std::size_t first = 0, next = 0; first < moDirections.size(); first = next) {
            next = FindBeyond(first, moDirections[first].turn);
            const bool isLast = next == moDirections.size() ||
                                moDirections[next].turn - moDirections[next - 1].turn > MOST_TURN;
            const std::size_t last = isLast ? next : FindBeyond(next, moDirections[next].turn);
            if (TestBundle(first, last))
                return true;
        }
        return false;
    }

  private:
    /// Repeats the first directions behind the last ones, to which they are next.
    void CloseCircle() {
        for (std::size_t i = 0, n = moDirections.size(); i < n; ++i)
            if (const Direction d = moDirections[i]; d.turn <= -1.0 + MOST_TURN)
                moDirections.push_back({d.turn + 4.0, d.number});
    }

    /// @return the first place from one on whose direction is not within MOST_TURN
    std::size_t FindBeyond(std::size_t place, double turn) const {
        while (place < moDirections.size() && moDirections[place].turn - turn <= MOST_TURN)
            ++place;
        return place;
    }

    /// Do two edges of a bundle meet?
    bool TestBundle(std::size_t first, std::size_t last) {
        if (last - first < 2 || !SortLines(first, last))
            return false;
        const double spread = moDirections[last - 1].turn - moDirections[first].turn;
        const double reach = 2.0 * (MOST_TURN + spread) * mdfSize;
        for (std::size_t i = 0; i < moLines.size() && !moLimit.IsReached(); ++i)
            if (TestLine(i, reach))
                return true;
        return false;
    }

    /// Lists the edges of a bundle by their distance from a line of its direction.
    /// @return false if all are exactly parallel
    bool SortLines(std::size_t first, std::size_t last) {
        const Point r = GetEdge(mpoPoints, moDirections[first].number);
        const double size = std::max(std::fabs(r.x), std::fabs(r.y));
        const Point along{r.x / size, r.y / size};
        moLines.clear();
        unsigned kind = 0;
        for (std::size_t i = first; i < last; ++i) {
            const unsigned number = moDirections[i].number;
            const Point& p = mpoPoints[number];
            const double offset =
                along.x * (p.y - mpoPoints[0].y) - along.y * (p.x - mpoPoints[0].x);
            kind += i > first && !IsParallelToPrevious(i) ? 1U : 0U;
            moLines.push_back({offset, kind, number});
        }
        if (kind == 0)
            return false;
        std::sort(moLines.begin(), moLines.end(), [](const Line& a, const Line& b) {
            return a.offset < b.offset || (a.offset == b.offset && a.kind < b.kind);
        });
        FindNextKinds();
        return true;
    }

    bool IsParallelToPrevious(std::size_t i) const {
        return TestParallel(GetEdge(mpoPoints, moDirections[i - 1].number),
                            GetEdge(mpoPoints, moDirections[i].number));
    }

    /// For each line the next one of another kind.
    void FindNextKinds() {
        moNext.resize(moLines.size());
        for (std::size_t i = moLines.size(); i-- > 0;)
            moNext[i] = i + 1 < moLines.size() && moLines[i].kind == moLines[i + 1].kind
                            ? moNext[i + 1]
                            : i + 1;
    }

    /// Does the edge meet one further on in the list, at most `reach` away?
    bool TestLine(std::size_t i, double reach) {
        const Line& line = moLines[i];
        std::size_t j = moNext[i];
        while (j < moLines.size() && moLines[j].offset - line.offset <= reach) {
            moLimit.Count(1);
            if (moLines[j].kind == line.kind)
                j = moNext[j];
            else if (TestPair(line.number, moLines[j++].number))
                return true;
        }
        return false;
    }

    bool TestPair(unsigned i, unsigned j) const {
        return i - j + 1U > 2U &&
               TestMeeting(mpoPoints[i], GetEdge(mpoPoints, i), mpoPoints[j], mpoPoints[j + 1]);
    }

    const Point* mpoPoints;
    StepLimit& moLimit;
    double mdfSize;
    std::vector<Direction> moDirections;
    std::vector<Line> moLines; ///< of one bundle
    std::vector<std::size_t> moNext;
};

} // namespace

bool TestAlignedMeet(const Point* points, unsigned edges, StepLimit& rLimit) {
    return AlignedEdges(points, edges, rLimit).TestMeet();
}

} // namespace kelm::rings
