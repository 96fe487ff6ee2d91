#pragma once

#include "tin/parallel/parallelscan.h"
#include "tin/rules/highest.h"

#include <algorithm>
#include <vector>

namespace kelm::tin::index {

/// Keeps everything.
struct KeepAll {
    bool operator()(unsigned) const { return true; }
};

/// A search among the triangles of a surface: by an index or, without one, by a scan on any number
/// of threads. An index without a root leads to no triangle.
template <typename Tree>
class Search {
  public:
    /// @param tree null for a scan @param most threads that a scan may run on
    Search(const Tree* tree, unsigned count, int most)
        : mpoTree(tree), mnTriangles(count), mnMost(most) {}

    /// Lists triangles. By an index: what findLeaves(root, list) appends, in its order; the whole
    /// list is then put to keepsLeaf(id). By a scan: those that pass keeps(id) are appended,
    /// ascending.
    /// @param filter cheap; passes whatever passes keeps
    template <typename FindLeaves, typename KeepsLeaf, typename Keeps,
              typename Filter = parallel::NoFilter>
    void List(const FindLeaves& findLeaves, const KeepsLeaf& keepsLeaf, const Keeps& keeps,
              std::vector<unsigned>& list, const Filter& filter = {}) const {
        if (mpoTree == nullptr)
            return Scan(keeps, list, filter);
        if (mpoTree->GetRoot() != nullptr)
            findLeaves(*mpoTree->GetRoot(), list);
        const auto fails = [&](unsigned id) { return !keepsLeaf(id); };
        list.erase(std::remove_if(list.begin(), list.end(), fails), list.end());
    }

    /// @return the greatest height. By an index that of walk(root, highest), where root may be
    /// null; by a scan that of ask(highest, id) for the triangles in rising order
    /// @param filter cheap; passes whatever ask can take a height from
    template <typename Walk, typename Ask, typename Filter = parallel::NoFilter>
    rules::Highest FindHighest(const Walk& walk, const Ask& ask, const Filter& filter = {}) const {
        rules::Highest highest;
        if (mpoTree != nullptr)
            walk(mpoTree->GetRoot(), highest);
        else
            for (const rules::Highest& part :
                 parallel::ParallelScan<rules::Highest>(mnTriangles, mnMost, filter, ask))
                highest.Add(part.Get());
        return highest;
    }

  private:
    template <typename Keeps, typename Filter>
    void Scan(const Keeps& keeps, std::vector<unsigned>& list, const Filter& filter) const {
        using List = std::vector<unsigned>;
        const auto keep = [&](List& found, unsigned id) {
            if (keeps(id))
                found.push_back(id);
        };
        for (const List& found : parallel::ParallelScan<List>(mnTriangles, mnMost, filter, keep))
            list.insert(list.end(), found.begin(), found.end());
    }

    const Tree* mpoTree;
    unsigned mnTriangles;
    int mnMost;
};

} // namespace kelm::tin::index
