#pragma once

namespace faults {

/// Fails requests to operator new, on whatever thread, while it lives. There is one at a time.
/// Requests made while the scripted services serve are left alone and uncounted.
class Injector {
  public:
    /// @param nFirst the request that fails, from 1 on @param isLasting do all later ones fail too?
    Injector(long nFirst, bool isLasting);
    Injector(const Injector&) = delete;
    Injector& operator=(const Injector&) = delete;
    ~Injector();

    /// @return number of requests that failed so far
    static long GetFailed();
};

/// @return blocks that were not asked for by the services and are not released yet
long GetLiving();

} // namespace faults
