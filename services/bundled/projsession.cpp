#include "services/bundled/projsession.h"

#include "services/exception.h"
#include "services/reporting.h"

#include <new>

namespace kelm::ogc {

namespace {

constexpr const char* kSource = "services/bundled/projsession";

/// A host that transforms point by point must not gather messages without end.
constexpr std::size_t kLongestMessages = 2000;
constexpr std::size_t kLongestDefinition = 200;

} // namespace

ProjSession::ProjSession() : mpoContext(proj_context_create()) {
    if (!mpoContext)
        throw std::bad_alloc();
    proj_log_func(Get(), this, &ProjSession::KeepMessage);
    proj_log_level(Get(), PJ_LOG_ERROR);
    proj_context_set_enable_network(Get(), 0);
}

void ProjSession::KeepMessage(void* pSession, int, const char* pszText) noexcept {
    std::string& messages = static_cast<ProjSession*>(pSession)->moMessages;
    try {
        if (messages.size() < kLongestMessages)
            messages.append(messages.empty() ? "" : "; ").append(pszText ? pszText : "");
    } catch (...) {
        // A message lost for want of memory must not unwind through PROJ.
    }
}

std::string ProjSession::TakeMessages() {
    std::string messages;
    messages.swap(moMessages);
    return messages.empty() ? messages : " (PROJ: " + messages + ")";
}

PjPtr ProjSession::CreateFromWkt(const std::string& definition) {
    PjPtr poCRS(proj_create_from_wkt(Get(), definition.c_str(), nullptr, nullptr, nullptr));
    if (!poCRS || !proj_is_crs(poCRS.get()))
        throw DataException(
            FormatString("The text is no coordinate reference system that can be read: %s%s",
                         ShortenText(definition, kLongestDefinition).c_str(),
                         TakeMessages().c_str()),
            kSource, __PRETTY_FUNCTION__, __LINE__);
    return poCRS;
}

std::string ProjSession::GetWkt(const PJ* po) {
    const char* const apszOptions[] = {"MULTILINE=NO", nullptr};
    const char* pszWkt = po ? proj_as_wkt(Get(), po, PJ_WKT2_2019, apszOptions) : nullptr;
    if (!pszWkt)
        throw DataException("The coordinate reference system cannot be put together" +
                                TakeMessages(),
                            kSource, __PRETTY_FUNCTION__, __LINE__);
    return pszWkt;
}

std::string ShortenText(const std::string& text, std::size_t nLongest) {
    if (text.size() <= nLongest)
        return text;
    std::size_t nEnd = nLongest;
    while (nEnd > 0 && (static_cast<unsigned char>(text[nEnd]) & 0xC0U) == 0x80U)
        --nEnd;
    return text.substr(0, nEnd) + "...";
}

} // namespace kelm::ogc
