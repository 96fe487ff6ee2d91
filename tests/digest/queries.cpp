#include "digest.h"

#include "tests/support/sheets.h"

namespace {

using namespace kelm::tin;
using namespace kelm::tin::test;
using MapPoint = point2_t<double>;

MapPoint ToMap(const Tin& tin, Point2 p) {
    double x, y;
    tin.GetXYBase(x, y);
    return {x + static_cast<double>(p.x), y + static_cast<double>(p.y)};
}

/// The box of two points, now and then as it comes, inverted on an axis.
template <typename P>
auto MakeRegion(const P& a, const P& b, unsigned turn) {
    return turn % 9 == 0 ? MakeBox(a, b)
                         : MakeBox(P{std::min(a.x, b.x), std::min(a.y, b.y)},
                                   P{std::max(a.x, b.x), std::max(a.y, b.y)});
}

/// Adds all that a surface shows: base and box, vertices and boxes, triangles by vertex number.
void AddSurface(const Tin& tin, Digest& digest) {
    BBox<double, point3_t<double>> box;
    tin.GetRawBBox(box);
    digest.Add(ToMap(tin, {0, 0}));
    for (const point3_t<double>& corner : {box.min, box.max})
        digest.Add(corner);
    for (unsigned i = 0; i < tin.GetVertexCount(); ++i)
        digest.Add(*tin.GetVertex(i));
    for (unsigned i = 0; i < 3 * tin.GetTriangleCount(); ++i) {
        const Triangle& triangle = *tin.GetTriangle(i / 3);
        digest.Add(triangle.GetVertex(static_cast<int>(i % 3)) - tin.GetVertex(0));
        for (const Point2& corner : {triangle.GetBBox().min, triangle.GetBBox().max})
            digest.Add(corner);
    }
}

/// Releases a subset, which is asked for a height first.
void AddSubset(const Tin* poSubset, Point2 p, Digest& digest) {
    const std::unique_ptr<const Tin> subset(poSubset);
    float height = UNTOUCHED;
    const MapPoint at = subset ? ToMap(*subset, p) : MapPoint{};
    const bool found = subset && subset->GetHeight(at.x, at.y, height, nullptr);
    digest.AddAnswer(found, height);
    if (subset)
        AddSurface(*subset, digest);
}

/// Questions between two positions; `turn` chooses among their kinds.
struct Question {
    const OpenTin& tin;
    const AabbTree* tree;
    unsigned turn;
    Point2 p, q;
    Digest& digest;

    /// A segment from near or far, vertical, or along an axis, in both frames.
    void AskCrossing() const {
        const Point2 ends[] = {q, p, {q.x, p.y}, {p.x, q.y}, {q.x + 10, p.y}}, end = ends[turn % 5];
        const auto low = static_cast<float>(turn % 60) - 10;
        const Point a{p.x, p.y, 60}, b{end.x, end.y, low};
        const MapPoint from = ToMap(tin, p), to = ToMap(tin, end);
        float height = UNTOUCHED;
        const bool found =
            turn / 5 % 2 == 0
                ? tin.GetLineIntersectHeight(a, b, height, tree)
                : tin.GetLineIntersectHeight(point3_t<double>{from.x, from.y, 60},
                                             {to.x, to.y, static_cast<double>(low)}, height, tree);
        digest.AddAnswer(found, height);
        Indices lists[3];
        tin.FindTrianglesByLine(a, b, lists[0], tree);
        tin.FindTrianglesByPoint(p.x, p.y, lists[1], tree);
        tin.FindTrianglesByRegion(MakeRegion(p, q, turn), lists[2], tree);
        for (const Indices& list : lists)
            digest.AddList(list);
    }

    void AskSubsets() const {
        const MapPoint map[] = {ToMap(tin, p), ToMap(tin, q), ToMap(tin, {q.x, p.y})};
        const Point2 local[] = {p, q, {p.x, q.y}, p};
        AddSubset(tin.SubsetByRegion(MakeRegion(map[0], map[1], turn), tree), p, digest);
        AddSubset(tin.SubsetByRegion(MakeRegion(p, q, turn), tree), p, digest);
        AddSubset(tin.SubsetByLineString(map, turn % 4, tree), q, digest);
        AddSubset(tin.SubsetByLineString(local, turn % 5, tree), p, digest);
        Indices list;
        std::vector<unsigned char> mask;
        for (unsigned i = 0; i < turn % 1500; ++i) {
            list.push_back(i * (turn | 1u) * 7919u % tin.GetTriangleCount());
            mask.push_back(static_cast<unsigned char>(list.back() % 3));
        }
        AddSubset(tin.Subset(list), p, digest);
        AddSubset(tin.Subset(mask), q, digest);
    }

