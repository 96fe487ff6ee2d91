#pragma once

#include <proj.h>

#include <memory>
#include <string>

namespace kelm::ogc {

/// Releases what PROJ hands out.
struct ProjRelease {
    void operator()(PJ* object) const noexcept { proj_destroy(object); }
    void operator()(PJ_OBJ_LIST* list) const noexcept { proj_list_destroy(list); }
    void operator()(PJ_CONTEXT* context) const noexcept { proj_context_destroy(context); }
    void operator()(PJ_OPERATION_FACTORY_CONTEXT* factory) const noexcept {
        proj_operation_factory_context_destroy(factory);
    }
};

using PjPtr = std::unique_ptr<PJ, ProjRelease>;
using PjListPtr = std::unique_ptr<PJ_OBJ_LIST, ProjRelease>;

/// A PROJ context of its own, without network access. It finds PROJ's data where the host's GDAL
/// does. It keeps PROJ's messages, which would go to the standard error stream otherwise. Used by
/// one thread at a time. Objects made with it must not outlive it.
class ProjSession {
  public:
    /// @throw std::bad_alloc
    ProjSession();
    ProjSession(const ProjSession&) = delete;
    ProjSession& operator=(const ProjSession&) = delete;

    PJ_CONTEXT* Get() const noexcept { return mpoContext.get(); }
    /// @param definition WKT or PROJJSON, and nothing else that PROJ would take
    /// @return a CRS. @throw kelm::DataException if PROJ cannot read the text, naming it
    PjPtr CreateFromText(const std::string& definition);
    /// @return the object as PROJJSON on one line. @throw kelm::DataException if there is none, or
    /// PROJ cannot write it
    std::string GetText(const PJ* object);
    /// @return what PROJ has said since the last call, in brackets with a leading space; or empty
    std::string TakeMessages();

  private:
    static void KeepMessage(void* session, int level, const char* text) noexcept;

    std::string moMessages;
    std::unique_ptr<PJ_CONTEXT, ProjRelease> mpoContext;
};

/// @return the text, cut to at most `longest` bytes at the boundary of a UTF-8 character
std::string ShortenText(const std::string& text, std::size_t longest);

} // namespace kelm::ogc
