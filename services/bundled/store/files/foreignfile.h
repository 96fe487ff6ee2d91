#pragma once

namespace kelm::store {

/// Tells how to convert a file of a format that no driver reads and that surfaces are often kept
/// in: CityJSON, and the folder that an Esri TIN is. To be called when a file was refused.
/// @param name may be null. @throw kelm::DataException if the file is one of these
void RefuseForeignFile(const char* name);

} // namespace kelm::store
