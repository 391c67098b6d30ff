#pragma once

#include "scene_animation.h"

#include "scene_animation_time.h"

namespace scene {

/// An action of a layer: a clip and when it plays.
struct LayerAction {
    std::optional<base::TimeCode> playAt; ///< absent: never
    base::IPlugin* clip = nullptr;        ///< null unless it is an animation clip
    base::i32 playSpeed = 100;            ///< percent
    base::TimeCode start;                 ///< of the clip
    std::optional<WideTicks> duration;    ///< on the layer's timeline; absent: without end

    bool isNegative() const { return duration && *duration < 0; }
    /// True if the clip is heard at `time` of the layer, unless its duration is negative.
    bool playsAt(base::TimeCode time) const {
        return clip && playAt && *playAt <= time &&
               !(duration && !isNegative() && WideTicks(playAt->ticks) + *duration < time.ticks);
    }
};

LayerAction readAction(const base::AttribMap& action);

/// The references in a clip's `keyframeChannels`; null if there are none.
inline const Array<Object>* channelsOf(const base::Attribute* keyframeChannels) {
    if (!keyframeChannels || keyframeChannels->type() != base::TypeTraits<Object>::n_array_name)
        return nullptr;
    return static_cast<const Array<Object>*>(keyframeChannels->data());
}

} // namespace scene
