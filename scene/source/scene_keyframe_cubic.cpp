#include "scene_keyframe_cubic.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <numbers>
#include <span>

namespace scene {

namespace {

/// Below it the coefficient of a power, in seconds, counts as zero.
constexpr double leastCoefficient = 1e-6;
/// Below it the discriminant of a quadratic is that of no root.
constexpr double leastDiscriminant = 1e-8;
/// Roots up to here are rounded ones of the segment's end.
constexpr double greatestRoot = 1.00001;

double firstInRange(std::span<const double> roots) {
    for (const double root : roots)
        if (root >= 0 && root <= greatestRoot)
            return std::min(root, 1.0);
    return 0;
}

double solveQuadratic(double b, double c, double d) {
    const double e = c * c - 4 * b * d;
    if (!(e >= leastDiscriminant))
        return 0;
    const double w = std::sqrt(e);
    return firstInRange(std::array{(w - c) * 0.5 / b, (-c - w) * 0.5 / b});
}

/// A root of u^3 + a u^2 + b u + c by Cardano's formula; where three are real, by its
/// trigonometric form.
double solveCubic(double a, double b, double c) {
    const double q = b / 3 - a * a / 9;
    const double r = b * a / 6 - c / 2 - a * a * a / 27;
    const double s = -a / 3;
    const double e = r * r + q * q * q;
    if (e > 0) {
        const double w = std::sqrt(e);
        return std::clamp(std::cbrt(w + r) + std::cbrt(r - w) + s, 0.0, 1.0);
    }
    if (e == 0) {
        const double root = std::cbrt(r);
        return firstInRange(std::array{2 * root + s, s - root});
    }
    constexpr double turn = 2 * std::numbers::pi;
    const double angle = std::acos(std::clamp(r / std::sqrt(-q * q * q), -1.0, 1.0));
    const double m = 2 * std::sqrt(-q);
    return firstInRange(std::array{m * std::cos(angle / 3) + s,
                                   m * std::cos((angle + turn) / 3) + s,
                                   m * std::cos((angle + 2 * turn) / 3) + s});
}

} // namespace

double findCurveParameter(double elapsed, double duration, double startReach, double endReach) {
    const double first = startReach, second = duration - endReach;
    const double a = 3 * first - 3 * second + duration;
    const double b = 3 * second - 6 * first;
    const double c = 3 * first;
    const double d = -elapsed;
    if (std::abs(a) >= leastCoefficient)
        return solveCubic(b / a, c / a, d / a);
    if (std::abs(b) >= leastCoefficient)
        return solveQuadratic(b, c, d);
    return c == 0 ? 0 : -d / c;
}

} // namespace scene
