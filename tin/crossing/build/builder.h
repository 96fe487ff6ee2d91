#pragma once

#include "tin/buildoptions.h"
#include "tin/crossing/build/reference.h"
#include "tin/crossing/layout.h"
#include "tin/tin.h"

#include <cstddef>
#include <vector>

namespace kelm::tin::crossing {

/// What is known of all triangles of an index.
struct Summary {
    std::size_t counts[4] = {0, 0, 0, 0}; ///< a kind
    Bounds bounds;
    Float4 sides = Fill4(0.0F);

    void Add(const Reference& reference) {
        ++counts[reference.kind];
        if (reference.kind > K_Loose)
            return;
        Bounds own;
        own.Add(reference);
        bounds.Add(own);
        sides = Greatest(own.high - own.low, sides);
    }
    void Add(const Summary& other) {
        for (unsigned kind = 0; kind < 4; ++kind)
            counts[kind] += other.counts[kind];
        bounds.Add(other.bounds);
        sides = Greatest(other.sides, sides);
    }
};

/// One build of an index. The number of threads changes nothing in it.
class Builder {
  public:
    Builder(const Tin& surface, const BuildOptions& options);

    /// @throw std::bad_alloc, CancelledException
    Index Build();

  private:
    /// A stretch of the references that becomes one subtree.
    struct Range {
        Reference* first;
        std::size_t count;
        std::size_t place; ///< of its division: see moLefts
        unsigned group;    ///< its first node of blocks

        unsigned GetGroups() const { return static_cast<unsigned>((count + GROUP - 1) / GROUP); }
        void Split(std::size_t left, Range& rLeft, Range& rRight) const;
    };

    void Gather();
    Summary GatherPart(std::size_t first, std::size_t last) const;
    bool IsCrowded(const Summary& summary) const;
    /// A crowded surface is searched by boxes in plan.
    unsigned GetAxes() const { return moIndex.isCrowded ? 2 : 3; }
    void AddTree(Reference* first, Reference* last);
    void AddStale(const Reference* first, const Reference* last);
    void FillAll();
    std::vector<Range> DivideTop() const;
    void FillBelow(Range range) const;
    void FillGroup(const Range& range) const;
    void FillBlock(const Reference* first, unsigned count, std::size_t block) const;
    void LinkNodes();
    void Report(double done) const { mrOptions.progress.Report(done, "Building a crossing tree"); }

    const Tin& mrSurface;
    const BuildOptions& mrOptions;
    int mnThreads;
    Array<Reference> moReferences;
    std::vector<Range> moTrees;
    unsigned mnTightGroups = 0;
    /// Groups on the left side of each division. The division of the left part of the one at p is
    /// at p + 1, that of the right part behind all of the left part.
    Array<unsigned> moLefts;
    Index moIndex;
};

} // namespace kelm::tin::crossing
