#include "tin/triangulate.h"

#include "tin/rings/earcutter.h"

#include <algorithm>
#include <cstddef>

namespace {

using Point = point2_t<double>;

/// Least turn of an ear, 2^-23: twice its area, in squared map units.
constexpr double LEAST_TURN = 1.1920928955078125e-7;

/// Points whose coordinates stand in two arrays, so that a loop tests several at once.
struct Coordinates {
    std::vector<double> x;
    std::vector<double> y;
};

/// Is the point inside the triangle P, Q, R? Edges and corners are inside, without tolerance.
inline bool IsInside(const Point& p, const Point& q, const Point& r, double x, double y) {
    const double pq = (q.x - p.x) * (y - p.y) - (x - p.x) * (q.y - p.y);
    const double qr = (r.x - q.x) * (y - q.y) - (x - q.x) * (r.y - q.y);
    const double rp = (p.x - r.x) * (y - r.y) - (x - r.x) * (p.y - r.y);
    return !(pq < 0.0) & !(qr < 0.0) & !(rp < 0.0);
}

/// @return position of the first point of first .. last-1 inside the triangle P, Q, R; last if
/// there is none. Points are taken in blocks without a branch.
std::size_t FindInside(const Point& p, const Point& q, const Point& r, const Coordinates& points,
                       std::size_t first, std::size_t last) {
    constexpr std::size_t BLOCK = 64;
    const double* const x = points.x.data();
    const double* const y = points.y.data();
    while (first < last) {
        const std::size_t end = std::min(last, first + BLOCK);
        double inside = 0.0; // counted in double, for want of integer lanes of its width
#pragma omp simd reduction(+ : inside)
        for (std::size_t i = first; i < end; ++i)
            inside += IsInside(p, q, r, x[i], y[i]) ? 1.0 : 0.0;
        if (inside != 0.0)
            break;
        first = end;
    }
    while (first < last && !IsInside(p, q, r, x[first], y[first]))
        ++first;
    return first;
}

/// The corners that are left to clip, counter-clockwise.
class Ring {
  public:
    explicit Ring(const kelm::tin::Polygon<double>& oPolygon)
        : mnPoints(oPolygon.GetPointCount()), mbForward(oPolygon.GetSignedArea() > 0.0),
          moRanks(mnPoints), moAt{std::vector<double>(mnPoints), std::vector<double>(mnPoints)},
          moBlockers(mnPoints, NONE) {
        for (unsigned i = 0; i < mnPoints; ++i) {
            moRanks[i] = i;
            moAt.x[i] = oPolygon.GetPoints()[GetCorner(i)].x;
            moAt.y[i] = oPolygon.GetPoints()[GetCorner(i)].y;
        }
    }

    std::size_t GetSize() const { return moRanks.size(); }
    unsigned GetCorner(std::size_t position) const {
        return mbForward ? moRanks[position] : mnPoints - 1 - moRanks[position];
    }

    void Remove(std::size_t position) {
        const std::size_t n = GetSize();
        moBlockers[moRanks[position == 0 ? n - 1 : position - 1]] = NONE;
        moBlockers[moRanks[position + 1 == n ? 0 : position + 1]] = NONE;
        const auto at = static_cast<std::ptrdiff_t>(position);
        moRanks.erase(moRanks.begin() + at);
        moAt.x.erase(moAt.x.begin() + at);
        moAt.y.erase(moAt.y.begin() + at);
    }

    /// Is the corner at v one that can be cut off between its neighbours at u and w? Another corner
    /// in the triangle forbids it, also one at the place of u, v or w: the test goes by position.
    ///
    /// As long as the three are neighbours, corners only go. So one that was found inside forbids
    /// the ear until it goes itself, and those passed over on the way to it need no second look.
    /// That keeps the whole cutting quadratic in the corners.
    bool IsEar(std::size_t u, std::size_t v, std::size_t w) {
        const Point p = At(u);
        const Point q = At(v);
        const Point r = At(w);
        if (LEAST_TURN > (q.x - p.x) * (r.y - p.y) - (q.y - p.y) * (r.x - p.x))
            return false;
        unsigned& blocker = moBlockers[moRanks[v]];
        std::size_t at = w + 1;
        if (blocker != NONE) {
            at = static_cast<std::size_t>(
                std::lower_bound(moRanks.begin(), moRanks.end(), blocker) - moRanks.begin());
            if (at < GetSize() && moRanks[at] == blocker)
                return false;
        }
        at = FindBlocker(p, q, r, at, u);
        if (at == u)
            return true;
        blocker = moRanks[at];
        return false;
    }

  private:
    static constexpr unsigned NONE = 0xFFFFFFFFU;

    Point At(std::size_t position) const { return {moAt.x[position], moAt.y[position]}; }

    /// @return position of the first corner inside the triangle, in ring order from one position
    /// up to u; u if there is none
    std::size_t FindBlocker(const Point& p, const Point& q, const Point& r, std::size_t from,
                            std::size_t u) const {
        if (from > u) {
            const std::size_t at = FindInside(p, q, r, moAt, from, GetSize());
            if (at != GetSize())
                return at;
            from = 0;
        }
        return FindInside(p, q, r, moAt, from, u);
    }

    unsigned mnPoints;
    bool mbForward;
    std::vector<unsigned> moRanks;    ///< places in the whole ring, ascending
    Coordinates moAt;                 ///< of the corners, in the same order
    std::vector<unsigned> moBlockers; ///< by rank of the tip: rank of a corner inside its ear
};

} // namespace

int Triangulate(const kelm::tin::Polygon<double>& oPolygon, std::vector<Triangle_Id>& oTriangles) {
    if (!oPolygon.IsSimple() || oPolygon.GetPointCount() < 3)
        return -1;
    if (oPolygon.GetPointCount() > 256) {
        kelm::tin::rings::EarCutter c(oPolygon.GetPoints(), oPolygon.GetPointCount(),
                                      oPolygon.GetSignedArea() > 0.0);
        const bool done = c.Cut(oTriangles);
        if (!done)
            oTriangles.clear();
        return done ? 0 : -1;
    }
    Ring ring(oPolygon);
    std::size_t budget = 2 * ring.GetSize();
    std::size_t v = ring.GetSize() - 1;
    while (ring.GetSize() > 2) {
        if (budget == 0) {
            oTriangles.clear();
            return -1;
        }
        --budget;
        const std::size_t n = ring.GetSize();
        const std::size_t u = n <= v ? 0 : v;
        v = n <= u + 1 ? 0 : u + 1;
        const std::size_t w = n <= v + 1 ? 0 : v + 1;
        if (!ring.IsEar(u, v, w))
            continue;
        oTriangles.push_back({ring.GetCorner(u), ring.GetCorner(v), ring.GetCorner(w)});
        ring.Remove(v);
        budget = 2 * ring.GetSize();
    }
    return 0;
}
