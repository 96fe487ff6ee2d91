#pragma once

#include "tin/index/nodeblocks.h"
#include "tin/index/nodebuilder.h"
#include "tin/parallel/parallelbatch.h"

#include <algorithm>
#include <atomic>
#include <mutex>
#include <utility>
#include <vector>

namespace kelm::tin::index {

/// What ends a build in parts: the nodes behind an indivisible set depend on its size.
struct IndivisibleSet {};

/// Where one part of a tree is built. It reads the capacity and changes nothing of the tree.
template <typename Site>
struct PartSite : Site {
    PartSite(const Site& site, std::atomic<bool>& rIsOver, std::atomic<unsigned>& rNodes)
        : Site(site), mrIsOver(rIsOver), mrNodes(rNodes) {}
    PartSite(const PartSite&) = delete;
    ~PartSite() { mrNodes += mnNodes; }

    void CountNode() {
        if (mrIsOver.load(std::memory_order_relaxed))
            throw IndivisibleSet();
        ++mnNodes;
    }
    void RaiseCapacity(int) {
        mrIsOver = true;
        throw IndivisibleSet();
    }

  private:
    std::atomic<bool>& mrIsOver;
    std::atomic<unsigned>& mrNodes;
    unsigned mnNodes = 0;
};

/// One build of a tree over triangles.
///
/// The two sides of a division do not depend on each other, but for one case: a set that cannot be
/// divided raises the capacity for all nodes that are built after it, depth first. So a large tree
/// is built in parts by several threads until one meets such a set, and then anew by one thread.
/// No sum is split, so every number of threads gives the same tree.
///
/// @tparam Site as for NodeBuilder; it can be copied
template <typename Node, typename Site>
class TreeBuilder {
  public:
    /// @param divider with all triangles of the tree @param firstBlock null; receives all nodes
    /// below the top
    TreeBuilder(SpanDivider divider, Site site, NodeBlock*& firstBlock)
        : moDivider(std::move(divider)), moSite(site), mrFirstBlock(firstBlock) {}

    /// Builds the tree below its top.
    /// @throw std::bad_alloc; what was built so far is linked
    void Build(Node& rTop) {
        const Span whole = moDivider.GetWhole();
        if (!moSite.IsLeaf(static_cast<int>(whole.Size())))
            moDivider.Reserve();
        const int team = parallel::GetTeamForBatch(whole.Size(), SMALLEST, 0);
        const bool hasParts = team > 1 && moSite.IsLeaf(1) && moDivider.IsAscending();
        if (hasParts && BuildInParts(rTop, whole, team))
            return;
        NodeBlocks<Node> blocks(mrFirstBlock);
        NodeBuilder<Node, Site, NodeBlocks<Node>>(moDivider, moSite, blocks).Build(rTop, whole);
    }

  private:
    /// Fewest triangles that are worth a thread.
    static constexpr std::size_t SMALLEST = 10000;
    static constexpr std::size_t PARTS_PER_THREAD = 4;

    /// A node yet to be built with all below it; null if there is none.
    struct Part {
        Node* node = nullptr;
        Span span{};
    };
    using Parts = std::vector<Part>;

    /// @return false if there is an indivisible set: nothing is built then
    bool BuildInParts(Node& rTop, const Span& whole, int team) {
        mnNodes = 0;
        try {
            NodeBlocks<Node> blocks(mrFirstBlock);
            BuildEach(blocks, MakeParts(blocks, {&rTop, whole}, team), team);
        } catch (const IndivisibleSet&) {
            Discard(rTop);
            return false;
        }
        for (unsigned n = mnNodes; n > 0; --n)
            moSite.CountNode();
        return true;
    }

    /// Builds the upper nodes, level by level, until there is work for a team.
    Parts MakeParts(NodeBlocks<Node>& rBlocks, const Part& top, int team) {
        const std::size_t wanted = PARTS_PER_THREAD * static_cast<std::size_t>(team);
        Parts parts{top};
        for (std::size_t before = 0; before < parts.size() && parts.size() < wanted;) {
            before = parts.size();
            parts = BuildLevel(rBlocks, parts, team);
        }
        const auto isLarger = [](const Part& a, const Part& b) {
            return a.span.Size() > b.span.Size();
        };
        std::sort(parts.begin(), parts.end(), isLarger);
        return parts;
    }

    /// @return the children of the nodes of a level
    Parts BuildLevel(NodeBlocks<Node>& rBlocks, const Parts& parts, int team) {
        Parts children(2 * parts.size());
        ForEach(rBlocks, parts, team, [&](auto& builder, std::size_t i) {
            Part& left = children[2 * i];
            Part& right = children[2 * i + 1];
            left.node = builder.BuildOne(*parts[i].node, parts[i].span, left.span, right.span);
            right.node = left.node == nullptr ? nullptr : left.node + 1;
        });
        const auto isNone = [](const Part& part) { return part.node == nullptr; };
        children.erase(std::remove_if(children.begin(), children.end(), isNone), children.end());
        return children;
    }

    void BuildEach(NodeBlocks<Node>& rBlocks, const Parts& parts, int team) {
        ForEach(rBlocks, parts, team, [&](auto& builder, std::size_t i) {
            builder.Build(*parts[i].node, parts[i].span);
        });
    }

    /// Calls body(builder, i) for each part, on a team.
    template <typename Body>
    void ForEach(NodeBlocks<Node>& rBlocks, const Parts& parts, int team, const Body& body) {
        parallel::ParallelBatch(parts.size(), 1, team, [&](std::size_t first, std::size_t last) {
            PartSite<Site> site(moSite, mbIsOver, mnNodes);
            SharedPairs<Node> pairs(rBlocks, moMutex);
            NodeBuilder<Node, PartSite<Site>, SharedPairs<Node>> builder(moDivider, site, pairs);
            for (std::size_t i = first; i < last; ++i)
                body(builder, i);
        });
    }

    void Discard(Node& rTop) {
        moSite.SetChildren(rTop, nullptr);
        NodeBlocks<Node>::Release(std::exchange(mrFirstBlock, nullptr));
        moDivider.Restore();
    }

    SpanDivider moDivider;
    Site moSite;
    NodeBlock*& mrFirstBlock;
    std::mutex moMutex; ///< of the blocks, while there are parts
    std::atomic<bool> mbIsOver{false};
    std::atomic<unsigned> mnNodes{0};
};

} // namespace kelm::tin::index
