#include "services/bundled/reference/proj/steps.h"

#include <algorithm>
#include <vector>

namespace kelm::ogc {

namespace {

constexpr const char* SEPARATOR = " +step ";
constexpr const char* HORIZONTAL_SHIFT = "proj=hgridshift";
constexpr const char* VERTICAL_SHIFT = "proj=vgridshift";
constexpr const char* INVERSE = "+inv ";

using Steps = std::vector<std::string>;

bool Contains(const std::string& text, const char* part) {
    return text.find(part) != std::string::npos;
}

Steps Split(const std::string& text) {
    const std::string separator = SEPARATOR;
    Steps steps;
    std::size_t from = 0;
    for (std::size_t at = 0; (at = text.find(separator, from)) != std::string::npos;
         from = at + separator.size())
        steps.push_back(text.substr(from, at - from));
    steps.push_back(text.substr(from));
    return steps;
}

std::string Join(const Steps& steps) {
    std::string text = steps.front();
    for (std::size_t i = 1; i < steps.size(); ++i)
        text += SEPARATOR + steps[i];
    return text;
}

/// @return the step without the words that tell its direction
std::string GetBare(std::string step) {
    for (const std::string word : {INVERSE, " +omit_fwd", " +omit_inv"})
        if (const std::size_t at = step.find(word); at != std::string::npos)
            step.erase(at, word.size());
    return step;
}

bool AreOpposite(const std::string& a, const std::string& b) {
    return Contains(a, INVERSE) != Contains(b, INVERSE) && GetBare(a) == GetBare(b);
}

/// Removes the step at `first` and its opposite, if it is a shift that has one.
bool RemovePair(Steps& steps, Steps::iterator first) {
    if (!Contains(*first, HORIZONTAL_SHIFT))
        return false;
    const auto second = std::find_if(
        first + 1, steps.end(), [&](const std::string& step) { return AreOpposite(*first, step); });
    if (second == steps.end())
        return false;
    steps.erase(second);
    steps.erase(first);
    return true;
}

/// Removes the saving of a position at `first` and its restoring, if no step between moves it.
bool RemoveSaving(Steps& steps, Steps::iterator first) {
    if (*first != "+proj=push +v_1 +v_2")
        return false;
    const auto second = std::find_if_not(first + 1, steps.end(), [](const std::string& step) {
        return Contains(step, VERTICAL_SHIFT);
    });
    if (second == steps.end() || *second != "+proj=pop +v_1 +v_2")
        return false;
    steps.erase(second);
    steps.erase(first);
    return true;
}

/// Removes what `remove` finds from each step on, until it finds nothing.
void RemoveAll(Steps& steps, bool (*remove)(Steps&, Steps::iterator)) {
    for (std::size_t i = 0; i < steps.size();)
        if (!remove(steps, steps.begin() + static_cast<std::ptrdiff_t>(i)))
            ++i;
}

} // namespace

std::string RemoveCancelledShifts(const std::string& text) {
    Steps steps = Split(text);
    RemoveAll(steps, RemovePair);
    RemoveAll(steps, RemoveSaving);
    return Join(steps);
}

bool HasHorizontalShift(const std::string& steps) {
    return Contains(steps, HORIZONTAL_SHIFT);
}

bool HasSpatialShift(const std::string& steps) {
    return Contains(steps, "proj=helmert") || Contains(steps, "proj=molo") ||
           Contains(steps, "proj=xyzgridshift");
}

} // namespace kelm::ogc
