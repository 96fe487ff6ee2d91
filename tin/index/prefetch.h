#pragma once

namespace kelm::tin::index {

/// Asks for memory ahead of its use. A hint: nothing is read, and any address will do.
inline void Prefetch([[maybe_unused]] const void* p) {
#ifdef __GNUC__
    __builtin_prefetch(p);
#endif
}

} // namespace kelm::tin::index
