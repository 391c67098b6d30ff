#include "scene_animation.h"

#include "scene_animation_action.h"
#include "scene_keyframe.h"
#include "scene_keyframe_curve.h"

#include "b_log.h"

#include <algorithm>

namespace scene {

namespace {

using base::TimeCode;
using base::u32;
using base::vector;

base::IPlugin* findChannel(const base::Attribute* keyframeChannels, u32 index) {
    const auto* channels = channelsOf(keyframeChannels);
    return channels && index < channels->size() ? (*channels)[index].get() : nullptr;
}

/// The key times of the only curve of `channel`, null if it has none.
const KeyTimes* findKeyTimes(const base::IPlugin& channel) {
    const base::AttribMap* curve = findOnlyCurve(channel);
    return curve ? find(*curve, keyframeChannelCurve_schema::n_times) : nullptr;
}

/// Sorts and drops what comes twice.
void normalize(vector<TimeCode>& times) {
    if (!std::is_sorted(times.cbegin(), times.cend()))
        std::sort(times.begin(), times.end());
    times.erase(std::unique(times.begin(), times.end()), times.cend());
}

} // namespace

void IAnimLayer::collectKeyTimes(u32 index, vector<TimeCode>& times) const {
    const base::AttribArray* actions = find(*this, n_actions);
    for (u32 i = 0; actions && i < actions->size(); ++i) {
        const base::AttribMap* map = findItemMap(*actions, i);
        const LayerAction action = map ? readAction(*map) : LayerAction();
        if (!action.playAt || !action.clip || action.playSpeed == 0 || action.isNegative())
            continue;
        const base::IPlugin* channel =
            findChannel(action.clip->findAttribute(animClip_schema::n_keyframeChannels), index);
        const KeyTimes* keys = channel ? findKeyTimes(*channel) : nullptr;
        if (!keys)
            continue;
        for (const TimeCode key : *keys)
            times.push_back(layerTime(key, *action.playAt, action.playSpeed, action.start));
    }
}

template <class T>
bool IAnimLayer::setKey(u32 index, TimeCode time, const T& value) {
    const base::AttribArray* actions = find(*this, n_actions);
    IKeyframeChannel* channel = nullptr;
    TimeCode channelTime;
    for (u32 i = 0; actions && i < actions->size(); ++i) {
        const base::AttribMap* map = findItemMap(*actions, i);
        const LayerAction action = map ? readAction(*map) : LayerAction();
        if (!action.playsAt(time) || action.isNegative())
            continue;
        base::IPlugin* found =
            findChannel(action.clip->findAttribute(animClip_schema::n_keyframeChannels), index);
        if (auto* keyed = dynamic_cast<IKeyframeChannel*>(found)) {
            channel = keyed;
            channelTime = clipTime(time, *action.playAt, action.playSpeed, action.start);
        }
    }
    if (!channel) {
        base::log().log(base::logScene, base::logWarning,
                        "gltf |{}| No clip of the layer drives output {}, no key is set!",
                        getName(), index);
        return false;
    }
    if (!scene::setKey(*channel, channelTime, value))
        return false;
    if (index < outputMask_.size())
        outputMask_[index] = 1;
    return true;
}

#define SCENE_INSTANTIATE(T) template bool IAnimLayer::setKey<T>(u32, TimeCode, const T&);
SCENE_KEY_TYPES(SCENE_INSTANTIATE)

void mergeKeyTimes(const base::Attribute* attribute, vector<TimeCode>& times) {
    const base::AttribPath* path = findLayerPath(attribute);
    auto* layer = path ? dynamic_cast<IAnimLayer*>(path->root()) : nullptr;
    const std::optional<u32> index = layer ? findOutputIndex(*path) : std::nullopt;
    if (!index)
        return;
    vector<TimeCode> found;
    layer->collectKeyTimes(*index, found);
    normalize(found);
    if (times.empty()) {
        times.swap(found);
        return;
    }
    // Channels of one object mostly share their times.
    if (std::includes(times.cbegin(), times.cend(), found.cbegin(), found.cend()))
        return;
    vector<TimeCode> merged;
    merged.resizeUninitialized(times.size() + found.size());
    TimeCode* end =
        std::set_union(times.cbegin(), times.cend(), found.cbegin(), found.cend(), merged.begin());
    merged.resize(static_cast<std::size_t>(end - merged.cbegin()));
    times.swap(merged);
}

} // namespace scene
