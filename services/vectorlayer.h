#pragma once

#include "services/servicesexport.h"

#include <string>

/// Contract of the vector layer store: files, layers, shapes and their vertices.
///
/// The library calls the one store that it is linked with. Calls that concern one file come from
/// one thread at a time; different files may be used on different threads. The store chooses which
/// formats it reads and how it numbers shapes.

/// An open file of the store. Opaque: only a store knows its contents.
struct _iobuf;

/// Segment type of vector layers. A segment is a numbered part of a file; one of this type is a
/// layer.
constexpr int ZAR_SEGMENT_VECTOR = 116;

/// One vertex of a shape: map coordinates and height as stored, in the units of the layer's CRS.
struct ZARVertex {
    double x;
    double y;
    double z;
};

/// One shape: one ring, whose last vertex repeats the first. A triangle has four vertices.
struct ZARShape {
    ZARVertex* vertices; ///< owned by the store
    int vertexCount;
};

/// An open layer. A store may keep more behind these two fields.
struct ZARLayer_t {
    int shapeCount;
    int shapeCountValid; ///< non-zero if shapeCount can be relied on
};

/// Spatial reference of a layer, as the store hands it to the coordinate reference services.
struct ProjInfo_t {
    /// The CRS as text; empty if the layer has none. The bundled services read WKT and PROJJSON,
    /// and the bundled store writes PROJJSON.
    std::string definition;
};

/// Opens a file for reading. @param mode always "r". @return never null; the caller ends it with
/// ZARClose. @throw any exception, if the file is missing, unreadable or of a format that the store
/// does not know
KELM_SERVICES_EXPORT _iobuf* ZAROpen(const char* name, const char* mode);

/// Closes a file and ends its layers; does nothing for null. Does not throw.
KELM_SERVICES_EXPORT void ZARClose(_iobuf* file);

/// @return the number of segments of this type; a null file has none
KELM_SERVICES_EXPORT int ZARSegCount(_iobuf* file, int type);

/// @param after a segment number, or 0 for the start. With 0 a store may skip segments without
/// polygons. @return the number of the next segment of this type, or 0 if there is none or the file
/// is null
KELM_SERVICES_EXPORT int ZARSegNext(_iobuf* file, int type, int after);

/// @return the layer of a segment, owned by the file; null if there is no such layer or the file is
/// null. @throw any exception, if the layer cannot be read
KELM_SERVICES_EXPORT ZARLayer_t* ZARGetLayer(_iobuf* file, int segment);

/// @param n always 0. @return 2 or 4 for a layer of polygons, 1 or 3 for one of points or lines
KELM_SERVICES_EXPORT int ZARGetLayerType(ZARLayer_t* layer, int n);

/// Fills `*info` with the spatial reference of the layer. @return 0; not relied on
KELM_SERVICES_EXPORT int ZARGetProjectionInfo(ZARLayer_t* layer, ProjInfo_t* info);

/// Fills both corners of the layer's extents: map coordinates, and heights as stored.
/// @return 0; not relied on
KELM_SERVICES_EXPORT int ZARGetExtents(ZARLayer_t* layer, ZARVertex* low, ZARVertex* high);

/// Optional. Tells which shapes the caller is going to ask for: those that share a point in plan
/// with a window. ZARGetNext may leave out any others until the next call, and need not. Shapes
/// that it gives come in their order and with their ids, and ZARGetShapeRef delivers any shape.
/// @param low,high corners of the window in map coordinates, of which only x and y count; both null
/// for all shapes, which must not throw
KELM_SERVICES_EXPORT KELM_SERVICES_OPTIONAL void
ZARSetWindow(ZARLayer_t* layer, const ZARVertex* low, const ZARVertex* high);

/// Optional. @return a bound on the number of shapes that share a point in plan with a window,
/// without a look into the file @param low,high as for ZARSetWindow, never null
KELM_SERVICES_EXPORT KELM_SERVICES_OPTIONAL int
ZARCountShapes(ZARLayer_t* layer, const ZARVertex* low, const ZARVertex* high);

/// Is told how far a long call is. @param done share of the work, from 0 to 1; never falls within
/// one call, and stays 0 as long as the store cannot tell @param data what ZARSetProgress was given
/// It may throw to stop the call. The store passes the exception on, and the file stays usable.
using ZARProgress = void (*)(double done, void* data);

/// Optional. Sets what is told how far ZARGetLayer is, some hundred times a call; null for nothing.
KELM_SERVICES_EXPORT KELM_SERVICES_OPTIONAL void ZARSetProgress(_iobuf* file, ZARProgress progress,
                                                                void* data);

/// Optional. @return what the store found out when it read the layer, as bytes for ZARSetSurvey;
/// empty if a survey would save nothing
KELM_SERVICES_EXPORT KELM_SERVICES_OPTIONAL std::string ZARGetSurvey(ZARLayer_t* layer);

/// Optional, and called before ZARGetLayer. Gives the store the survey of a layer, so that it need
/// not read the layer to open it. @param survey what ZARGetSurvey gave, in this process or another
/// @return the segment of the layer. @throw any exception, if the survey is not one of this file as
/// it is now
KELM_SERVICES_EXPORT KELM_SERVICES_OPTIONAL int ZARSetSurvey(_iobuf* file,
                                                             const std::string& survey);

/// Walks the shapes. @param id -1 or a shape id. @return the first id for -1, else the id behind
/// `id`; -1 at the end. @throw if the layer cannot be read on, or has no shape `id`
KELM_SERVICES_EXPORT int ZARGetNext(ZARLayer_t* layer, int id);

/// @return the shape, never null; owned by the store and good until the caller moves on to another
/// shape. @throw any exception, if this one shape cannot be delivered
KELM_SERVICES_EXPORT ZARShape* ZARGetShapeRef(ZARLayer_t* layer, int id);

/// @return the file that owns a layer
KELM_SERVICES_EXPORT _iobuf* ZARLayer2fp(ZARLayer_t* layer);
