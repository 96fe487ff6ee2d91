#include "tin/bbox.h"

namespace kelm::tin {

template class BBox<float, point2_t<float>>;
template class BBox<float, point3_t<float>>;
template class BBox<double, point2_t<double>>;
template class BBox<double, point3_t<double>>;

} // namespace kelm::tin
