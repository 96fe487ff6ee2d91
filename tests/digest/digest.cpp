#include "surfaces.h"

#include <tin/aabbtree.h>

#include <cstdio>

// Prints one digest of a million height answers over jittered sheets, and one of the answers to all
// other queries. The input is made of integers and of single IEEE operations, so it is the same on
// every machine; the answers have to be.

using namespace digest;
using kelm::tin::AabbTree;

namespace {

constexpr double BASE_X = 500000.25;
constexpr double BASE_Y = 4649776.5;

/// Asks in both frames in turn.
bool GetHeight(const Tin& tin, const AabbTree* tree, point2_t<float> p, bool isMap, float& height) {
    height = UNTOUCHED;
    if (isMap)
        return tin.GetHeight(BASE_X + static_cast<double>(p.x), BASE_Y + static_cast<double>(p.y),
                             height, tree);
    return tin.GetHeight(p.x, p.y, height, tree);
}

/// @return false if the tree and the scan disagree
bool AddAnswers(const Tin& tin, unsigned count, bool isScanned, Random& random, Digest& digest) {
    const AabbTree tree(&tin);
    for (unsigned i = 0; i < count; ++i) {
        const point2_t<float> p = MakePosition(tin, random);
        float height;
        const bool found = GetHeight(tin, &tree, p, i % 2 == 0, height);
        digest.AddAnswer(found, height);
        if (!isScanned)
            continue;
        float scanned;
        if (GetHeight(tin, nullptr, p, i % 2 == 0, scanned) != found ||
            std::memcmp(&scanned, &height, sizeof height) != 0) {
            std::fprintf(stderr, "tree and scan disagree at %a, %a\n", static_cast<double>(p.x),
                         static_cast<double>(p.y));
            return false;
        }
    }
    return true;
}

void Print(const Digest& digest, const char* answers, const char* hits) {
    std::printf("%016llx of %u %s, %u %s\n", static_cast<unsigned long long>(digest.value),
                digest.count, answers, digest.hits, hits);
}

} // namespace

int main() {
    Random random;
    Digest heights;
    const Tin small = MakeSheet(32, BASE_X, BASE_Y, random);
    const Tin large = MakeSheet(224, BASE_X, BASE_Y, random);
    if (!AddAnswers(small, 20000, true, random, heights) ||
        !AddAnswers(large, 980000, false, random, heights))
        return 1;
    Print(heights, "answers", "heights");
    Print(AskEverything(), "other answers", "found");
    return 0;
}
