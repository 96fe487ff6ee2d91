#pragma once

#include "services/crs.h"
#include "tin/openoptions.h"
#include "tin/tinexport.h"

namespace kelm::tin {

class TinReader;

/// Opens files for reading surfaces. Has no state; safe to use from any thread.
class KELM_TIN_EXPORT TinReaderFactory {
  public:
    TinReaderFactory& operator=(const TinReaderFactory&) { return *this; }

    /// Opens a polygon layer of a file.
    /// @param pszFilename path of the file @param nLayer number of the layer from 1 on; below 1 for
    /// the one that the store takes first: the bundled one takes the first that holds polygons
    /// @param dfOffset,dfScale elevation factor: a stored height h counts as
    /// (h + dfOffset) * dfScale; both finite
    /// @param eSourceDatum vertical datum of the stored heights
    /// @return a new reader, never null; the caller deletes it
    /// @throw kelm::ParameterException if offset or scale is not finite; kelm::DataException if the
    /// file cannot be opened, or the layer does not exist, is empty or holds no polygons; what the
    /// constructor of TinReader throws. The file is closed then. If the file cannot be opened, the
    /// exception of the store is nested in the one thrown: std::rethrow_if_nested gives it, and its
    /// text is the reason
    static TinReader* CreateTinReader(const char* pszFilename, const int nLayer,
                                      const double dfOffset, const double dfScale,
                                      const ogc::cs::DatumType eSourceDatum);
    /// The same, as told by options. With a survey, nLayer below 1 means the layer of the survey.
    /// @throw kelm::DataException if the survey is not one of this layer of the file as it is now,
    /// or the services take none; CancelledException if the progress function stops the opening,
    /// and what that function throws
    static TinReader* CreateTinReader(const char* pszFilename, const int nLayer,
                                      const double dfOffset, const double dfScale,
                                      const ogc::cs::DatumType eSourceDatum,
                                      const OpenOptions& oOptions);
};

} // namespace kelm::tin
