#pragma once

#include "scene_keyframe_segment.h"

#include <limits>

/// Splines through the keys of a curve: points of time in seconds and value. With `tightness` the
/// parameter between two points grows with that power of their distance (0.5: centripetal
/// Catmull-Rom), without it all segments count alike (cardinal spline).
namespace scene {

/// A step between two points of the curve, or a tangent.
template <class T>
struct CurveStep {
    using Number = typename KeyTraits<T>::Number;
    Number time{};
    typename KeyTraits<T>::Value value{};

    friend CurveStep operator+(const CurveStep& a, const CurveStep& b) {
        return {a.time + b.time, a.value + b.value};
    }
    friend CurveStep operator-(const CurveStep& a, const CurveStep& b) {
        return {a.time - b.time, a.value - b.value};
    }
    friend CurveStep operator*(const CurveStep& a, Number factor) {
        return {a.time * factor, a.value * factor};
    }
};

template <class T>
class CurveSpline {
public:
    using Number = typename KeyTraits<T>::Number;
    using Value = typename KeyTraits<T>::Value;
    using Step = CurveStep<T>;

    CurveSpline(const CurveKeys<T>& keys, float tension, float tightness)
        : keys_(keys), tension_(tension), tightness_(tightness),
          isUniform_(!(tightness > leastTightness)),
          isClosed_(keys.values.areEqual(0, keys.count - 1)) {}

    /// The last value is the first: the curve goes on from the end at the start.
    bool isClosed() const { return isClosed_; }

    /// The value in the segment that ends at key `end`.
    Value interpolate(std::size_t end, base::TimeCode time) const {
        const Step start = tangentAt(end - 1, true), arrival = tangentAt(end, false);
        const double elapsed = secondsBetween(keys_.times[end - 1], time);
        const auto u = static_cast<Number>(findCurveParameter(
            elapsed, keys_.duration(end), thirdOf(start.time), thirdOf(arrival.time)));
        return interpolateHermite(u, keys_.values[end - 1], keys_.values[end], start.value,
                                  arrival.value);
    }

    /// The tangent at a key, for the segment that starts there or the one that ends there. At the
    /// end of an open curve it is flat.
    Step tangentAt(std::size_t key, bool startsSegment) const {
        const std::size_t last = keys_.count - 1;
        const bool isOpenEnd = !isClosed_ && (key == 0 || key == last);
        if (isOpenEnd)
            return {static_cast<Number>(keys_.duration(key == 0 ? 1 : last)), {}};
        // A closed curve repeats after its period, so its ends have neighbours there.
        const Step before = stepTo(key == 0 ? last : key);
        const Step after = stepTo(key == last ? 1 : key + 1);
        if (isUniform_)
            return (before + after) * (tension_ * static_cast<Number>(0.5));
        const Number d0 = chord(before), d1 = chord(after);
        const Step slopes =
            before * (1 / d0) - (before + after) * (1 / (d0 + d1)) + after * (1 / d1);
        return slopes * ((startsSegment ? d1 : d0) * tension_);
    }

private:
    /// Up to here a tightness counts as none.
    static constexpr float leastTightness = 1e-6f;

    Step stepTo(std::size_t end) const {
        return {static_cast<Number>(keys_.duration(end)),
                keys_.values[end] - keys_.values[end - 1]};
    }

    /// The distance of two points to the power of the tightness.
    Number chord(const Step& step) const {
        constexpr auto leastRatio = static_cast<Number>(1.1920929e-07);
        constexpr auto leastLength = static_cast<Number>(1e-10);
        const Number time = std::abs(step.time), value = std::sqrt(dot(step.value, step.value));
        const Number greater = std::max(time, value), lesser = std::min(time, value);
        const Number ratio = lesser / greater;
        const Number length =
            greater <= leastRatio ? greater : greater * std::sqrt(1 + ratio * ratio);
        const Number power =
            std::pow(std::max(length, leastLength), static_cast<Number>(tightness_));
        // A great tightness leaves nothing of a short chord.
        return std::max(power, std::numeric_limits<Number>::min());
    }

    double thirdOf(Number time) const {
        return isUniform_ ? static_cast<double>(time) / 3
                          : static_cast<double>(time * static_cast<Number>(0.33333334));
    }

    const CurveKeys<T>& keys_;
    Number tension_;
    float tightness_;
    bool isUniform_;
    bool isClosed_;
};

} // namespace scene
