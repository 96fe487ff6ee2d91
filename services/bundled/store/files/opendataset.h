#pragma once

#include "services/bundled/store/files/dataset.h"

#include <memory>
#include <string>

namespace kelm::store {

/// Opens a file of the file system. @param name path of a regular file, or of a folder *.gdb;
/// anything else that GDAL would take for a name, such as inline text, is refused before GDAL sees
/// it. @return never null. @throw kelm::DataException that tells the name and what was expected
std::unique_ptr<Dataset> OpenFile(const char* name);

/// Opens whatever GDAL understands by a name, if one of the formats takes it. OpenFile ends here,
/// after its tests of the path; a program that tests the store can open bytes in memory. Not
/// exported. @param shownName name for messages. @return never null. @throw kelm::DataException
std::unique_ptr<Dataset> OpenDataset(const std::string& gdalName, const std::string& shownName);

} // namespace kelm::store
