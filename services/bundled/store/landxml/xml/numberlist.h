#pragma once

#include <algorithm>
#include <array>
#include <charconv>
#include <string_view>

namespace kelm::store::landxml {

/// Reads numbers that white space separates, in the form of XML: no locale changes it.
/// @param values filled from the first on. @return how many there are; -1 if there are more than
/// `values` holds, or anything else than numbers that this type holds
template <class Number, std::size_t MOST>
int ReadNumbers(std::string_view text, std::array<Number, MOST>& values) {
    constexpr const char* SPACE = " \t\r\n";
    int count = 0;
    while (true) {
        text.remove_prefix(std::min(text.find_first_not_of(SPACE), text.size()));
        if (text.empty())
            return count;
        if (count == static_cast<int>(MOST))
            return -1;
        text.remove_prefix(text.front() == '+');
        const char* const end = text.data() + std::min(text.find_first_of(SPACE), text.size());
        const auto [next, error] =
            std::from_chars(text.data(), end, values[static_cast<std::size_t>(count)]);
        if (error != std::errc() || next != end)
            return -1;
        text.remove_prefix(static_cast<std::size_t>(end - text.data()));
        ++count;
    }
}

} // namespace kelm::store::landxml
