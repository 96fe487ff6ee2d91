#include "services/bundled/reference/proj/projsession.h"

#include "services/bundled/projfolders.h"
#include "services/exception.h"
#include "services/reporting.h"

#include <mutex>
#include <new>
#include <vector>

namespace kelm::ogc {

namespace {

constexpr const char* SOURCE = "services/bundled/reference/proj/projsession";

/// A host that transforms point by point must not gather messages without end.
constexpr std::size_t LONGEST_MESSAGES = 2000;
constexpr std::size_t LONGEST_DEFINITION = 200;

bool IsContinuation(char byte) {
    return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U;
}

bool IsJson(const std::string& text) {
    const std::size_t first = text.find_first_not_of(" \t\r\n");
    return first != std::string::npos && text[first] == '{';
}

/// Lets a context look for data where the host's GDAL does, if that is not where PROJ looks anyway.
void SetFolders(PJ_CONTEXT* context) {
    static std::mutex mutex;
    const std::lock_guard<std::mutex> lock(mutex);
    std::string joined;
    std::vector<const char*> paths;
    const std::vector<std::string> folders = services::GetProjFolders();
    for (const std::string& folder : folders) {
        joined.append(joined.empty() ? "" : ":").append(folder);
        paths.push_back(folder.c_str());
    }
    if (!paths.empty() && joined != proj_info().searchpath)
        proj_context_set_search_paths(context, static_cast<int>(paths.size()), paths.data());
}

} // namespace

ProjSession::ProjSession() : mpoContext(proj_context_create()) {
    if (!mpoContext)
        throw std::bad_alloc();
    proj_log_func(Get(), this, &ProjSession::KeepMessage);
    proj_log_level(Get(), PJ_LOG_ERROR);
    proj_context_set_enable_network(Get(), 0);
    SetFolders(Get());
}

void ProjSession::KeepMessage(void* session, int, const char* text) noexcept {
    std::string& messages = static_cast<ProjSession*>(session)->moMessages;
    try {
        if (messages.size() < LONGEST_MESSAGES)
            messages.append(messages.empty() ? "" : "; ").append(text ? text : "");
    } catch (...) {
        // The callers are PROJ's functions, which an exception must not cross. Only a message is
        // lost, for want of memory.
    }
}

std::string ProjSession::TakeMessages() {
    std::string messages;
    messages.swap(moMessages);
    return messages.empty() ? messages : " (PROJ: " + messages + ")";
}

PjPtr ProjSession::CreateFromText(const std::string& definition) {
    PjPtr crs(IsJson(definition)
                  ? proj_create(Get(), definition.c_str())
                  : proj_create_from_wkt(Get(), definition.c_str(), nullptr, nullptr, nullptr));
    if (!crs || !proj_is_crs(crs.get()))
        throw DataException(
            FormatString("The text is no coordinate reference system that can be read: %s%s",
                         ShortenText(definition, LONGEST_DEFINITION).c_str(),
                         TakeMessages().c_str()),
            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return crs;
}

std::string ProjSession::GetText(const PJ* object) {
    // WKT 2 loses what PROJ needs to find the vertical operations of Web Mercator.
    const char* const options[] = {"MULTILINE=NO", nullptr};
    const char* text = object ? proj_as_projjson(Get(), object, options) : nullptr;
    if (!text)
        throw DataException("The coordinate reference system cannot be put together" +
                                TakeMessages(),
                            SOURCE, __PRETTY_FUNCTION__, __LINE__);
    return text;
}

std::string ShortenText(const std::string& text, std::size_t longest) {
    if (text.size() <= longest)
        return text;
    std::size_t end = longest;
    while (end > 0 && IsContinuation(text[end]))
        --end;
    return text.substr(0, end) + "...";
}

} // namespace kelm::ogc
