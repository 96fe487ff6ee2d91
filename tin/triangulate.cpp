#include "tin/triangulate.h"

#include <cstddef>

namespace {

using Point = point2_t<double>;

/// Least turn of an ear, 2^-23: twice its area, in squared map units.
constexpr double LEAST_TURN = 1.1920928955078125e-7;

/// Twice the signed area of P, Q, T.
double GetTurn(const Point& p, const Point& q, const Point& t) {
    return (q.x - p.x) * (t.y - p.y) - (t.x - p.x) * (q.y - p.y);
}

/// Edges and corners are inside, without tolerance.
bool IsInsideTriangle(const Point& p, const Point& q, const Point& r, const Point& t) {
    return !(GetTurn(p, q, t) < 0.0) && !(GetTurn(q, r, t) < 0.0) && !(GetTurn(r, p, t) < 0.0);
}

/// The corners that are left to clip, counter-clockwise.
class Ring {
  public:
    explicit Ring(const kelm::tin::Polygon<double>& oPolygon)
        : mpoPoints(oPolygon.GetPoints()), moCorners(oPolygon.GetPointCount()) {
        const auto n = static_cast<unsigned>(moCorners.size());
        const bool counterClockwise = oPolygon.GetSignedArea() > 0.0;
        for (unsigned i = 0; i < n; ++i)
            moCorners[i] = counterClockwise ? i : n - 1 - i;
    }

    std::size_t GetSize() const { return moCorners.size(); }
    unsigned GetCorner(std::size_t position) const { return moCorners[position]; }
    void Remove(std::size_t position) {
        moCorners.erase(moCorners.begin() + static_cast<std::ptrdiff_t>(position));
    }

    /// Is the corner at v one that can be cut off between those at u and w? Another corner in the
    /// triangle forbids it, also one at the place of u, v or w: the test goes by position.
    bool IsEar(std::size_t u, std::size_t v, std::size_t w) const {
        const Point& p = At(u);
        const Point& q = At(v);
        const Point& r = At(w);
        if (LEAST_TURN > (q.x - p.x) * (r.y - p.y) - (q.y - p.y) * (r.x - p.x))
            return false;
        for (std::size_t i = 0; i < moCorners.size(); ++i)
            if (i != u && i != v && i != w && IsInsideTriangle(p, q, r, At(i)))
                return false;
        return true;
    }

  private:
    const Point& At(std::size_t position) const { return mpoPoints[moCorners[position]]; }

    const Point* mpoPoints;
    std::vector<unsigned> moCorners;
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
