#pragma once

#include "containers/keypoint.h"
#include "containers/octotreenode.h"

#include <algorithm>
#include <cmath>
#include <memory>

namespace kelm::containers {

/// Point octree that finds points that coincide: a leaf holds exactly one point, and a leaf that
/// receives a second one is split at the centre of its cell.
///
/// A new point is dropped if it lies within the tolerance of the point held by the leaf that it
/// reaches, so of several points at one place the first stays. Two kinds of points are counted but
/// have no leaf, so no search finds them: points that are not finite, and points that no halving of
/// their cell can part from a held point. The second kind needs coordinates from 2^53 on. The depth
/// grows until a cell is as small as the least distance of two points. It is never above 2200.
///
/// A tree owns its nodes. Searches only read and may run on any number of threads.
template <typename T, typename K>
class OctoTree {
  public:
    using Node = OctoTreeNode<T, K>;
    using Box = typename Node::Box;
    using Point = KeyPoint<T>;

    OctoTree() = default;
    OctoTree(const OctoTree&) = delete;
    OctoTree& operator=(const OctoTree&) = delete;
    virtual ~OctoTree() { DeleteNode(mpoRoot); }

    /// Adds a point. @return true if the tree now holds it, false if it was dropped as a twin of a
    /// held point @throw std::bad_alloc, with every held point still in place
    bool Insert(const K& key, const Point& point);

    /// The leaf whose cell takes the point, whatever point it holds; null if there is none. For a
    /// point identical to one that has a leaf it is that leaf.
    Node* FindLeaf(const Point& point) const;

    /// The leaf of lowest key that holds a twin of the point; null if there is none.
    const Node* FindTwin(const Point& point) const;

    /// Are the two points one, by the tolerance on each axis?
    static bool IsTwin(const Point& p, const Point& q) {
        return std::fabs(p.x - q.x) < TOLERANCE && std::fabs(p.z - q.z) < TOLERANCE &&
               std::fabs(p.y - q.y) < TOLERANCE;
    }

    static bool IsFinite(const Point& p) {
        return std::isfinite(p.x) && std::isfinite(p.y) && std::isfinite(p.z);
    }

    int GetPointCount() const { return mnPointCount; }

  protected:
    /// Two points closer than this on every axis, in map units, are one.
    static constexpr T TOLERANCE = T(1e-9);

    bool InsertNode(std::unique_ptr<Node>& node, Node*& rSlot, Box cell);
    void Split(Node& rLeaf);
    static int GetOctant(const Point& point, const Node& node);
    static int Classify(const Point& point, const Box& cell, Box& subCell);
    static bool IsInsideNode(const Point& point, const Node* node);
    static void FindTwinBelow(const Node* node, const Point& point, const Node*& twin);
    static void DeleteNode(Node*& slot);

