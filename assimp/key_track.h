#pragma once

#include "b_containers.h"
#include "b_types.h"

#include <span>

namespace assimp {

/// Values at ascending times, with straight lines, for rotations arcs, between them. Of equal times
/// the last counts from there on.
template <class T>
struct KeyTrack {
    base::vector<base::TimeCode> times;
    base::vector<T> values;
    base::u8 before = 0, after = 0; ///< extrapolation codes of the framework

    bool isEmpty() const { return values.empty(); }
};

/// The value at `time`, that of the nearest key outside the keys. The track has keys.
template <class T>
T valueAt(const KeyTrack<T>& track, base::TimeCode time);

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

/// Most frames for which keys are made on their own.
constexpr base::i64 maxFrames = 100000;

/// The times from `first` to `last`, both included, with every whole frame of `frameTicks` ticks
/// between them. The ends alone if there are more than `maxFrames`, which sets `isTooLong`.
base::vector<base::TimeCode> listFrames(base::TimeCode first, base::TimeCode last,
                                        base::i64 frameTicks, bool& isTooLong);

/// The track with the values of `track` at `times`.
template <class T>
KeyTrack<T> resample(const KeyTrack<T>& track, const base::vector<base::TimeCode>& times) {
    KeyTrack<T> result{times, {}, track.before, track.after};
    result.values.reserve(times.size());
    for (const base::TimeCode time : times)
        result.values.push_back(valueAt(track, time));
    return result;
}

} // namespace assimp
