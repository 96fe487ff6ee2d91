#include "tin/rules/exactplan.h"

#include "tin/rules/barycentric.h"

#include <algorithm>
#include <cfloat>
#include <cmath>

namespace kelm::tin::rules {

namespace {

/// A value, and what rounding left out of it; together exact.
struct Pair {
    double high;
    double low;
};

Pair AddExactly(double a, double b) {
    const double sum = a + b;
    const double part = sum - a;
    return {sum, (a - (sum - part)) + (b - part)};
}

/// Products of differences of `float` values neither overflow nor underflow in `double`.
Pair MultiplyExactly(double a, double b) {
    const double product = a * b;
    return {product, std::fma(a, b, -product)};
}

/// A sum without rounding: terms of rising size that share no bit.
class ExactSum {
  public:
    void Add(double value) {
        int count = 0;
        for (int i = 0; i < mnTerms; ++i) {
            const Pair sum = AddExactly(value, madfTerms[i]);
            value = sum.high;
            if (sum.low != 0.0)
                madfTerms[count++] = sum.low;
        }
        madfTerms[count++] = value;
        mnTerms = count;
    }
    void AddProduct(const Pair& a, const Pair& b) {
        for (const double x : {a.low, a.high})
            for (const double y : {b.low, b.high}) {
                const Pair product = MultiplyExactly(x, y);
                Add(product.low);
                Add(product.high);
            }
    }
    /// The terms from the least on: the greatest decides the sign.
    double Get() const {
        double sum = 0.0;
        for (int i = 0; i < mnTerms; ++i)
            sum += madfTerms[i];
        return sum;
    }

  private:
    static constexpr int MOST = 17;
    double madfTerms[MOST];
    int mnTerms = 0;
};

Pair SubtractExactly(float a, float b) {
    return AddExactly(Widen(a), -Widen(b));
}

double GetTwiceAreaExactly(const point2_t<float>& a, const point2_t<float>& b,
                           const point2_t<float>& c) {
    const Pair down = SubtractExactly(c.y, a.y);
    ExactSum sum;
    sum.AddProduct(SubtractExactly(a.x, c.x), SubtractExactly(b.y, c.y));
    sum.AddProduct(down, SubtractExactly(b.x, c.x));
    return sum.Get();
}

bool IsFinite(const point3_t<float>& v) {
    return std::isfinite(v.x) && std::isfinite(v.y) && std::isfinite(v.z);
}

point2_t<float> ToPlan(const point3_t<float>& v) {
    return {v.x, v.y};
}

} // namespace

double GetTwiceArea(const point2_t<float>& a, const point2_t<float>& b, const point2_t<float>& c) {
    const double left = (Widen(a.x) - Widen(c.x)) * (Widen(b.y) - Widen(c.y));
    const double right = (Widen(a.y) - Widen(c.y)) * (Widen(b.x) - Widen(c.x));
    const double area = left - right;
    // Shewchuk's bound is 3 + 16 x 2^-53 units of 2^-53.
    constexpr double BOUND = 4.0 * (DBL_EPSILON / 2.0);
    const double doubt = BOUND * (std::fabs(left) + std::fabs(right));
    return area > doubt || -area > doubt ? area : GetTwiceAreaExactly(a, b, c);
}

bool GetClosedHeight(const point3_t<float>& v0, const point3_t<float>& v1,
                     const point3_t<float>& v2, const point2_t<float>& position, float& h) {
    if (!IsFinite(v0) || !IsFinite(v1) || !IsFinite(v2))
        return false;
    const double w0 = GetTwiceArea(ToPlan(v1), ToPlan(v2), position);
    const double w1 = GetTwiceArea(ToPlan(v2), ToPlan(v0), position);
    const double w2 = GetTwiceArea(ToPlan(v0), ToPlan(v1), position);
    const bool isLeft = w0 >= 0.0 && w1 >= 0.0 && w2 >= 0.0;
    const bool isRight = w0 <= 0.0 && w1 <= 0.0 && w2 <= 0.0;
    // All three are zero on a triangle without area.
    if (isLeft == isRight)
        return false;
    const double sum = w0 * Widen(v0.z) + w1 * Widen(v1.z) + w2 * Widen(v2.z);
    const auto [low, high] = std::minmax({v0.z, v1.z, v2.z});
    h = static_cast<float>(std::clamp(sum / (w0 + w1 + w2), Widen(low), Widen(high)));
    return true;
}

} // namespace kelm::tin::rules
