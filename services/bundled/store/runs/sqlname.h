#pragma once

#include <string>

namespace kelm::store {

/// @return a name as an identifier of SQL
inline std::string QuoteName(const char* name) {
    std::string quoted = "\"";
    for (; *name != '\0'; ++name)
        quoted.append(*name == '"' ? 2 : 1, *name);
    return quoted + '"';
}

} // namespace kelm::store
