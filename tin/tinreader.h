#pragma once

#include "containers/keypoint.h"
#include "services/crs.h"
#include "services/mutex.h"
#include "tin/bbox.h"
#include "tin/loadoptions.h"
#include "tin/point.h"
#include "tin/tin.h"
#include "tin/tinexport.h"

#include <cstddef>
#include <string>
#include <vector>

class InterpGrid3D;
struct ProjInfo_t;
struct ZARLayer_t;

namespace kelm::tin {

namespace load {
class Welder;
struct ElevationFactor;
struct HeightColumn;
struct Welded;
} // namespace load

/// Reads surfaces from the polygon layer of a file.
///
/// A reader keeps its file open for its whole life. It knows the layer's count, extents and CRS
/// from construction on. Each Load walks the layer afresh and makes a new surface, which does not
/// depend on the reader. A stored height first gets the elevation factor; then it is changed from
/// the source to the output vertical datum.
///
/// Loads on one reader run one after the other, whatever threads ask for them. The accessors and
/// estimates may run during a load; SetOutputVerticalDatum and the destructor may not. Readers
/// share nothing, so different ones may be used on different threads.
class KELM_TIN_EXPORT TinReader {
  public:
    using DatumType = ogc::cs::DatumType;

    /// Usually called by TinReaderFactory::CreateTinReader.
    /// @param poLayer taken over, with its file, unless the constructor throws. If it is null, the
    /// reader loads nothing @param dfOffset,dfScale elevation factor: a stored height h counts as
    /// (h + dfOffset) * dfScale; both finite @param eSourceDatum vertical datum of the stored
    /// heights, and the first output datum
    /// @throw kelm::ParameterException if dfScale is zero, the datum is not a vertical one or the
    /// layer's CRS is not two-dimensional; what the store and the reference services throw
    TinReader(ZARLayer_t*& poLayer, const double& dfOffset, const double& dfScale,
              DatumType eSourceDatum);
    TinReader(const TinReader&) = delete;
    /// Refused: two readers cannot own one file.
    TinReader& operator=(const TinReader&) = delete;
    /// Closes the file.
    virtual ~TinReader();

    /// Loads the layer, or those of its polygons that meet a window.
    ///
    /// A shape of four vertices is a triangle as it stands. A larger one is cut into triangles, or
    /// left out with a warning that names it. Corners that agree within 1e-9 map units on all three
    /// axes become one vertex. A shape that meets the window enters whole. A corner that is not
    /// finite is never welded. Different corners beyond 2^53 map units may stay apart.
    /// @param poWindow in the map coordinates of the layer; null for the whole layer
    /// @return a new surface, which the caller deletes; null if no polygon gave a triangle
    /// @throw kelm::DataException for a shape of fewer than four vertices or heights that cannot be
    /// converted; kelm::Exception if welding fails; std::length_error beyond 2147483647 corners,
    /// which are 715827882 triangles; what the store throws; std::bad_alloc. The reader stays
    /// usable
    Tin* Load(const BBox<double, point2_t<double>>* poWindow);
    /// Loads as told by options. A note tells if the base lies so far from the surface that
    /// neighbouring positions there are more than 0.001 map units apart.
    /// @throw kelm::ParameterException if the base is not finite; CancelledException if the
    /// progress function stops the load, and what that function throws; else as the other Load
    Tin* Load(const BBox<double, point2_t<double>>* poWindow, const LoadOptions& oOptions);

    /// Chooses the vertical datum in which later loads deliver heights. Heights of a local CRS are
    /// never transformed, whatever the datums; a warning says so.
    /// @throw kelm::ParameterException if the code is not in 2000 to 2999, or if just one of source
    /// and output is VD_Other; what the reference services throw, for example if a grid file is not
    /// installed. The reader then keeps its former output datum
    void SetOutputVerticalDatum(DatumType eType);

    /// @return what opening found out about the layer, as bytes that travel: with them
    /// TinReaderFactory::CreateTinReader opens the same layer of the same unchanged file without
    /// reading it. Empty if the services keep no surveys, or the format has none. Runs after a load
    /// that another thread has begun
    std::string GetSurvey() const;
    /// @return a bound on the number of shapes that meet a window, without a look into the file;
    /// all shapes if the services cannot tell. May run during a load
    int EstimateShapeCount(const BBox<double, point2_t<double>>& oWindow) const;
    /// @return number of shapes of the layer
    int GetShapeCount() const { return mnShapeCount; }
    /// Extents of the whole layer in map coordinates, heights as stored. Load tests its window
    /// against them.
    BBox<double, point3_t<double>>& GetBBox() { return moBBox; }
    const BBox<double, point3_t<double>>& GetBBox() const { return moBBox; }
    /// @return area of the extents in plan, in squared map units
    double GetArea() const;
    /// @return the CRS of the layer as text, as the store has it: the bundled one gives PROJJSON.
    /// Empty if the layer has none. Runs after a load that another thread has begun
    std::string GetCRSText() const;
    /// @return the two-dimensional CRS; the reader remains its owner
    ogc::cs::ICRS* GetCRS() const { return mpoCRS; }
    /// @return the CRS with the source vertical datum; the reader remains its owner
    const ogc::cs::ICRS* Get3DCRS() const { return mpo3DCRS; }
    DatumType GetSourceVerticalDatum() const { return meSourceDatum; }
    DatumType GetOutputVerticalDatum() const { return meOutputDatum; }

