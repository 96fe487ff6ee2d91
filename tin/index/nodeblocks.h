#pragma once

#include <algorithm>
#include <cstddef>
#include <new>

namespace kelm::tin::index {

/// Header of a block of memory, which holds what nodes were made in it.
struct NodeBlock {
    NodeBlock* poNext;
    std::size_t nBytes; ///< header included
    std::size_t nNodes;
};

/// @return memory of at least 128 byte alignment. Large blocks are mapped on their own, on huge
/// pages where the system has them, so that their pages go back to it and leave the heap as it was
/// @param bytes from 2 MiB on a multiple of 4096
/// @throw std::bad_alloc
void* AllocateBlock(std::size_t bytes);
void FreeBlock(void* memory, std::size_t bytes) noexcept;

/// Makes nodes in blocks, two siblings side by side and aligned to both, since a search that looks
/// at one looks at the other. The chain of blocks belongs to whoever holds its first one.
template <typename Node>
class NodeBlocks {
  public:
    /// @param first null; receives the first block when there is one
    explicit NodeBlocks(NodeBlock*& first) : mrFirst(first) {}

    /// @return the left of two new default nodes side by side @throw std::bad_alloc
    Node* MakePair() {
        if (mpoLast == nullptr || mpoLast->nNodes + 2 > GetCapacity(*mpoLast))
            AddBlock();
        Node* pair = GetNodes(mpoLast) + mpoLast->nNodes;
        for (Node* node : {pair, pair + 1})
            new (node) Node;
        mpoLast->nNodes += 2;
        return pair;
    }

    /// Destroys the nodes of a chain and frees its memory. Null is an empty chain.
    static void Release(NodeBlock* first) noexcept {
        // All nodes go before any block: one of them may be the top of nodes of its own.
        for (NodeBlock* block = first; block != nullptr; block = block->poNext)
            std::for_each(GetNodes(block), GetNodes(block) + block->nNodes,
                          [](Node& rNode) { rNode.~Node(); });
        while (first != nullptr) {
            NodeBlock* block = first;
            first = block->poNext;
            FreeBlock(block, block->nBytes);
        }
    }

  private:
    static constexpr std::size_t PAIR = 2 * sizeof(Node);
    static constexpr std::size_t LARGEST = std::size_t{32} << 20;
    static_assert(sizeof(NodeBlock) <= PAIR, "a header takes the place of one pair");

    static Node* GetNodes(NodeBlock* block) { return reinterpret_cast<Node*>(block) + 2; }
    static std::size_t GetCapacity(const NodeBlock& block) {
        return block.nBytes / sizeof(Node) - 2;
    }

    void AddBlock() {
        mnBytes = std::min(2 * mnBytes, LARGEST);
        auto* block = new (AllocateBlock(mnBytes)) NodeBlock{nullptr, mnBytes, 0};
        (mpoLast == nullptr ? mrFirst : mpoLast->poNext) = block;
        mpoLast = block;
    }

    NodeBlock*& mrFirst;
    NodeBlock* mpoLast = nullptr;
    std::size_t mnBytes = PAIR; ///< of the last block
};

} // namespace kelm::tin::index
