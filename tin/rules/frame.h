#pragma once

#include "tin/point.h"

namespace kelm::tin::rules {

/// The two frames of a surface: map coordinates in `double`, and local ones in `float`, which are
/// relative to the base. A base is subtracted and added in `double`, and the result is narrowed
/// once. Heights have no base.
class Frame {
  public:
    Frame(double xBase, double yBase) : mdfXBase(xBase), mdfYBase(yBase) {}

    point2_t<float> ToLocal(const point2_t<double>& p) const {
        return {static_cast<float>(p.x - mdfXBase), static_cast<float>(p.y - mdfYBase)};
    }
    point3_t<float> ToLocal(const point3_t<double>& p) const {
        return {static_cast<float>(p.x - mdfXBase), static_cast<float>(p.y - mdfYBase),
                static_cast<float>(p.z)};
    }
    point2_t<double> ToMap(const point2_t<float>& p) const {
        return {static_cast<double>(p.x) + mdfXBase, static_cast<double>(p.y) + mdfYBase};
    }
    point3_t<double> ToMap(const point3_t<float>& p) const {
        return {static_cast<double>(p.x) + mdfXBase, static_cast<double>(p.y) + mdfYBase,
                static_cast<double>(p.z)};
    }

  private:
    double mdfXBase;
    double mdfYBase;
};

} // namespace kelm::tin::rules