    /// @return estimated peak of the working memory of a load of the whole layer, in bytes. All
    /// three estimates assume one triangle a shape and 1.5 vertices a triangle
    std::size_t EstimateLoadBytes() const;
    /// @return estimated bytes of the octree that welds the corners
    std::size_t EstimateObjBytes_Octree() const;
    /// @return estimated bytes of the surface
    std::size_t EstimateObjBytes_Tin() const;

  protected:
    /// Takes the CRS over, unless it throws, and joins it with the source datum.
    void SetDbmCRS(ogc::cs::ICRS* poCRS);
    /// Stores the elevation factor. @throw kelm::ParameterException if dfScale is zero
    void SetElFactor(const double dfOffset, const double dfScale);
    double ApplyElFactor(float h) const;
    double CopyHeight(float h) const;

    /// Makes a surface of corners and index triples: welds, renumbers, narrows, converts heights.
    /// @return null if a list is empty; else both lists are empty afterwards
    Tin* CreateTin(std::vector<containers::KeyPoint<double>>& oPoints,
                   std::vector<Triangle_Id>& oIds);

    /// Brings the heights of a new surface's vertices into the output datum, in place; x and y
    /// stay.
    /// @param poWindow box of the surface, surface-local; not read by HeightConvertSimple
    /// @return false, always @throw what the transform or the grid throws
    bool HeightConvert(const aabb_t<point2_t<float>>* poWindow, point3_t<float>* poPoints,
                       unsigned int nCount) const;
    /// Applies the elevation factor alone.
    bool HeightConvertSimple(const aabb_t<point2_t<float>>* poWindow, point3_t<float>* poPoints,
                             unsigned int nCount) const;
    /// Sends every vertex through the transform.
    bool HeightConvertFewPoints(point3_t<float>* poPoints, unsigned int nCount) const;
    /// Sends a grid over the window through the transform and interpolates each vertex in it.
    bool HeightConvertManyPoints(const aabb_t<point2_t<float>>* poWindow, point3_t<float>* poPoints,
                                 unsigned int nCount) const;
    /// Lays out a new grid over the window, with a spacing of 100 map units within the limits of
    /// InterpGrid3D, and fills it with heights in the output datum.
    void BuildInterpGridForWindow(const aabb_t<point2_t<float>>* poWindow, float fZMin, float fZMax,
                                  InterpGrid3D& oGrid) const;

  private:
    using HeightFunction = bool (TinReader::*)(const aabb_t<point2_t<float>>*, point3_t<float>*,
                                               unsigned int) const;

    void Init();
    void SetUp(double dfOffset, double dfScale);
    void ReleaseCRS();
    void ReadShape(int id, const BBox<double, point2_t<double>>* poWindow,
                   load::Welder& rCorners) const;
    load::ElevationFactor GetElevationFactor() const;
    Tin* AssembleTin(load::Welded& rWelded, const LoadOptions& oOptions);
    load::HeightColumn GetColumn(point3_t<float>* poPoints, unsigned int nCount) const;

    ZARLayer_t* mpLayer;
    int mnShapeCount = 0;
    BBox<double, point3_t<double>> moBBox;
    DatumType meSourceDatum;
    DatumType meOutputDatum;
    ogc::cs::ICRS* mpoCRS = nullptr;
    ogc::cs::ICRS* mpo3DCRS = nullptr;
    ogc::cs::ICRS* mpoOutput3DCRS = nullptr;
    ogc::ct::IMathTransform* mpoTransform = nullptr;
    bool mbLocalCRS = true;
    threading::Mutex moMutex;
    HeightFunction mpfnHeightConvert = &TinReader::HeightConvertSimple;
    double mdfElOffset = 0.0;
    double mdfElScale = 1.0;
    double mdfXBase = 0.0;
    double mdfYBase = 0.0;
};

} // namespace kelm::tin
