#pragma once

#include "services/bundled/store/landxml/document/surface.h"

#include <istream>
#include <string>
#include <vector>

namespace kelm::store::landxml {

/// What a document says of its CRS; what it does not say is empty.
struct CrsRecord {
    std::string moCode; ///< attribute `epsgCode`
    std::string moWkt;  ///< attribute `ogcWktCode`
    std::string moName;
    std::string moVertical; ///< name of the vertical CRS or datum
};

/// What the store needs of a LandXML document.
struct Document {
    std::vector<Surface> moSurfaces; ///< the TIN surfaces, in the file's order
    std::string moLinearUnit;        ///< as the file writes it: "meter"; empty if it names none
    CrsRecord moCrs;
};

/// Reads a LandXML document, versions 1.0 to 2.0. Warns of damaged records, and of surfaces that
/// are no TIN. @param file name for messages
/// @throw kelm::DataException if the document is no XML, is not complete or has no TIN surface
Document ReadDocument(std::istream& stream, const std::string& file);

} // namespace kelm::store::landxml
