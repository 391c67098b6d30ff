#pragma once

#include "b_containers.h"
#include "b_types.h"

namespace assimp {

/// Values at ascending times, with straight lines, for rotations arcs, between them. Of equal times
/// the last counts from there on.
template <class T>
struct KeyTrack {
    base::vector<base::TimeCode> times;
    base::vector<T> values;
    base::u8 preExtrapolation = 0, postExtrapolation = 0; ///< codes of the framework

    bool isEmpty() const { return values.empty(); }
};

/// A time. At a step, where keys share it, there are two: `isAfter` is false for the one before.
struct Moment {
    base::TimeCode time;
    bool isAfter = true;
    auto operator<=>(const Moment&) const = default;
};

/// The value at `moment`, that of the nearest key outside the keys. The track has keys.
template <class T>
T valueAt(const KeyTrack<T>& track, const Moment& moment);

/// Differences that no one sees; the types are those of a node's translation, rotation and scale
/// and of a morph target's weight.
bool areAlike(const base::vec3d& a, const base::vec3d& b);
bool areAlike(const base::quatf& a, const base::quatf& b);
bool areAlike(const base::vec3f& a, const base::vec3f& b);
bool areAlike(float a, float b);

/// True if all values are like `value`.
template <class T>
bool isConstant(const KeyTrack<T>& track, const T& value) {
    for (const T& v : track.values)
        if (!areAlike(v, value))
            return false;
    return true;
}
/// True if all values are alike; also of no values.
template <class T>
bool isConstant(const KeyTrack<T>& track) {
    return track.isEmpty() || isConstant(track, track.values[0]);
}

/// The track with the values of `track` at `times`.
template <class T>
KeyTrack<T> resample(const KeyTrack<T>& track, const base::vector<base::TimeCode>& times) {
    KeyTrack<T> result{times, {}, track.preExtrapolation, track.postExtrapolation};
    result.values.reserve(times.size());
    for (const base::TimeCode time : times)
        result.values.push_back(valueAt(track, {time}));
    return result;
}

} // namespace assimp
