#pragma once

#include <string>

namespace kelm::store {

/// @return a message of GDAL without the sentences that advise an option of GDAL which the store
/// sets itself, or which would make rings of what is none
std::string StripAdvice(const std::string& text);

} // namespace kelm::store
