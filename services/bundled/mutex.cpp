#include "services/mutex.h"

#include <mutex>

namespace kelm::threading {

struct Mutex::Handle {
    std::mutex moMutex;
};

Mutex::Mutex() : mpoHandle(std::make_unique<Handle>()) {}
Mutex::~Mutex() = default;

void Mutex::Lock() const {
    mpoHandle->moMutex.lock();
}
void Mutex::Unlock() const {
    mpoHandle->moMutex.unlock();
}

} // namespace kelm::threading
