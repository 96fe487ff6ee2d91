#pragma once

#include <proj.h>

#include <memory>
#include <string>

namespace kelm::ogc {

/// Releases what PROJ hands out.
struct ProjRelease {
    void operator()(PJ* po) const noexcept { proj_destroy(po); }
    void operator()(PJ_OBJ_LIST* po) const noexcept { proj_list_destroy(po); }
    void operator()(PJ_CONTEXT* po) const noexcept { proj_context_destroy(po); }
    void operator()(PJ_OPERATION_FACTORY_CONTEXT* po) const noexcept {
        proj_operation_factory_context_destroy(po);
    }
};

using PjPtr = std::unique_ptr<PJ, ProjRelease>;
using PjListPtr = std::unique_ptr<PJ_OBJ_LIST, ProjRelease>;

/// A PROJ context of its own, without network access, that keeps PROJ's messages instead of
/// letting them go to the standard error stream. Used by one thread at a time. Objects made with
/// it must not outlive it.
class ProjSession {
  public:
    ProjSession();
    ProjSession(const ProjSession&) = delete;
    ProjSession& operator=(const ProjSession&) = delete;

    PJ_CONTEXT* Get() const noexcept { return mpoContext.get(); }
    /// @return a CRS. @throw kelm::DataException if PROJ cannot read the text, naming it
    PjPtr CreateFromWkt(const std::string& definition);
    /// @return the object as WKT 2 on one line. @throw kelm::DataException
    std::string GetWkt(const PJ* po);
    /// @return what PROJ has said since the last call, in brackets with a leading space; or empty
    std::string TakeMessages();

  private:
    static void KeepMessage(void* pSession, int nLevel, const char* pszText) noexcept;

    std::string moMessages;
    std::unique_ptr<PJ_CONTEXT, ProjRelease> mpoContext;
};

/// @return the text, cut to at most nLongest bytes at the boundary of a UTF-8 character
std::string ShortenText(const std::string& text, std::size_t nLongest);

} // namespace kelm::ogc
