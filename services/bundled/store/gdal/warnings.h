#pragma once

#include <cstdint>
#include <map>
#include <string>

namespace kelm::store {

/// Texts of warnings, each with the number of times it was given: a driver can warn of every facet
/// in the same words.
using Warnings = std::map<std::string, std::int64_t>;

/// Adds a warning. Beyond a thousand different texts, further ones are only counted, together.
void AddWarning(Warnings& warnings, const std::string& text, std::int64_t times);

/// Gives the warnings to the reporting. Must be called when no GdalCall lives on this thread: it
/// would catch them. @param subject what was being read
void PassOn(const Warnings& warnings, const std::string& subject);

} // namespace kelm::store
