#pragma once

#include "services/bundled/store/handles/openlayer.h"

/// An open file as the store hands it out, whatever reads it.
struct _iobuf {
  public:
    _iobuf() = default;
    _iobuf(const _iobuf&) = delete;
    _iobuf& operator=(const _iobuf&) = delete;
    virtual ~_iobuf() = default;

    /// @return the number of layers: the segments 1, 2 and so on
    virtual int GetLayerCount() const = 0;
    /// @param segment from 1 to the number of layers. @return the layer, owned by the file
    /// @throw kelm::DataException if the layer cannot be read
    virtual kelm::store::OpenLayer& GetLayer(int segment) = 0;
    /// @return the first layer with polygons, or that cannot be read; 1 if there is none
    virtual int FindFirst() { return 1; }
    /// Warns that there is no such layer, if any hold polygons, and names these.
    virtual void WarnOfNumber(int /*segment*/) {}
};