    Node* mpoRoot = nullptr;
    int mnPointCount = 0;
    Box moBounds{};
};

namespace detail {

/// Side of a value in a cell on one axis: 0 low, 1 high, -1 outside. The centre is on the low side.
template <typename T>
int GetSide(T v, T low, T high) {
    const T m = (high + low) * T(0.5);
    if (low <= v && m >= v)
        return 0;
    return v > m && high >= v ? 1 : -1;
}

template <typename T>
void TakeHalf(int side, T& low, T& high) {
    const T m = (high + low) * T(0.5);
    (side == 0 ? high : low) = m;
}

} // namespace detail

/// On each axis the point lies on one side at most. A point outside the cell goes to octant 7.
template <typename T, typename K>
int OctoTree<T, K>::Classify(const Point& point, const Box& cell, Box& subCell) {
    int x = detail::GetSide(point.x, cell.min.x, cell.max.x);
    int y = detail::GetSide(point.y, cell.min.y, cell.max.y);
    int z = detail::GetSide(point.z, cell.min.z, cell.max.z);
    if (x < 0 || y < 0 || z < 0)
        x = y = z = 1;
    subCell = cell;
    detail::TakeHalf(x, subCell.min.x, subCell.max.x);
    detail::TakeHalf(y, subCell.min.y, subCell.max.y);
    detail::TakeHalf(z, subCell.min.z, subCell.max.z);
    return 4 * y + 2 * x + z;
}

template <typename T, typename K>
int OctoTree<T, K>::GetOctant(const Point& point, const Node& node) {
    Box subCell;
    return Classify(point, node.moBox, subCell);
}

template <typename T, typename K>
bool OctoTree<T, K>::Insert(const K& key, const Point& point) {
    if (!IsFinite(point)) {
        ++mnPointCount;
        return true;
    }
    auto node = std::make_unique<Node>();
    node->mnKey = key;
    node->moPoint = point;
    return InsertNode(node, mpoRoot, moBounds);
}

/// Moves the point of a leaf one level down. The new node is made before the leaf changes, so that
/// a failed allocation loses nothing.
template <typename T, typename K>
void OctoTree<T, K>::Split(Node& rLeaf) {
    auto moved = std::make_unique<Node>();
    moved->mnKey = rLeaf.mnKey;
    moved->moPoint = rLeaf.moPoint;
    const int octant = Classify(rLeaf.moPoint, rLeaf.moBox, moved->moBox);
    const Node empty;
    rLeaf.mnKey = empty.mnKey;
    rLeaf.moPoint = empty.moPoint;
    rLeaf.mpoChild[octant] = moved.release();
}

/// Places a node below a slot. @return false if it was dropped, true if its point is held
template <typename T, typename K>
bool OctoTree<T, K>::InsertNode(std::unique_ptr<Node>& node, Node*& rSlot, Box cell) {
    Node** slot = &rSlot;
    while (*slot != nullptr) {
        Node& held = **slot;
        Box subCell;
        const int octant = Classify(node->moPoint, held.moBox, subCell);
        if (held.IsLeaf()) {
            if (IsTwin(node->moPoint, held.moPoint))
                return false;
            Box heldCell;
            const bool together = octant == Classify(held.moPoint, held.moBox, heldCell);
            const auto same = [](const Point& p, const Point& q) {
                return p.x == q.x && p.y == q.y && p.z == q.z;
            };
            // A half that is the whole cell again would be halved without end.
            if (together && same(subCell.min, held.moBox.min) &&
                same(subCell.max, held.moBox.max)) {
                ++mnPointCount;
                return true;
            }
            Split(held);
        }
        slot = &held.mpoChild[octant];
        cell = subCell;
    }
    node->moBox = cell;
    *slot = node.release();
    ++mnPointCount;
    return true;
}

template <typename T, typename K>
bool OctoTree<T, K>::IsInsideNode(const Point& point, const Node* node) {
    return node != nullptr && point.x >= node->moBox.min.x && node->moBox.max.x >= point.x &&
           point.y >= node->moBox.min.y && node->moBox.max.y >= point.y &&
           point.z >= node->moBox.min.z && node->moBox.max.z >= point.z;
}

template <typename T, typename K>
typename OctoTree<T, K>::Node* OctoTree<T, K>::FindLeaf(const Point& point) const {
    Node* node = mpoRoot;
    while (IsInsideNode(point, node)) {
        if (node->IsLeaf())
            return node;
        node = node->mpoChild[GetOctant(point, *node)];
    }
    return nullptr;
}

template <typename T, typename K>
const typename OctoTree<T, K>::Node* OctoTree<T, K>::FindTwin(const Point& point) const {
    const Node* twin = nullptr;
    FindTwinBelow(mpoRoot, point, twin);
    return twin;
}

template <typename T, typename K>
void OctoTree<T, K>::FindTwinBelow(const Node* node, const Point& point, const Node*& twin) {
    // Twice the tolerance, so that no rounding of a bound hides a twin.
    const auto reaches = [](T v, T low, T high) {
        return v >= low - T(2) * TOLERANCE && v <= high + T(2) * TOLERANCE;
    };
    if (node == nullptr || !reaches(point.x, node->moBox.min.x, node->moBox.max.x) ||
        !reaches(point.y, node->moBox.min.y, node->moBox.max.y) ||
        !reaches(point.z, node->moBox.min.z, node->moBox.max.z))
        return;
    if (node->IsLeaf()) {
        if (IsTwin(node->moPoint, point) && (twin == nullptr || node->mnKey < twin->mnKey))
            twin = node;
        return;
    }
    for (const Node* child : node->mpoChild)
        FindTwinBelow(child, point, twin);
}

template <typename T, typename K>
void OctoTree<T, K>::DeleteNode(Node*& slot) {
    if (slot == nullptr)
        return;
    for (Node*& child : slot->mpoChild)
        DeleteNode(child);
    delete slot;
    slot = nullptr;
}

} // namespace kelm::containers
