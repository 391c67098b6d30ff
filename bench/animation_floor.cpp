#include "animation_floor.h"

#include <algorithm>

namespace bench {

float evaluatePlain(const PlainCurve& curve, base::i64 time) {
    const auto next = std::upper_bound(curve.times.begin(), curve.times.end(), time);
    if (next == curve.times.end())
        return curve.values.back();
    const auto end = static_cast<std::size_t>(next - curve.times.begin());
    const auto u = static_cast<float>(static_cast<double>(time - next[-1]) /
                                      static_cast<double>(next[0] - next[-1]));
    return curve.values[end - 1] * (1 - u) + curve.values[end] * u;
}

} // namespace bench
