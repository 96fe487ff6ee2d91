#include "recordingservices.h"
#include "surfaces.h"

#include <tin/aabbtree.h>

#include <algorithm>
#include <memory>
#include <utility>

namespace digest {

namespace {

using kelm::tin::AabbTree;
using kelm::tin::BBox;
using kelm::tin::Triangle;
using Point2 = point2_t<float>;
using Ids = std::vector<unsigned>;

struct OpenTin : Tin {
    explicit OpenTin(const Tin& tin) : Tin(tin) {}
    using Tin::FindTrianglesByLine, Tin::FindTrianglesByPoint, Tin::FindTrianglesByRegion;
    using Tin::Subset;
};

point2_t<double> ToMap(const Tin& tin, Point2 p) {
    double x;
    double y;
    tin.GetXYBase(x, y);
    return {x + static_cast<double>(p.x), y + static_cast<double>(p.y)};
}

template <typename T, typename P>
BBox<T, P> MakeBox(P a, P b) {
    BBox<T, P> box;
    box.min = {std::min(a.x, b.x), std::min(a.y, b.y)};
    box.max = {std::max(a.x, b.x), std::max(a.y, b.y)};
    return box;
}

/// Adds all that a surface shows: base and box, vertices and boxes, triangles by vertex number.
void AddSurface(const Tin& tin, Digest& digest) {
    BBox<double, point3_t<double>> box;
    tin.GetRawBBox(box);
    const point2_t<double> base = ToMap(tin, {0, 0});
    digest.AddList<double>({base.x, base.y, box.min.x, box.min.y, box.min.z, box.max.x, box.max.y,
                            box.max.z, static_cast<double>(tin.GetObjBytes())});
    for (unsigned i = 0; i < tin.GetVertexCount(); ++i)
        digest.Add(*tin.GetVertex(i));
    for (unsigned i = 0; i < tin.GetTriangleCount(); ++i) {
        for (int k = 0; k < 3; ++k)
            digest.Add(tin.GetTriangle(i)->GetVertex(k) - tin.GetVertex(0));
        digest.Add(tin.GetTriangle(i)->GetBBox().min);
        digest.Add(tin.GetTriangle(i)->GetBBox().max);
    }
}

/// Releases a subset, which is asked for a height first.
void AddSubset(const Tin* poSubset, Point2 p, Digest& digest) {
    const std::unique_ptr<const Tin> subset(poSubset);
    if (subset == nullptr)
        return digest.AddAnswer(false, 0);
    AddSurface(*subset, digest);
    const point2_t<double> at = ToMap(*subset, p);
    float height = UNTOUCHED;
    const bool found = subset->GetHeight(at.x, at.y, height, nullptr);
    digest.AddAnswer(found, height);
}

/// Questions between two positions; `turn` chooses among their kinds.
struct Question {
    const OpenTin& tin;
    const AabbTree* tree;
    unsigned turn;
    Point2 p;
    Point2 q;
    Digest& digest;

    /// A segment from near or far, vertical, or along an axis, in both frames.
    void AskCrossing() const {
        const Point2 ends[] = {q, p, {q.x, p.y}, {p.x, q.y}, GetNear()};
        const Point2 end = ends[turn % 5];
        const float low = static_cast<float>(150 + turn % 101);
        const point3_t<float> a{p.x, p.y, 240};
        const point3_t<float> b{end.x, end.y, low};
        const point2_t<double> from = ToMap(tin, p);
        const point2_t<double> to = ToMap(tin, end);
        float height = UNTOUCHED;
        const bool found =
            turn / 5 % 2 == 0
                ? tin.GetLineIntersectHeight(a, b, height, tree)
                : tin.GetLineIntersectHeight(point3_t<double>{from.x, from.y, 240},
                                             {to.x, to.y, static_cast<double>(low)}, height, tree);
        digest.AddAnswer(found, height);
        Ids touched;
        tin.FindTrianglesByLine(a, b, touched, tree);
        digest.AddList(touched);
    }

