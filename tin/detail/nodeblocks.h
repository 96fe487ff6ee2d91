#pragma once

#include "tin/aabbtree.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <new>

#ifdef __linux__
#include <sys/mman.h>
#endif

namespace kelm::tin {

/// Memory of the nodes that one build makes below its top.
///
/// Siblings lie side by side, aligned to both, since a search that looks at one looks at the other;
/// the blocks of a large tree lie on huge pages. The first block's header stands right before the
/// first pair, the children of the top, so that the top finds all blocks by its left child. The
/// object itself owns nothing.
class AabbNode::Blocks {
  public:
    /// @return the left of two new default nodes side by side
    AabbNode* MakePair() {
        if (mpoLast == nullptr || mpoLast->nNodes == mpoLast->nCapacity)
            AddBlock();
        AabbNode* pair = mpoLast->GetNodes() + mpoLast->nNodes;
        for (AabbNode* node : {pair, pair + 1})
            new (node) AabbNode;
        mpoLast->nNodes += 2;
        return pair;
    }

    /// Releases all blocks of a build if `poLeft` is the left child of its top. The children of
    /// other nodes lie in these blocks too, and go with them.
    static void ReleaseBelow(AabbNode* poLeft) {
        Block* first = FindFirst(poLeft);
        // All nodes go before any block, for a node may have been assigned another's children.
        for (Block* block = first; block != nullptr; block = block->poNext)
            std::for_each(block->GetNodes(), block->GetNodes() + block->nNodes,
                          [](AabbNode& rNode) { rNode.~AabbNode(); });
        while (first != nullptr) {
            Block* block = first;
            first = block->poNext;
            ::operator delete(block, GetAlignment(block->nCapacity));
        }
    }

  private:
    static constexpr std::size_t HUGE_PAGE = std::size_t{2} << 20;
    static constexpr std::size_t LARGEST = 16 * HUGE_PAGE;

    struct alignas(2 * sizeof(AabbNode)) Block {
        Block* poSelf; ///< null in a block that is not the first
        Block* poNext;
        std::size_t nNodes;
        std::size_t nCapacity;

        AabbNode* GetNodes() { return reinterpret_cast<AabbNode*>(this + 1); }
    };

    static constexpr std::size_t GetBytes(std::size_t nCapacity) {
        return sizeof(Block) + nCapacity * sizeof(AabbNode);
    }

    static std::align_val_t GetAlignment(std::size_t nCapacity) {
        return std::align_val_t{GetBytes(nCapacity) < HUGE_PAGE ? alignof(Block) : HUGE_PAGE};
    }

    /// @return the header of the first block if it stands before the pair, else null. Before any
    /// other pair stands a pair, whose first word is null or leads to yet another one, or the
    /// header of a later block.
    static Block* FindFirst(AabbNode* poLeft) {
        Block* before = reinterpret_cast<Block*>(poLeft) - 1;
        Block head;
        std::memcpy(&head, before, sizeof head);
        return head.poSelf == before ? before : nullptr;
    }

    void AddBlock() {
        mnBytes = std::min(2 * mnBytes, LARGEST);
        const std::size_t capacity = (mnBytes - sizeof(Block)) / sizeof(AabbNode);
        void* memory = ::operator new(mnBytes, GetAlignment(capacity));
#ifdef MADV_HUGEPAGE
        if (mnBytes >= HUGE_PAGE)
            madvise(memory, mnBytes, MADV_HUGEPAGE); // a refusal costs speed only
#endif
        Block* block = new (memory) Block{nullptr, nullptr, 0, capacity};
        if (mpoLast != nullptr)
            mpoLast->poNext = block;
        else
            block->poSelf = block;
        mpoLast = block;
    }

    Block* mpoLast = nullptr;
    std::size_t mnBytes = 2 * sizeof(Block); ///< of the last block
};

} // namespace kelm::tin
