#pragma once

#include "services/bundled/store/landxml/document/document.h"

#include <string>

namespace kelm::store::landxml {

/// Makes the CRS of a document. Coordinates and heights are in the linear unit of the document,
/// whatever unit its CRS has: if the two differ, the CRS is changed to that unit, with a warning.
/// A vertical CRS stands in it if the document names one. If it does not, and the unit is not the
/// metre, EGM96 height in that unit stands there, which is what a CRS without heights stands for.
/// Warns of what the document names and PROJ does not know. @param file name for messages
/// @return the CRS as WKT2:2019; empty if the document names none that is known
std::string CreateCrsText(const Document& document, const std::string& file);

} // namespace kelm::store::landxml