    void AskSubsets() const {
        Ids lists[2];
        tin.FindTrianglesByPoint(p.x, p.y, lists[0], tree);
        tin.FindTrianglesByRegion(MakeBox<float>(p, q), lists[1], tree);
        const point2_t<double> map[] = {ToMap(tin, p), ToMap(tin, q), ToMap(tin, {q.x, p.y})};
        const Point2 local[] = {p, q, GetNear(), p};
        const auto region = MakeBox<double>(map[0], ToMap(tin, GetNear()));
        AddSubset(tin.SubsetByRegion(region, tree), p, digest);
        AddSubset(tin.SubsetByRegion(MakeBox<float>(p, GetNear()), tree), p, digest);
        AddSubset(tin.SubsetByLineString(map, turn % 4, tree), q, digest);
        AddSubset(tin.SubsetByLineString(local, turn % 5, tree), p, digest);
        std::vector<unsigned char> mask;
        for (unsigned i = 0; i < turn % 500; ++i) {
            lists[0].push_back((i * (turn | 1u) * 7919u) % tin.GetTriangleCount());
            mask.push_back(static_cast<unsigned char>(lists[0].back() % 3));
        }
        AddSubset(tin.Subset(lists[0]), p, digest);
        AddSubset(tin.Subset(mask), q, digest);
        digest.AddList(lists[1]);
    }

    /// Walks the grid cells of a triangle, in lists that may hold something already.
    void AskGrid() const {
        const Triangle& triangle = *tin.GetTriangle(turn % tin.GetTriangleCount());
        const int cols = static_cast<int>(turn % 350);
        const int rows = static_cast<int>(turn % 340);
        std::vector<int> cells(2 * (turn % 2), 7);
        std::vector<float> heights;
        digest.Add(triangle.GetGridPoints(cols, rows, cells, heights));
        digest.AddList(cells);
        digest.AddList(heights);
        cells.resize(2 * std::size_t{triangle.GetGridPointsNum(cols, rows)});
        digest.Add(triangle.GetGridPointsCR(cells.data(), cols, rows));
        digest.AddList(cells);
        digest.Add(triangle.IsIntersected(*tin.GetTriangle((turn + 9) % tin.GetTriangleCount())));
    }

    Point2 GetNear() const { return {p.x * 0.875f + q.x * 0.125f, p.y * 0.875f + q.y * 0.125f}; }
};

/// Builds a tree and adds its nodes and the order of its leaves.
void BuildTree(const Tin& tin, unsigned turn, AabbTree& tree, Digest& digest) {
    tree.GetInfo()->SetDivisionType(kelm::tin::DivisionType(turn % 2));
    tree.SetCapacity(static_cast<int>(turn % 7));
    tree.CreateTree(&tin);
    Ids leaves;
    tree.FindLeaves(MakeBox<float>(Point2{-1e9f, -1e9f}, Point2{1e9f, 1e9f}), leaves);
    digest.AddList(leaves);
    digest.AddList<std::uint64_t>({tree.GetNodeCount(), tree.GetCapacity(), tree.GetObjBytes()});
}

/// Asks a copy, a moved surface and one that was assigned, in turn.
void AskSheet(unsigned cells, double xBase, double yBase, Digest& digest) {
    Random random;
    Tin made = MakeSheet(cells, xBase, yBase, random);
    const Tin copy(made);
    const Tin moved(std::move(made));
    Tin assigned = MakeSheet(2, 1, 2, random);
    assigned = moved;
    const OpenTin forms[] = {OpenTin(copy), OpenTin(moved), OpenTin(assigned)};
    AabbTree tree;
    for (unsigned i = 0; i < 4000; ++i) {
        const OpenTin& tin = forms[i % 3];
        if (i % 1000 == 0) {
            AddSurface(tin, digest);
            BuildTree(tin, i / 1000, tree, digest);
        }
        const AabbTree* const index = cells < 50 && i % 4 == 0 ? nullptr : &tree;
        const Question question{tin,
                                index,
                                random.Below(1u << 20),
                                MakePosition(tin, random),
                                MakePosition(tin, random),
                                digest};
        question.AskCrossing();
        question.AskGrid();
        if (i % 16 < 2)
            question.AskSubsets();
    }
}

} // namespace

Digest AskEverything() {
    Digest digest;
    std::string transcript;
    Recording::poTranscript = &transcript;
    AskSheet(32, 500000.37, 4649776.81, digest);
    AskSheet(120, -0.1, 1e7 / 3, digest);
    Recording::poTranscript = nullptr;
    digest.AddList<char>({transcript.begin(), transcript.end()});
    return digest;
}

} // namespace digest
