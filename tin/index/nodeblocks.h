#pragma once

#include <algorithm>
#include <cstddef>
#include <mutex>
#include <new>
#include <utility>

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

    /// Nodes side by side.
    struct Run {
        Node* first = nullptr;
        Node* last = nullptr;
    };

    /// @return the left of two new default nodes side by side @throw std::bad_alloc
    Node* MakePair() { return MakeRun(2).first; }

    /// @param most an even number above 0
    /// @return new default nodes, whose number is even; fewer at the end of a block
    /// @throw std::bad_alloc
    Run MakeRun(std::size_t most) {
        if (mpoLast == nullptr || mpoLast->nNodes == GetCapacity(*mpoLast))
            AddBlock();
        const std::size_t count = std::min(most, GetCapacity(*mpoLast) - mpoLast->nNodes);
        Node* first = GetNodes(mpoLast) + mpoLast->nNodes;
        for (Node* node = first; node != first + count; ++node)
            new (node) Node;
        mpoLast->nNodes += count;
        return {first, first + count};
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

/// Makes nodes for one thread in blocks that several threads share.
template <typename Node>
class SharedPairs {
  public:
    SharedPairs(NodeBlocks<Node>& rBlocks, std::mutex& rMutex)
        : mrBlocks(rBlocks), mrMutex(rMutex) {}

    /// As NodeBlocks::MakePair.
    Node* MakePair() {
        if (moRun.first == moRun.last) {
            const std::lock_guard lock(mrMutex);
            moRun = mrBlocks.MakeRun(RUN);
        }
        return std::exchange(moRun.first, moRun.first + 2);
    }

  private:
    static constexpr std::size_t RUN = 64;

    NodeBlocks<Node>& mrBlocks;
    std::mutex& mrMutex;
    typename NodeBlocks<Node>::Run moRun; ///< yet to be handed out
};

} // namespace kelm::tin::index
