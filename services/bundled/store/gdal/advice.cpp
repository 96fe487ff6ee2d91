#include "services/bundled/store/gdal/advice.h"

#include <algorithm>

namespace kelm::store {

namespace {

constexpr const char* OPTIONS[] = {"GML_SKIP_CORRUPTED_FEATURES", "SHAPE_RESTORE_SHX",
                                   "OGR_GEOMETRY_ACCEPT_UNCLOSED_RING"};

bool IsAdvice(const std::string& sentence) {
    return std::any_of(std::begin(OPTIONS), std::end(OPTIONS), [&](const char* option) {
        return sentence.find(option) != std::string::npos;
    });
}

/// @return the position behind the sentence that starts here: a full stop and the spaces behind it
std::size_t FindEnd(const std::string& text, std::size_t start) {
    const std::size_t stop = text.find(". ", start);
    return stop == std::string::npos ? text.size() : text.find_first_not_of(' ', stop + 1);
}

} // namespace

std::string StripAdvice(const std::string& text) {
    std::string kept;
    for (std::size_t start = 0; start < text.size();) {
        const std::size_t end = std::min(FindEnd(text, start), text.size());
        const std::string sentence = text.substr(start, end - start);
        if (!IsAdvice(sentence))
            kept += sentence;
        start = end;
    }
    return kept.empty() ? text : kept.substr(0, kept.find_last_not_of(' ') + 1);
}

} // namespace kelm::store
