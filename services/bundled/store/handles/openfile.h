#pragma once

#include "services/bundled/store/handles/openlayer.h"
#include "services/exception.h"

namespace kelm::store {

/// Whom to tell how far a long call is.
struct ProgressCall {
    ZARProgress mpfnTell = nullptr; ///< may be null, and may throw
    void* mpData = nullptr;

    void Tell(double done) const {
        if (mpfnTell != nullptr)
            mpfnTell(done, mpData);
    }
};

} // namespace kelm::store

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
    /// Tells how far later calls of GetLayer are.
    virtual void SetProgress(const kelm::store::ProgressCall& /*progress*/) {}
    /// Makes the layer that a survey is of, without reading it. @return its segment
    /// @throw kelm::DataException if the survey is not of this file as it is now
    virtual int TakeSurvey(const std::string& /*survey*/) {
        throw kelm::DataException("The survey cannot be used: it is not of such a file",
                                  "services/bundled/store/handles/openfile", __PRETTY_FUNCTION__,
                                  __LINE__);
    }
};
