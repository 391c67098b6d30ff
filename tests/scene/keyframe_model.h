#pragma once

#include <cstdint>
#include <vector>

/// A slow second reading of the rules of curves, in double precision: points and their Bezier
/// polygons instead of polynomials, bisection instead of solved equations, steps from period to
/// period instead of quotients.
namespace keyframe_model {

using Numbers = std::vector<double>;

struct Curve {
    std::vector<std::int64_t> times; ///< ticks, ascending
    std::vector<Numbers> values;
    std::vector<Numbers> tangents; ///< two a key
    std::vector<Numbers> weights;  ///< two a key or none
    std::vector<int> codes;        ///< the interpolation; of each key if there are several
    int pre = 0, post = 0;
    double tension = 1, tightness = 0.5;
    bool isQuaternion = false;
};

/// False if somewhere the time axis of a spline turns back, which the model can't solve.
bool isSingleValued(const Curve& curve);

Numbers evaluate(const Curve& curve, std::int64_t time);

} // namespace keyframe_model
