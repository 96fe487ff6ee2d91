#include "tin/crossing/build/builder.h"

#include "tin/crossing/build/division.h"
#include "tin/crossing/build/links.h"
#include "tin/parallel/parallelbatch.h"

#include <algorithm>
#include <mutex>

namespace kelm::tin::crossing {

namespace {

/// References below which a stretch is not worth a thread.
constexpr std::size_t WORTH_A_THREAD = 4096;

/// The longest of three sides, and a little above what rounding may have taken from it.
float GetLongest(const Float4& sides) {
    float s[4];
    Store4(s, sides);
    return std::max({s[0], s[1], s[2]}) * (1.0F + 0x1p-20F);
}

/// Brings the references of a kind to the front. @return their end
Reference* SortOut(Reference* first, Reference* last, Kind kind, const Summary& summary) {
    // Most surfaces have one kind only.
    if (summary.counts[kind] < static_cast<std::size_t>(last - first))
        std::partition(first, last, [=](const Reference& r) { return r.kind == kind; });
    return first + summary.counts[kind];
}

float GetZ(const Float4& corner) {
    float c[4];
    Store4(c, corner);
    return c[2];
}

} // namespace

void Builder::Range::Split(std::size_t left, Range& rLeft, Range& rRight) const {
    const auto groups = static_cast<unsigned>(left / GROUP);
    const Range whole = *this;
    rLeft = {whole.first, left, whole.place + 1, whole.group};
    rRight = {whole.first + left, whole.count - left, whole.place + 2 * std::size_t{groups},
              whole.group + groups};
}

Builder::Builder(const Tin& surface, const BuildOptions& options)
    : mrSurface(surface), mrOptions(options), mnThreads(options.threads) {}

Index Builder::Build() {
    Report(0.0);
    double x;
    double y;
    mrSurface.GetXYBase(x, y);
    moIndex.frame = rules::Frame(x, y);
    moIndex.box = mrSurface.GetBBox();
    Gather();
    Report(0.1);
    moLefts = Array<unsigned>(2 * std::size_t{moIndex.groups});
    moIndex.nodes = Array<Node>(moIndex.groups);
    moIndex.blocks = Array<Block>(std::size_t{moIndex.groups} * WIDTH);
    moIndex.ids = Array<unsigned>(std::size_t{moIndex.groups} * GROUP);
    FillAll();
    LinkNodes();
    Report(1.0);
    return std::move(moIndex);
}

/// Makes the references, and adds the triangles kind by kind.
void Builder::Gather() {
    const std::size_t count = mrSurface.GetTriangleCount();
    moReferences = Array<Reference>(count);
    Summary all;
    std::mutex mutex;
    parallel::ParallelBatch(count, WORTH_A_THREAD, mnThreads,
                            [&](std::size_t first, std::size_t last) {
                                const Summary part = GatherPart(first, last);
                                const std::lock_guard<std::mutex> lock(mutex);
                                all.Add(part);
                            });
    moIndex.extent = GetLongest(all.sides);
    moIndex.low = GetZ(all.bounds.low);
    moIndex.high = GetZ(all.bounds.high);
    moIndex.isCrowded = IsCrowded(all);
    Reference* const end = moReferences.GetData() + count;
    Reference* const loose = SortOut(moReferences.GetData(), end, K_Tight, all);
    AddTree(moReferences.GetData(), loose);
    mnTightGroups = moIndex.groups;
    Reference* const stale = SortOut(loose, end, K_Loose, all);
    AddTree(loose, stale);
    AddStale(stale, SortOut(stale, end, K_Stale, all));
}

/// Looks at some thousands of the references.
bool Builder::IsCrowded(const Summary& summary) const {
    constexpr float SMALL = 0x1p-17F;
    constexpr std::size_t SOME = 4096;
    float sides[4];
    summary.bounds.GetSides(sides);
    const float small = SMALL * std::max(sides[0], sides[1]);
    const std::size_t count = mrSurface.GetTriangleCount();
    const std::size_t step = count / SOME + 1;
    std::size_t seen = 0;
    std::size_t found = 0;
    for (std::size_t i = 0; i < count; i += step, ++seen) {
        const Reference& r = moReferences[i];
        found += r.kind <= K_Loose && std::max(r.high[0] - r.low[0], r.high[1] - r.low[1]) < small;
    }
    return found > seen / 8;
}

Summary Builder::GatherPart(std::size_t first, std::size_t last) const {
    Summary part;
    for (std::size_t i = first; i < last; ++i) {
        const auto id = static_cast<unsigned>(i);
        moReferences[i] = CreateReference(*mrSurface.GetTriangle(id), id);
        part.Add(moReferences[i]);
    }
    return part;
}

void Builder::AddTree(Reference* first, Reference* last) {
    if (first == last)
        return;
    const Range tree{first, static_cast<std::size_t>(last - first), 2 * std::size_t{moIndex.groups},
                     moIndex.groups};
    moTrees.push_back(tree);
    moIndex.groups += tree.GetGroups();
}

void Builder::AddStale(const Reference* first, const Reference* last) {
    for (; first != last; ++first) {
        const Triangle& triangle = *mrSurface.GetTriangle(first->id);
        moIndex.stale.push_back(
            {{*triangle.GetVertex(0), *triangle.GetVertex(1), *triangle.GetVertex(2)},
             triangle.GetBBox(),
             first->id});
    }
}

/// Fills all nodes of blocks, in some rounds, between which the progress is told.
void Builder::FillAll() {
    constexpr std::size_t ROUNDS = 8;
    const std::vector<Range> ranges = DivideTop();
    const std::size_t step = ranges.size() / ROUNDS + 1;
    for (std::size_t from = 0; from < ranges.size(); from += step) {
        Report(0.2 + 0.7 * static_cast<double>(from) / static_cast<double>(ranges.size()));
        const std::size_t count = std::min(step, ranges.size() - from);
        parallel::ParallelBatch(count, 1, mnThreads, [&](std::size_t first, std::size_t last) {
            for (std::size_t i = first; i < last; ++i)
                FillBelow(ranges[from + i]);
        });
    }
}

/// Divides the trees level by level, until there are stretches for many threads.
std::vector<Builder::Range> Builder::DivideTop() const {
    constexpr std::size_t ENOUGH = 128;
    std::vector<Range> ranges = moTrees;
    for (bool isDivided = true; isDivided && ranges.size() < ENOUGH;) {
        std::vector<Range> parts(2 * ranges.size());
        parallel::ParallelBatch(ranges.size(), 1, mnThreads, [&](std::size_t from, std::size_t to) {
            for (std::size_t i = from; i < to; ++i) {
                const Range& range = ranges[i];
                parts[2 * i] = range;
                if (range.count < WORTH_A_THREAD)
                    continue;
                const std::size_t left = Divide(range.first, range.count, GetAxes());
                moLefts[range.place] = static_cast<unsigned>(left / GROUP);
                range.Split(left, parts[2 * i], parts[2 * i + 1]);
            }
        });
        const auto isEmpty = [](const Range& range) { return range.count == 0; };
        parts.erase(std::remove_if(parts.begin(), parts.end(), isEmpty), parts.end());
        isDivided = parts.size() > ranges.size();
        ranges.swap(parts);
    }
    return ranges;
}

void Builder::FillBelow(Range range) const {
    while (range.count > GROUP) {
        const std::size_t left = Divide(range.first, range.count, GetAxes());
        moLefts[range.place] = static_cast<unsigned>(left / GROUP);
        Range small;
        Range rest;
        range.Split(left, small, rest);
        if (rest.count < small.count)
            std::swap(small, rest);
        FillBelow(small);
        range = rest;
    }
    FillGroup(range);
}

namespace {

/// Sorts the references of one group into blocks.
void SortIntoBlocks(Reference* first, std::size_t count, unsigned axes) {
    while (count > WIDTH) {
        const std::size_t left = Divide(first, count, axes);
        SortIntoBlocks(first, left, axes);
        first += left;
        count -= left;
    }
}

} // namespace

void Builder::FillGroup(const Range& range) const {
    constexpr float INFINITE = std::numeric_limits<float>::infinity();
    SortIntoBlocks(range.first, range.count, GetAxes());
    Node& node = moIndex.nodes[range.group];
    for (unsigned k = 0; k < WIDTH; ++k) {
        const std::size_t from = std::min<std::size_t>(std::size_t{k} * WIDTH, range.count);
        const auto count = static_cast<unsigned>(std::min<std::size_t>(WIDTH, range.count - from));
        if (count == 0) {
            ClearBox(node, k);
            continue;
        }
        Bounds bounds;
        for (unsigned i = 0; i < count; ++i)
            bounds.Add(range.first[from + i]);
        float planes[7];
        Store4(planes, bounds.low);
        Store4(planes + 3, bounds.high);
        if (range.group >= mnTightGroups) {
            planes[2] = -INFINITE;
            planes[5] = INFINITE;
        }
        SetBox(node, k, planes);
        FillBlock(range.first + from, count, std::size_t{range.group} * WIDTH + k);
    }
}

void Builder::FillBlock(const Reference* first, unsigned count, std::size_t number) const {
    Block& block = moIndex.blocks[number];
    Bounds bounds;
    for (unsigned k = 0; k < WIDTH; ++k) {
        const bool isThere = k < count;
        const Reference& reference = first[isThere ? k : 0];
        const Triangle& triangle = *mrSurface.GetTriangle(reference.id);
        for (unsigned i = 0; i < 3; ++i) {
            const point3_t<float>& corner = *triangle.GetVertex(isThere ? static_cast<int>(i) : 0);
            block.corners[i][0][k] = corner.x;
            block.corners[i][1][k] = corner.y;
            block.corners[i][2][k] = corner.z;
        }
        moIndex.ids[number * WIDTH + k] = reference.id;
        bounds.Add(reference);
    }
    block.extent = GetLongest(bounds.high - bounds.low);
}

void Builder::LinkNodes() {
    Links links(moLefts);
    for (const Range& tree : moTrees)
        moIndex.roots.push_back(
            links.AddTree(tree.place, tree.GetGroups(), tree.group, moIndex.groups));
    moIndex.upperNodes = links.CreateNodes(moIndex.nodes, moIndex.groups);
}

} // namespace kelm::tin::crossing
