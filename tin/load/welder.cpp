#include "tin/load/welder.h"

#include "services/memory/largepages.h"

#include <algorithm>
#include <stdexcept>

namespace kelm::tin::load {

namespace {

constexpr std::size_t MOST_CORNERS = 2147483647;

/// Least triangles by which a list grows: a layer of triangles never grows beyond its shapes.
constexpr std::size_t STEP = 5000;

/// Makes room by a fixed step, since the first reservation fits a layer of triangles.
template <typename T>
void MakeRoom(std::vector<T>& list, std::size_t count, std::size_t step) {
    if (list.size() + count > list.capacity())
        memory::ReserveLarge(list, list.capacity() + std::max(count, step));
}

} // namespace

/// Room that is reserved costs nothing until it is used, but a table of the hash is filled at once.
/// That of a part grows with it.
Welder::Welder(int shapeCount, bool isPart)
    : mpoHash(std::make_unique<CornerHash>(isPart ? 0 : 3 * static_cast<std::size_t>(shapeCount))) {
    memory::ReserveLarge(moIds, static_cast<std::size_t>(shapeCount));
}

Welded Welder::Finish() {
    TakeWaiting();
    if (mpoHash)
        return {std::move(mpoHash->GetKept()), std::move(moIds)};
    memory::ReserveLarge(moIds, moPoints.size() / 3);
    for (std::uint32_t i = 0; i < moPoints.size(); i += 3)
        moIds.push_back({i, i + 1, i + 2});
    return WeldByOctree(moPoints, moIds);
}

void Welder::TakeWaiting() {
    TestCount();
    if (mpoHash)
        Hash();
    else
        HoldWaiting();
    mnWaiting = 0;
}

void Welder::TestCount() const {
    if (3 * (moIds.size() + mnWaiting) + moPoints.size() > MOST_CORNERS)
        throw std::length_error("the corners of a load are limited to 2147483647");
}

void Welder::Hash() {
    std::array<std::uint32_t, 3 * MOST_WAITING> numbers;
    if (mpoHash->Add(maWaiting.data(), 3 * mnWaiting, numbers.data()) < 3 * mnWaiting) {
        Unfold();
        return HoldWaiting();
    }
    MakeRoom(moIds, mnWaiting, STEP);
    for (std::size_t i = 0; i < 3 * mnWaiting; i += 3)
        moIds.push_back({numbers[i], numbers[i + 1], numbers[i + 2]});
}

/// Gives each triangle three corners of its own again. Those that were equal have the same bits
/// now, or differ in the sign of a zero, which the octree does not look at.
void Welder::Unfold() {
    const std::vector<Point>& kept = mpoHash->GetKept();
    memory::ReserveLarge(moPoints, 3 * std::max(moIds.capacity(), moIds.size() + mnWaiting));
    for (const Triangle_Id& id : moIds)
        for (const std::uint32_t corner : {id.id0, id.id1, id.id2})
            moPoints.push_back(kept[corner]);
    mpoHash.reset();
    moIds.clear();
}

void Welder::HoldWaiting() {
    MakeRoom(moPoints, 3 * mnWaiting, 3 * STEP);
    moPoints.insert(moPoints.end(), maWaiting.data(), maWaiting.data() + 3 * mnWaiting);
}

} // namespace kelm::tin::load
