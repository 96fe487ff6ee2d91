#pragma once

#include "tin/bbox.h"
#include "tin/tinexport.h"
#include "tin/triangle.h"

#include <cstdint>
#include <vector>

namespace kelm::tin {

class AabbTree;
class Tin;

namespace index {
struct NodeBlock;
}

/// Side of a triangle at a split.
enum DivisionSide : int {
    DS_Left = 0, ///< the triangle's centroid is at or below the split
    DS_Right = 1 ///< every other case, NaN included
};

/// How the axis of a split is chosen.
enum DivisionType : int {
    DT_BestAxis = 0,   ///< the axis on which the mean of the centroids splits more evenly
    DT_LongestAxis = 1 ///< the axis on which the box is longer; any value but 0 acts so
};

/// Parameters of a tree build. A plain value.
///
/// Capacity and division type steer the build. The depth fields are for users of the record: a
/// build neither reads nor writes them, and a tree has no depth limit.
class KELM_TIN_EXPORT AabbTreeInfo {
  public:
    AabbTreeInfo() = default;
    AabbTreeInfo(const AabbTreeInfo&) = default;
    AabbTreeInfo& operator=(const AabbTreeInfo&) = default;
    ~AabbTreeInfo() = default;

    unsigned GetMaxTreeDeep() const { return mnMaxTreeDeep; }
    /// @param nDeep depth limit that TestDeep reads; 0 for none
    void SetMaxTreeDeep(unsigned nDeep) { mnMaxTreeDeep = nDeep; }
    unsigned GetDeep() const { return mnDeep; }
    void AddDeep() { ++mnDeep; }
    /// Has the depth counter reached the last level of the limit? False without a limit.
    bool TestDeep() const { return mnMaxTreeDeep != 0 && mnDeep >= mnMaxTreeDeep - 1; }

    unsigned GetCapacity() const { return mnCapacity; }
    /// @param nCapacity number of triangles above which a node is divided. It is compared as a
    /// signed number: 2^31 and above act as negative, so that every node is divided
    void SetCapacity(unsigned nCapacity) { mnCapacity = nCapacity; }
    /// Does a list of n triangles stay one leaf?
    bool TestCapacity(int n) const { return n <= static_cast<int>(mnCapacity); }
    DivisionType GetDivisionType() const { return meDivisionType; }
    void SetDivisionType(DivisionType eType) { meDivisionType = eType; }

  private:
    std::uint32_t mnMaxTreeDeep = 0;
    std::uint32_t mnDeep = 0;
    std::uint32_t mnCapacity = 5;
    DivisionType meDivisionType = DT_LongestAxis;
};

/// Node of the tree. It has a box around the boxes of all triangles below it. It has two children,
/// or it is a leaf with a list of triangle indices, ascending.
///
/// Boxes and positions are surface-local `float`. Every node owns its list. The node on which
/// CreateChild ran is the top; it owns all nodes below it.
///
/// A copy has a list of its own and the same children. If a top is copied, both own the nodes
/// below, so only one of the two may be destroyed. A copy of a node below the top owns no
/// node. It may be destroyed at any time; its children may not be used after the top is gone. A
/// move exchanges the contents of both nodes.
///
/// Searches only read and may run on any number of threads; CreateChild excludes all others.
class KELM_TIN_EXPORT AabbNode {
  public:
    AabbNode() = default;
    AabbNode(const AabbNode&) = default;
    /// Releases nothing that the target held.
    AabbNode& operator=(const AabbNode&) = default;
    /// Leaves a default node behind.
    AabbNode(AabbNode&& other) noexcept;
    AabbNode& operator=(AabbNode&& other) noexcept;
    ~AabbNode();

    /// Makes this node, which must be a default one, the top of a tree over the triangles of
    /// `list`. It is built depth first, left before right; a large one in parts by several threads,
    /// with the same tree.
    ///
    /// A node of more triangles than the tree's capacity is divided at the mean of the centroids.
    /// A set that cannot be divided on either axis becomes one leaf. A note says so. The size of
    /// that set is the tree's capacity for all nodes built afterwards.
    /// @param triangles the surface's array; boxes are read as stored @param list ascending
    /// indices into it @param tree the tree that holds this node
    /// @throw std::bad_alloc; what was built so far stays linked and is released with this node
    void CreateChild(const Triangle* triangles, const std::vector<unsigned>& list, AabbTree* tree);

    /// Appends the lists of all leaves whose box holds the position; their triangles need not.
    /// @param list not cleared; leaves come depth first, left before right @throw std::bad_alloc
    void FindLeaves(float x, float y, std::vector<unsigned>& list) const;
    /// The same for all leaves whose box meets `box`.
    void FindLeaves(const BBox<float, point2_t<float>>& box, std::vector<unsigned>& list) const;
    /// The same for all leaves whose box the segment from a to b meets in plan. For P of
    /// point2_t<float> and point3_t<float>.
    template <typename P>
    void FindLeavesByLine(const P& a, const P& b, std::vector<unsigned>& out) const;
    /// Appends this node's own list. The position and the box are not used.
    void AddLeaves(std::vector<unsigned>& list, float x, float y) const;
    void AddLeaves(std::vector<unsigned>& list, const BBox<float, point2_t<float>>& box) const;

    /// @return the child, owned by the top of its tree; null in a leaf
    AabbNode* GetLeft() const { return mpoLeft; }
    AabbNode* GetRight() const { return mpoLeft == nullptr ? nullptr : mpoLeft + 1; }
    const BBox<float, point2_t<float>>& GetBBox() const { return moBBox; }
    /// @return the triangle indices of a leaf; empty in an inner node
    const std::vector<unsigned>& GetLeaves() const { return moLeaves; }

