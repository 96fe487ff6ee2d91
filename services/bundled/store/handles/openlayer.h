#pragma once

#include "services/vectorlayer.h"

#include <string>

namespace kelm::store {

/// An open layer as the store hands it out, whatever reads it. services/vectorlayer.h tells what
/// the questions mean.
class OpenLayer : public ZARLayer_t {
  public:
    OpenLayer() : ZARLayer_t{} {}
    OpenLayer(const OpenLayer&) = delete;
    OpenLayer& operator=(const OpenLayer&) = delete;
    virtual ~OpenLayer() = default;

    /// @return the first shape id, or -1
    virtual int GetFirst() = 0;
    /// @return the shape id behind `id`, or -1. @throw kelm::DataException if there is no shape
    /// `id`, or the layer has changed since it was opened
    virtual int GetBehind(int id) = 0;
    /// @return the shape, good until the next call for one. @throw kelm::DataException if there is
    /// no such shape or it cannot be delivered
    virtual ZARShape& GetShape(int id) = 0;

    /// Tells the window of the shapes that will be asked for. A layer that cannot make use of it
    /// walks over all shapes. @param low,high both null: all shapes
    virtual void SetWindow(const ZARVertex* /*low*/, const ZARVertex* /*high*/) {}

    /// @return a bound on the number of shapes that share a point with a window
    virtual int CountShapes(const ZARVertex& /*low*/, const ZARVertex& /*high*/) const {
        return shapeCount;
    }

    /// @return what opening found out, for _iobuf::TakeSurvey; empty if it cost nothing
    virtual std::string GetSurvey() const { return {}; }

    /// @return 2 if the layer holds any facets, else 3 for lines, 1 for points
    virtual int GetType() const = 0;
    /// @return a corner of the extents of the deliverable shapes, heights as stored; zero if there
    /// is none
    virtual ZARVertex GetLow() const = 0;
    virtual ZARVertex GetHigh() const = 0;
    /// @return the CRS as a text that PROJ reads; empty if the layer has none
    virtual std::string GetCrsText() const = 0;
    virtual _iobuf& GetFile() const = 0;
};

} // namespace kelm::store
