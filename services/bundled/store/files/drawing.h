#pragma once

#include <string>

namespace kelm::store {

/// Looks through a DXF drawing, up to the end of its entities, for what GDAL's reader does not
/// stand: a zero byte, or a last line that ends in a carriage return alone, on which it reads for
/// ever. Group codes that are no numbers are found too, of which GDAL makes other entities than
/// were meant, and the binary form of the format.
///
/// What it does not tell: values that mean nothing, and how long GDAL reads. A drawing can insert a
/// block a billion times.
/// @param name as GDAL understands it. @return what is wrong, with the number of the line; empty if
/// nothing is, or the file cannot be opened
std::string FindDrawingFault(const std::string& name);

} // namespace kelm::store
