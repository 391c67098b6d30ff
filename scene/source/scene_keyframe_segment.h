#pragma once

#include "scene_keyframe_cubic.h"
#include "scene_keyframe_curve.h"

/// What a curve yields between two keys.
namespace scene {

/// The keys of a curve, `count` of them, at least two.
template <class T>
struct CurveKeys {
    using Value = typename KeyTraits<T>::Value;
    using Number = typename KeyTraits<T>::Number;

    const base::TimeCode* times = nullptr;
    std::size_t count = 0;
    KeyVector<T> values;
    KeyVector<T> tangents; ///< two for each key, the incoming one first; empty where not in use
    KeyVector<T> weights;  ///< as many or none

    base::TimeCode firstTime() const { return times[0]; }
    base::TimeCode lastTime() const { return times[count - 1]; }
    /// Seconds from the key before `end` to `end`.
    double duration(std::size_t end) const { return secondsBetween(times[end - 1], times[end]); }
    /// `time` as a part of that.
    Number fraction(base::TimeCode time, std::size_t end) const {
        return static_cast<Number>(static_cast<double>(ticksBetween(times[end - 1], time)) /
                                   static_cast<double>(ticksBetween(times[end - 1], times[end])));
    }
};

/// The Hermite polynomial from `a` to `b` with the tangents `da` and `db`.
template <class C, std::size_t N>
Components<C, N> interpolateHermite(C u, const Components<C, N>& a, const Components<C, N>& b,
                                    const Components<C, N>& da, const Components<C, N>& db) {
    const C u2 = u * u, u3 = u2 * u;
    return a * (2 * u3 - 3 * u2 + 1) + b * (3 * u2 - 2 * u3) + da * (u3 - 2 * u2 + u) +
           db * (u3 - u2);
}

/// The shorter way on the sphere.
template <class C>
Components<C, 4> interpolateSphere(C u, const Components<C, 4>& a, const Components<C, 4>& b) {
    /// From here on the chord stands for the arc.
    constexpr C greatestCosine = static_cast<C>(0.9999999);
    if (!(u > 0))
        return a;
    if (u >= 1)
        return b;
    const C product = dot(a, b);
    const C sign = product < 0 ? C(-1) : C(1);
    const C cosine = product * sign;
    if (cosine >= greatestCosine) {
        const Components<C, 4> sum = a * (1 - u) + b * (u * sign);
        return sum * (1 / std::sqrt(dot(sum, sum)));
    }
    const C sine = std::sqrt(1 - cosine * cosine);
    const C angle = std::atan2(sine, cosine);
    return a * (std::sin((1 - u) * angle) / sine) + b * (sign * std::sin(u * angle) / sine);
}

template <class T>
auto interpolateSegmentLinear(const CurveKeys<T>& keys, std::size_t end, base::TimeCode time) {
    using Number = typename CurveKeys<T>::Number;
    const Number u = keys.fraction(time, end);
    if constexpr (isQuaternion<T>)
        return interpolateSphere(u, keys.values[end - 1], keys.values[end]);
    else
        return keys.values[end - 1] * (1 - u) + keys.values[end] * u;
}

/// A Bezier segment whose tangents reach as far along the time axis as its weights tell. Each
/// component has a time axis of its own; those of a quaternion share that of the first.
template <class T>
auto interpolateWeightedBezier(const CurveKeys<T>& keys, std::size_t end, base::TimeCode time) {
    using Value = typename CurveKeys<T>::Value;
    using Number = typename CurveKeys<T>::Number;
    const double duration = keys.duration(end);
    const double elapsed = secondsBetween(keys.times[end - 1], time);
    const Value a = keys.values[end - 1], b = keys.values[end];
    const Value out = keys.tangents[2 * end - 1], in = keys.tangents[2 * end];
    const Value outWeight = keys.weights[2 * end - 1], inWeight = keys.weights[2 * end];
    Number u{};
    return Value::of([&](std::size_t i) {
        const Number startReach = outWeight.c[i] * static_cast<Number>(duration);
        const Number endReach = inWeight.c[i] * static_cast<Number>(duration);
        if (i == 0 || !isQuaternion<T>)
            u = static_cast<Number>(findCurveParameter(elapsed, duration, startReach, endReach));
        using One = Components<Number, 1>;
        return interpolateHermite(u, One{a.c[i]}, One{b.c[i]}, One{3 * out.c[i] * startReach},
                                  One{3 * in.c[i] * endReach})
            .c[0];
    });
}

template <class T>
auto interpolateSegmentBezier(const CurveKeys<T>& keys, std::size_t end, base::TimeCode time) {
    using Number = typename CurveKeys<T>::Number;
    if (keys.weights.size() != 0)
        return interpolateWeightedBezier(keys, end, time);
    const auto duration = static_cast<Number>(keys.duration(end));
    return interpolateHermite(keys.fraction(time, end), keys.values[end - 1], keys.values[end],
                              keys.tangents[2 * end - 1] * duration,
                              keys.tangents[2 * end] * duration);
}

} // namespace scene
