#include "tin/triangulate.h"

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

/// Is a point of first .. last-1 inside the triangle P, Q, R? Edges and corners are inside, without
/// tolerance. Points are taken in blocks without a branch.
bool TestAnyInside(const Point& p, const Point& q, const Point& r, const Coordinates& points,
                   std::size_t first, std::size_t last) {
    constexpr std::size_t BLOCK = 64;
    const double* const x = points.x.data();
    const double* const y = points.y.data();
    while (first < last) {
        const std::size_t end = std::min(last, first + BLOCK);
        double inside = 0.0; // counted in double, for want of integer lanes of its width
#pragma omp simd reduction(+ : inside)
        for (std::size_t i = first; i < end; ++i) {
            const double pq = (q.x - p.x) * (y[i] - p.y) - (x[i] - p.x) * (q.y - p.y);
            const double qr = (r.x - q.x) * (y[i] - q.y) - (x[i] - q.x) * (r.y - q.y);
            const double rp = (p.x - r.x) * (y[i] - r.y) - (x[i] - r.x) * (p.y - r.y);
            inside += !(pq < 0.0) & !(qr < 0.0) & !(rp < 0.0) ? 1.0 : 0.0;
        }
        if (inside != 0.0)
            return true;
        first = end;
    }
    return false;
}

/// The corners that are left to clip, counter-clockwise.
class Ring {
  public:
    explicit Ring(const kelm::tin::Polygon<double>& oPolygon) {
        const unsigned n = oPolygon.GetPointCount();
        const bool counterClockwise = oPolygon.GetSignedArea() > 0.0;
        moCorners.resize(n);
        moAt.x.resize(n);
        moAt.y.resize(n);
        for (unsigned i = 0; i < n; ++i) {
            moCorners[i] = counterClockwise ? i : n - 1 - i;
            moAt.x[i] = oPolygon.GetPoints()[moCorners[i]].x;
            moAt.y[i] = oPolygon.GetPoints()[moCorners[i]].y;
        }
    }

    std::size_t GetSize() const { return moCorners.size(); }
    unsigned GetCorner(std::size_t position) const { return moCorners[position]; }

    void Remove(std::size_t position) {
        const auto at = static_cast<std::ptrdiff_t>(position);
        moCorners.erase(moCorners.begin() + at);
        moAt.x.erase(moAt.x.begin() + at);
        moAt.y.erase(moAt.y.begin() + at);
    }

    /// Is the corner at v one that can be cut off between its neighbours at u and w? Another corner
    /// in the triangle forbids it, also one at the place of u, v or w: the test goes by position.
    bool IsEar(std::size_t u, std::size_t v, std::size_t w) const {
        const Point p = At(u);
        const Point q = At(v);
        const Point r = At(w);
        if (LEAST_TURN > (q.x - p.x) * (r.y - p.y) - (q.y - p.y) * (r.x - p.x))
            return false;
        // The three are neighbours, so the others stand in one run of the ring, or in two of the
        // list.
        if (u < w)
            return !TestAnyInside(p, q, r, moAt, w + 1, GetSize()) &&
                   !TestAnyInside(p, q, r, moAt, 0, u);
        return !TestAnyInside(p, q, r, moAt, w + 1, u);
    }

  private:
    Point At(std::size_t position) const { return {moAt.x[position], moAt.y[position]}; }

    std::vector<unsigned> moCorners;
    Coordinates moAt; ///< of the corners, in the same order
};

} // namespace

int Triangulate(const kelm::tin::Polygon<double>& oPolygon, std::vector<Triangle_Id>& oTriangles) {
    if (!oPolygon.IsSimple() || oPolygon.GetPointCount() < 3)
        return -1;
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
