#pragma once

#include "tin/heightgrid/batch/edges4.h"
#include "tin/heightgrid/record.h"
#include "tin/rules/barycentric.h"
#include "tin/rules/exactplan.h"
#include "tin/rules/highest.h"

#include <algorithm>
#include <cstdint>

namespace kelm::tin::heightgrid {

/// A position that is put to the triangles of lists.
class RecordProbe {
  public:
    RecordProbe(float x, float y) : mfX(x), mfY(y) {}

    /// Adds the heights of the triangles of a list that hold the position, in the list's order.
    void Ask(const Record& record, rules::Highest& highest) const {
#ifdef __SSE2__
        AskGroups(record, highest);
#else
        for (unsigned i = 0; i < record.nTriangles; ++i)
            AskTriangle(record, i, highest);
#endif
    }
    /// The same by the closed rule.
    void AskClosed(const Record& record, rules::Highest& highest) const {
#ifdef __SSE2__
        std::uint64_t left = FindCandidates(record, [](const Corners4& c, __m128 x, __m128 y) {
            return _mm_andnot_ps(MakeEdges(c).Exclude(x, y), MakeBoxes(c).Holds(x, y));
        });
        for (; left != 0; left &= left - 1)
            AskTriangleClosed(record, static_cast<unsigned>(__builtin_ctzll(left)), highest);
#else
        for (unsigned i = 0; i < record.nTriangles; ++i)
            AskTriangleClosed(record, i, highest);
#endif
    }

  private:
    struct Corners {
        Corners(const Record& record, unsigned triangle)
            : v0(record.GetVertex(triangle, 0)), v1(record.GetVertex(triangle, 1)),
              v2(record.GetVertex(triangle, 2)) {}
        point3_t<float> v0;
        point3_t<float> v1;
        point3_t<float> v2;
    };

    /// A box is the least and the greatest coordinate of the vertices, none of which is a NaN.
    bool IsInBox(const Corners& c) const {
        return mfX >= std::min({c.v0.x, c.v1.x, c.v2.x}) &&
               std::max({c.v0.x, c.v1.x, c.v2.x}) >= mfX &&
               mfY >= std::min({c.v0.y, c.v1.y, c.v2.y}) &&
               std::max({c.v0.y, c.v1.y, c.v2.y}) >= mfY;
    }

    void AskTriangleClosed(const Record& record, unsigned triangle, rules::Highest& highest) const {
        const Corners corners(record, triangle);
        float h;
        if (IsInBox(corners) &&
            rules::GetClosedHeight(corners.v0, corners.v1, corners.v2, {mfX, mfY}, h))
            highest.Add(h);
    }

#ifdef __SSE2__
    /// One bit a triangle, by a test that makes a mask of four of them.
    template <typename Test>
    std::uint64_t FindCandidates(const Record& record, const Test& test) const {
        const __m128 x = _mm_set1_ps(mfX);
        const __m128 y = _mm_set1_ps(mfY);
        std::uint64_t found = 0;
        const unsigned groups = record.GetGroupCount();
        for (unsigned i = 0; i < groups; ++i) {
            const auto bits =
                static_cast<unsigned>(_mm_movemask_ps(test(Corners4(record, i), x, y)));
            found |= std::uint64_t{bits} << (4 * i);
        }
        const unsigned unused = 64U - record.nTriangles;
        return unused < 64U ? found << unused >> unused : 0;
    }

    /// Most triangles are told by their numerators, which the others need again.
    void AskGroups(const Record& record, rules::Highest& highest) const {
        Group groups[Record::MOST_TRIANGLES / 4];
        Group* group = groups;
        std::uint64_t found =
            FindCandidates(record, [&group](const Corners4& corners, __m128 x, __m128 y) {
                const Edges4 edges = MakeEdges(corners);
                *group = {edges.Weigh(x, y), edges.size};
                const __m128 isHeld = TestWeights(group->oWeights, GetMostOfSum(edges.size));
                ++group;
                return _mm_andnot_ps(edges.IsFlat(), isHeld);
            });
        for (; found != 0; found &= found - 1) {
            const auto triangle = static_cast<unsigned>(__builtin_ctzll(found));
            AddWeighted(record, triangle, groups[triangle / 4], highest);
        }
    }

    struct Group {
        Weights4 oWeights;
        __m128 size;
    };
    void AddWeighted(const Record& record, unsigned triangle, const Group& group,
                     rules::Highest& highest) const {
        const Corners c(record, triangle);
        if (!IsInBox(c))
            return;
        const auto get = [&](const __m128& v) {
            return rules::Widen(reinterpret_cast<const float*>(&v)[triangle % 4]);
        };
        double l0 = get(group.oWeights.w0);
        double l1 = get(group.oWeights.w1);
        double l2;
        if (rules::DivideWeights(get(group.size), l0, l1, l2))
            highest.Add(rules::GetWeightedHeight(c.v0.z, c.v1.z, c.v2.z, l0, l1, l2));
    }
#else
    void AskTriangle(const Record& record, unsigned triangle, rules::Highest& highest) const {
        const Corners corners(record, triangle);
        rules::Barycentric barycentric(corners.v0, corners.v1, corners.v2);
        if (!IsInBox(corners) || barycentric.IsFlat())
            return;
        barycentric.SetRow(mfY);
        double l0;
        double l1;
        double l2;
        if (barycentric.GetWeights(mfX, l0, l1, l2))
            highest.Add(
                rules::GetWeightedHeight(corners.v0.z, corners.v1.z, corners.v2.z, l0, l1, l2));
    }
#endif

    float mfX;
    float mfY;
};

} // namespace kelm::tin::heightgrid