    /// Walks the grid cells of a triangle, in lists that may hold something already.
    void AskGrid() const {
        const Triangle& triangle = *tin.GetTriangle(turn % tin.GetTriangleCount());
        const auto cols = static_cast<int>(turn % 250), rows = static_cast<int>(turn % 240);
        std::vector<int> cells(turn % 2 * 2, 7);
        std::vector<float> heights;
        digest.Add(triangle.GetGridPoints(cols, rows, cells, heights));
        digest.AddList(cells);
        digest.AddList(heights);
        cells.resize(2 * std::size_t{triangle.GetGridPointsNum(cols, rows)});
        digest.Add(triangle.GetGridPointsCR(cells.data(), cols, rows));
        digest.AddList(cells);
        digest.Add(triangle.IsIntersected(*tin.GetTriangle((turn + 9) % tin.GetTriangleCount())));
    }
};

struct OpenNode : AabbNode {
    using AabbNode::ComputeBBox, AabbNode::ComputeCenter, AabbNode::Divide;
    using AabbNode::GetBestAxis, AabbNode::GetLongestAxis;
};

/// Builds a tree and adds its nodes and the order of its leaves, and a first division by hand.
void BuildTree(const OpenTin& tin, unsigned turn, AabbTree& tree, Digest& digest) {
    tree.GetInfo()->SetDivisionType(DivisionType(turn % 2));
    tree.SetCapacity(static_cast<int>(turn % 7));
    tree.CreateTree(&tin);
    const Triangle* triangles = tin.GetTriangle(0);
    Indices leaves, left{9}, right{9};
    OpenNode node;
    float center[2];
    node.ComputeBBox(triangles, tin.GetAll());
    node.ComputeCenter(triangles, tin.GetAll(), center);
    node.Divide(triangles, tin.GetAll(),
                turn % 2 == 0 ? node.GetBestAxis(triangles, tin.GetAll(), center)
                              : node.GetLongestAxis(),
                center, left, right);
    tree.FindLeaves(EVERYWHERE, leaves);
    for (const Indices& list : {leaves, left, right})
        digest.AddList(list);
    digest.AddList<std::uint64_t>({tree.GetNodeCount(), tree.GetCapacity(), tree.GetObjBytes()});
}

/// Asks a copy, a moved surface and one that was assigned, in turn.
void AskMesh(const Mesh& mesh, double xBase, double yBase, test::Random& random, Digest& digest) {
    OpenTin made = mesh.MakeTin(xBase, yBase), assigned = Mesh(mesh).MakeTin(1, 2);
    const OpenTin copy(made), moved(std::move(made));
    assigned = moved;
    AabbTree tree;
    for (unsigned i = 0; i < 1000; ++i) {
        const OpenTin* const forms[] = {&copy, &moved, &assigned};
        const OpenTin& tin = *forms[i % 3];
        if (i % 250 == 0) {
            AddSurface(tin, digest);
            BuildTree(tin, i / 250, tree, digest);
        }
        const auto position = [&] { // often a vertex, or on an edge
            const Point& v = *tin.GetVertex(random.Below(tin.GetVertexCount()));
            const float steps[] = {0, 0, 5, random.Between(-12, 12)};
            return Point2{v.x + steps[random.Below(4)], v.y + steps[random.Below(4)]};
        };
        const Question question{
            tin,   i % 4 == 0 ? nullptr : &tree, random.Below(1u << 20), position(), position(),
            digest};
        question.AskCrossing();
        question.AskGrid();
        if (i % 16 < 3)
            question.AskSubsets();
    }
}

} // namespace

Digest AskEverything() {
    Digest digest;
    std::string transcript;
    Recording::poTranscript = &transcript;
    test::Random random;
    random.moEngine.seed(1);
    for (const Mesh& mesh : MakeMeshes(random)) {
        AskMesh(mesh, 500000.37, 4649776.81, random, digest);
        AskMesh(mesh, -0.1, 1e7 / 3, random, digest);
    }
    Recording::poTranscript = nullptr;
    digest.AddList<char>({transcript.begin(), transcript.end()});
    return digest;
}
