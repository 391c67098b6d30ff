#include "assimp/key_reading.h"

#include "assimp/fault_report.h"
#include "assimp/quaternion.h"

#include <assimp/anim.h>

#include <algorithm>
#include <cmath>
#include <numeric>

namespace assimp {

using base::quatf;
using base::TimeCode;
using base::u32;
using base::u64;
using base::u8;
using base::vec3d;
using base::vec3f;
using base::vector;

void AnimationFaults::report(const base::string& path) const {
    const FaultReport log(path);
    log.warn(
        brokenKeys,
        "assimp |{}| Left out {} keys of animations whose times or values are no finite numbers!");
    log.warn(
        unsortedTracks,
        "assimp |{}| Found {} animation curves whose keys are not in the order of time, they are "
        "sorted!");
    log.warn(
        unknownTargets,
        "assimp |{}| Left out {} animation channels of nodes or morph targets that the file does "
        "not have!");
    log.warn(repeatedChannels,
             "assimp |{}| Left out {} animation channels of nodes or morph targets that have one!");
    log.inform(emptyAnimations, "assimp |{}| Left out {} animations without any keys.");
    log.warn(lateAnimations, "assimp |{}| Left out {} animations, as those before are too long!");
    log.warn(longMotions,
             "assimp |{}| Found {} motions that are too long for keys on every frame!");
    log.warn(shearedNodes, "assimp |{}| Found {} motions with shear, which is left out!");
}

namespace {

vec3d valueOf(const aiVectorKey& key, vec3d*) {
    return {key.mValue.x, key.mValue.y, key.mValue.z};
}
vec3f valueOf(const aiVectorKey& key, vec3f*) {
    return {key.mValue.x, key.mValue.y, key.mValue.z};
}
quatf valueOf(const aiQuatKey& key, quatf*) {
    const aiQuaternion& q = key.mValue;
    return normalized({q.x, q.y, q.z, q.w});
}

template <class T>
bool isFinite(const base::base_vec3<T>& v) {
    return std::isfinite(v.x) && std::isfinite(v.y) && std::isfinite(v.z);
}
bool isFinite(const quatf& q) {
    return std::isfinite(q.x) && std::isfinite(q.y) && std::isfinite(q.z) && std::isfinite(q.w);
}

u8 extrapolationOf(aiAnimBehaviour behaviour) {
    constexpr u8 constant = 0, linear = 1, cycle = 2;
    return behaviour == aiAnimBehaviour_LINEAR   ? linear
           : behaviour == aiAnimBehaviour_REPEAT ? cycle
                                                 : constant;
}

/// Keys at one time stay in their order: they make a step.
template <class T>
void sortKeys(KeyTrack<T>& track, AnimationFaults& faults) {
    if (std::ranges::is_sorted(std::as_const(track.times)))
        return;
    ++faults.unsortedTracks;
    vector<u32> order(track.times.size());
    std::iota(order.begin(), order.end(), 0u);
    const TimeCode* times = track.times.cbegin();
    std::ranges::stable_sort(order, [&](u32 a, u32 b) { return times[a] < times[b]; });
    KeyTrack<T> sorted{{}, {}, track.preExtrapolation, track.postExtrapolation};
    for (const u32 i : std::as_const(order)) {
        sorted.times.push_back(times[i]);
        sorted.values.push_back(std::as_const(track.values)[i]);
    }
    track = std::move(sorted);
}

template <class T, class Key>
KeyTrack<T> readKeys(const Key* keys, u32 count, const aiNodeAnim& channel,
                     const AnimationClock& clock, AnimationFaults& faults) {
    KeyTrack<T> track{
        {}, {}, extrapolationOf(channel.mPreState), extrapolationOf(channel.mPostState)};
    if (!keys)
        return track;
    track.times.reserve(count);
    track.values.reserve(count);
    for (const Key* key = keys; key != keys + count; ++key) {
        TimeCode time;
        const T value = valueOf(*key, static_cast<T*>(nullptr));
        if (clock.read(key->mTime, time) && isFinite(value)) {
            track.times.push_back(time);
            track.values.push_back(value);
        } else {
            ++faults.brokenKeys;
        }
    }
    sortKeys(track, faults);
    return track;
}

} // namespace

NodeMotion readMotion(const aiNodeAnim& channel, const AnimationClock& clock,
                      AnimationFaults& faults) {
    return {
        readKeys<vec3d>(channel.mPositionKeys, channel.mNumPositionKeys, channel, clock, faults),
        readKeys<quatf>(channel.mRotationKeys, channel.mNumRotationKeys, channel, clock, faults),
        readKeys<vec3f>(channel.mScalingKeys, channel.mNumScalingKeys, channel, clock, faults)};
}

base::map<u32, KeyTrack<float>> readWeights(const aiMeshMorphAnim& channel,
                                            const AnimationClock& clock, AnimationFaults& faults) {
    base::map<u32, KeyTrack<float>> tracks;
    for (u32 k = 0; channel.mKeys && k < channel.mNumKeys; ++k) {
        const aiMeshMorphKey& key = channel.mKeys[k];
        TimeCode time;
        const bool isTimed = clock.read(key.mTime, time);
        for (u32 i = 0; key.mValues && key.mWeights && i < key.mNumValuesAndWeights; ++i) {
            const auto weight = static_cast<float>(key.mWeights[i]);
            if (!isTimed || !std::isfinite(weight)) {
                ++faults.brokenKeys;
                continue;
            }
            KeyTrack<float>& track = tracks[key.mValues[i]];
            track.times.push_back(time);
            track.values.push_back(weight);
        }
    }
    for (auto& [target, track] : tracks)
        sortKeys(track, faults);
    return tracks;
}

} // namespace assimp
