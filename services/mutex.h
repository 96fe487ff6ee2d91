#pragma once

#include "services/servicesexport.h"

#include <memory>

namespace kelm::threading {

/// Mutual exclusion between threads. Not recursive; not copyable.
class KELM_SERVICES_EXPORT Mutex {
  public:
    Mutex();
    ~Mutex();
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;

    /// Waits until the mutex is free and takes it.
    void Lock() const;
    /// Frees the mutex; the calling thread must hold it.
    void Unlock() const;

  private:
    struct Handle;
    std::unique_ptr<Handle> mpoHandle;
};

} // namespace kelm::threading
