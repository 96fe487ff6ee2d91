#pragma once

#include "services/servicesexport.h"

/// Contract of the coordinate reference services: CRS objects and the transform between them.
///
/// An operation that cannot deliver its result throws; the library does not test what the functions
/// of this header return. An object is used by one thread at a time; different objects may be used
/// on different threads.

struct ProjInfo_t;

namespace kelm::ogc::cs {

/// Datum types, by the numeric codes of the OGC Coordinate Transformation Services
/// (`CS_DatumType`). The vertical datums are the range 2000 to 2999.
enum DatumType : int {
    VD_Other = 2000,       ///< heights of no known vertical reference; never converted
    VD_Orthometric = 2001, ///< heights above the geoid
    VD_Ellipsoidal = 2002  ///< heights above the ellipsoid
};

/// Unit of the heights of a compound CRS.
enum LinearUnitType : int {
    LU_Default = 0 ///< the unit of the height axis of the layer's own CRS, else metres
};

/// A coordinate reference system.
class KELM_SERVICES_EXPORT ICRS {
  public:
    virtual ~ICRS();
    /// @return the number of axes; 2 for a map CRS
    virtual int GetDimension() const = 0;
    /// @return the horizontal part; owned by this object
    virtual ICRS* GetHorizontalCRS() const = 0;
};

} // namespace kelm::ogc::cs

namespace kelm::ogc::ct {

/// A transform of points from one CRS to another.
class KELM_SERVICES_EXPORT IMathTransform {
  public:
    virtual ~IMathTransform();
    /// Transforms points. @param source nCount triples x, y, z, with x as easting or longitude
    /// @param target nCount triples in an array that does not overlap the source; z is the height
    /// in the target CRS. After a throw its contents mean nothing
    /// @return true; not relied on. @throw if any point cannot be transformed, telling how many
    /// cannot and where the first of them is
    virtual bool TransformPoints(const double* source, double* target, unsigned int nCount) = 0;
};

} // namespace kelm::ogc::ct

namespace kelm::ogc {

/// Kind of a projection engine.
enum PEType : int { PE_Default = 3 };

/// Maker of CRS objects.
class KELM_SERVICES_EXPORT IProjInfoFactory {
  public:
    /// @param poInfo the record that the vector layer store filled
    /// @return the two-dimensional CRS of the layer, which also knows the layer's vertical CRS; the
    /// caller owns it. A record without a CRS gives a local one. @throw if the record's CRS cannot
    /// be read or has no map coordinates. The bundled store leaves the record empty if GDAL cannot
    /// read the CRS of the layer
    virtual cs::ICRS* CreateCRS(ProjInfo_t* poInfo) = 0;

  protected:
    ~IProjInfoFactory();
};

/// Entry to the coordinate reference services.
class KELM_SERVICES_EXPORT ProjectionEngine {
  public:
    /// @return the factory; not to be released. Safe to call from any thread
    static IProjInfoFactory* GetProjInfoFactory(const PEType& eType);
};

namespace utils {

/// @return true if the CRS is a local one, to which no datum change applies: no CRS at all (null
/// included), or that of a site with no stated place on the earth
KELM_SERVICES_EXPORT bool IsCRSLocal(const cs::ICRS* poCRS);

/// Joins a horizontal CRS and a vertical datum. @param poHorizontal stays with the caller
/// @param eDatum VD_Ellipsoidal, or VD_Orthometric; with a local CRS any code. VD_Orthometric is
/// the vertical CRS that the layer itself names, else EGM96 height (EPSG:5773)
/// @param eUnit LU_Default
/// @return a new CRS of three dimensions; the caller owns it. @throw if there is no such CRS
KELM_SERVICES_EXPORT cs::ICRS* CreateCompoundCS(cs::ICRS* poHorizontal, cs::DatumType eDatum,
                                                cs::LinearUnitType eUnit);

/// Makes the transform between two CRSs of three dimensions. @param dfReserved always 0.0
/// @return a new transform, independent of both CRS objects; the caller owns it. Between equal CRSs
/// it changes no bit. Between different heights of local CRSs its TransformPoints throws
/// @throw if there is no transform of sufficient accuracy, 11 m or better by PROJ or unknown,
/// naming the grid files that are missing
KELM_SERVICES_EXPORT ct::IMathTransform*
CreateCRSTransform(const cs::ICRS* poSource, const cs::ICRS* poTarget, double dfReserved);

} // namespace utils
} // namespace kelm::ogc