  protected:
    /// Makes the box of this node from the stored boxes of the listed triangles.
    void ComputeBBox(const Triangle* triangles, const std::vector<unsigned>& list);
    /// Mean of the listed triangles' centroids, summed in `float` in the list's order.
    /// @param center two values, x then y
    void ComputeCenter(const Triangle* triangles, const std::vector<unsigned>& list,
                       float* center) const;
    /// @return the axis on which the box is longer; x for a square
    Axis GetLongestAxis() const;
    /// @return the axis on which `center` splits the list more evenly; x if they are equal
    Axis GetBestAxis(const Triangle* triangles, const std::vector<unsigned>& list,
                     const float* center) const;
    DivisionSide WhichSide(const Triangle* triangle, Axis axis, const float* center) const;
    /// Sorts the list into its two sides, in its order. @param left,right emptied first
    void Divide(const Triangle* triangles, const std::vector<unsigned>& list, Axis axis,
                const float* center, std::vector<unsigned>& left,
                std::vector<unsigned>& right) const;

  private:
    friend class AabbTree;
    struct Site;

    void Build(const Triangle* triangles, std::vector<unsigned> order, AabbTree& rTree);

    AabbNode* mpoLeft = nullptr;           ///< the right child stands right behind the left one
    index::NodeBlock* mpoBlocks = nullptr; ///< memory of all nodes below; null but in a top
    BBox<float, point2_t<float>> moBBox;
    std::vector<unsigned> moLeaves;
};

/// Index of a surface: a binary tree of boxes over its triangles.
///
/// The tree holds triangle indices and the number of triangles, but no link to the surface. The
/// caller keeps both together and passes the tree to the surface's queries, which refuse a tree of
/// another number of triangles. A tree of another surface with the same number leads to wrong
/// answers.
///
/// A copy names the same nodes. Of the trees that name the same nodes only one may be destroyed or
/// built anew. A move exchanges the contents of both trees.
///
/// Searches, GetObjBytes and EstimateObjBytes may run on any number of threads; a build or a change
/// of parameters excludes all others.
class KELM_TIN_EXPORT AabbTree {
  public:
    /// An empty tree with the default parameters.
    AabbTree() = default;
    /// Builds over a surface with the default parameters. Fails as CreateTree does.
    explicit AabbTree(const Tin* poTin);
    AabbTree(const AabbTree&) = default;
    /// Copies the fields as they stand and releases nothing.
    AabbTree& operator=(const AabbTree&) = default;
    /// Leaves an empty tree with the default parameters behind.
    AabbTree(AabbTree&& other) noexcept;
    AabbTree& operator=(AabbTree&& other) noexcept;
    ~AabbTree();

    /// Releases the old nodes and builds anew, with the present parameters. A surface without
    /// triangles gives a tree without a root, which answers every search with nothing.
    ///
    /// A large surface takes all threads of the runtime; any number of them gives the same tree.
    /// At its peak a build holds, besides the tree, two arrays of one index a triangle.
    /// @throw kelm::ParameterException if poTin is null, with nothing changed; std::bad_alloc, and
    /// the tree is then partly built: build it anew or destroy it
    void CreateTree(const Tin* poTin);

    /// As the searches of the root.
    void FindLeaves(float x, float y, std::vector<unsigned>& list) const;
    void FindLeaves(const BBox<float, point2_t<float>>& box, std::vector<unsigned>& list) const;

    /// @return the root, owned by the tree; null while nothing is built
    AabbNode* GetRoot() { return mpoRoot; }
    const AabbNode* GetRoot() const { return mpoRoot; }
    /// @return nodes of the last build, inner nodes and leaves
    unsigned GetNodeCount() const { return mnNodeCount; }
    void IncreaseNodeCount() { ++mnNodeCount; }
    /// @return triangles of the last build
    unsigned GetTriangleCount() const { return mnTriangleCount; }
    unsigned GetCapacity() const { return moInfo.GetCapacity(); }
    void SetCapacity(int nCapacity) { moInfo.SetCapacity(static_cast<unsigned>(nCapacity)); }
    bool TestCapacity(int n) const { return moInfo.TestCapacity(n); }
    DivisionType GetDivisionType() const { return moInfo.GetDivisionType(); }
    /// @return the parameters, which the caller may change for the next build
    AabbTreeInfo* GetInfo() { return &moInfo; }
    void SetInfo(const AabbTreeInfo& oInfo) { moInfo = oInfo; }

    /// @return bytes of the built tree: its own, 64 a node and 4 a triangle; nodes are made in
    /// blocks, which reserve more
    std::uint64_t GetObjBytes() const;
    /// @return bytes that a tree over n triangles will hold with the present capacity. A capacity
    /// of 0 has no meaning here and gives the highest node count
    std::uint64_t EstimateObjBytes(unsigned n) const;

  private:
    AabbNode* mpoRoot = nullptr;
    std::uint32_t mnNodeCount = 0;
    AabbTreeInfo moInfo;
    std::uint32_t mnTriangleCount = 0;
};

static_assert(sizeof(AabbNode) == 64, "a tree accounts 64 bytes for a node");
static_assert(sizeof(AabbTree) == 32, "a tree accounts 32 bytes for itself");

} // namespace kelm::tin

/// @return bytes that an index over n triangles will hold with the default parameters
KELM_TIN_EXPORT std::uint64_t EstimateAabbTreeBytes(unsigned n);
