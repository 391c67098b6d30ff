#pragma once

#include "scene.h"

/// Animation curves: what a channel yields at a time, and new keys for it.
///
/// A channel yields one of eleven value types: i32, float, double, vec2, vec3, vec4 and quat in
/// either precision. It keeps no state beside its attributes, so any thread may evaluate it while
/// nobody changes these.
namespace scene {

/// The value of curve 0 of `channel` at `time`, which counts as the keys do. Zero, with a message,
/// if the curve can't be evaluated, and without one if there is no curve. Throws
/// `base::switch_exception` for an unknown interpolation. T is one of the eleven types.
template <class T>
T computeValue(const IKeyframeChannel& channel, base::TimeCode time);

/// The type that `channel` yields, by its scalar name: that of the `values` of its curve. Absent
/// if it has none, or values of another type.
base::name_id findValueType(const IKeyframeChannel& channel);

} // namespace scene
