#pragma once

#include <limits>

namespace kelm::tin::rules {

/// The height rule of all queries: of the heights at a place the greatest wins. A NaN replaces
/// nothing, and of equal heights the first stands.
class Highest {
  public:
    void Add(float height) {
        if (height > mfHeight)
            mfHeight = height;
    }
    /// @return the lowest finite `float` while there is none
    float Get() const { return mfHeight; }
    bool IsFound() const { return mfHeight > LOWEST; }

  private:
    static constexpr float LOWEST = -std::numeric_limits<float>::max();
    float mfHeight = LOWEST;
};

} // namespace kelm::tin::rules
