#pragma once

#include "tin/aabbtree.h"

#include <algorithm>
#include <cstddef>
#include <new>

#ifdef __linux__
#include <sys/mman.h>
#endif

namespace kelm::tin {

/// Memory of the nodes that one build makes below its top.
///
/// Children are made in pairs, each on two cache lines of its own, since a search that looks at one
/// looks at the other; on a large tree a block fills one huge page. The blocks hang together behind
/// the first pair, which are the children of the top, and are released as a whole.
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

    /// @param poFirst the left child of a top
    static void Release(AabbNode* poFirst) {
        Block* next;
        for (Block* block = reinterpret_cast<Block*>(poFirst) - 1; block != nullptr; block = next) {
            next = block->poNext;
            for (AabbNode* node = block->GetNodes(); node != block->GetNodes() + block->nNodes;
                 ++node) {
                node->mpoLeft = nullptr;
                node->~AabbNode();
            }
            ::operator delete(block, GetAlignment(block->nCapacity));
        }
    }

  private:
    static constexpr std::size_t HUGE_PAGE = 2 << 20;

    struct alignas(2 * sizeof(AabbNode)) Block {
        Block* poNext;
        std::size_t nNodes;
        std::size_t nCapacity;

        AabbNode* GetNodes() { return reinterpret_cast<AabbNode*>(this + 1); }
    };

    /// Nodes of a block of so many bytes; room for the allocator's own is left, so that aligned
    /// blocks can lie end to end.
    static constexpr std::size_t GetCapacity(std::size_t nBytes) {
        return (nBytes - 2 * sizeof(Block)) / sizeof(AabbNode);
    }

    static std::align_val_t GetAlignment(std::size_t nCapacity) {
        return std::align_val_t{nCapacity == GetCapacity(HUGE_PAGE) ? HUGE_PAGE : alignof(Block)};
    }

    void AddBlock() {
        mnBytes = std::min(2 * mnBytes, HUGE_PAGE);
        const std::size_t capacity = GetCapacity(mnBytes);
        const std::size_t bytes = sizeof(Block) + capacity * sizeof(AabbNode);
        void* memory = ::operator new(bytes, GetAlignment(capacity));
#ifdef MADV_HUGEPAGE
        if (mnBytes == HUGE_PAGE)
            madvise(memory, bytes, MADV_HUGEPAGE); // a refusal costs speed only
#endif
        Block* block = new (memory) Block{nullptr, 0, capacity};
        if (mpoLast != nullptr)
            mpoLast->poNext = block;
        mpoLast = block;
    }

    Block* mpoLast = nullptr;
    std::size_t mnBytes = 512;
};

} // namespace kelm::tin
