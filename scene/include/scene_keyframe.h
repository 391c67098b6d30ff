#pragma once

#include "scene.h"

/// Animation curves: what a channel yields at a time, and new keys for it.
///
/// A channel yields one of eleven value types: i32, float, double, vec2, vec3, vec4 and quat in
/// either precision. It keeps no state beside its attributes, so any thread may evaluate it while
/// nobody changes these. T is one of the eleven types everywhere below.
namespace scene {

/// The value of curve 0 of `channel` at `time`, which counts as the keys do. Zero (of quaternions
/// the identity), with a message, if the curve can't be evaluated, and without one if there is no
/// curve. Throws `base::switch_exception` for an unknown interpolation. Allocates nothing unless
/// there is something to tell.
template <class T>
T computeValue(const IKeyframeChannel& channel, base::TimeCode time);

/// The type that `channel` yields, by its scalar name: that of the `values` of its curve. Absent
/// if it has none, or values of another type.
base::name_id findValueType(const IKeyframeChannel& channel);

/// The tangents of a key, for Bezier segments: change a second.
template <class T>
struct KeyTangents {
    T in{}, out{};
};

/// Puts a key into curve 0 of `channel`, in the order of the times; one at the same time is
/// replaced. Makes the lists of times and values if the curve has none, and that of tangents if
/// `tangents` are given. Every other list grows with the keys: without `tangents` a new key in a
/// list of them has flat ones, its weights are those that change nothing (a third), its segment
/// has the interpolation of the one that it parts or continues. False, with a message and without
/// a change, if there is no curve or several, or the lists don't fit `T` or each other.
template <class T>
bool setKey(IKeyframeChannel& channel, base::TimeCode time, const T& value,
            const KeyTangents<T>* tangents = nullptr);

} // namespace scene
