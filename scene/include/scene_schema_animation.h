#pragma once

#include "scene_attribute.h"

/// Schemas of animation: curves, clips of them, layers that place clips in time. Each table is
/// X(attribute, type[, default]).
namespace scene {

#define SCENE_KEYFRAME_CHANNEL_TABLE(X) \
    X(curves, Items)                    \
    X(name, base::string)               \
    X(baked, bool, false)
SCENE_SCHEMA(keyframeChannel, SCENE_KEYFRAME_CHANNEL_TABLE)

/// Item of `curves`. `values`, `tangents` and `weights` are vectors of the channel's own value
/// type. `interpolation` may also be a vector with one code per key.
#define SCENE_KEYFRAME_CHANNEL_CURVE_TABLE(X) \
    X(times, Array<base::TimeCode>)           \
    X(values, Untyped)                        \
    X(interpolation, Enumeration, 1)          \
    X(preExtrapolation, Enumeration, 0)       \
    X(postExtrapolation, Enumeration, 0)      \
    X(tangents, Untyped)                      \
    X(weights, Untyped)                       \
    X(tension, float, 1)                      \
    X(tightness, float, 0.5f)
SCENE_SCHEMA(keyframeChannelCurve, SCENE_KEYFRAME_CHANNEL_CURVE_TABLE)

#define SCENE_ANIM_CLIP_TABLE(X)       \
    X(name, base::string)              \
    X(keyframeChannels, Array<Object>) \
    X(startTime, base::TimeCode, {0})  \
    X(endTime, base::TimeCode, {0})
SCENE_SCHEMA(animClip, SCENE_ANIM_CLIP_TABLE)

/// `outputs` holds one attribute per channel position, of the type that the channel yields.
#define SCENE_ANIM_LAYER_TABLE(X) \
    X(actions, Items)             \
    X(name, base::string)         \
    X(time, base::TimeCode, {0})  \
    X(outputs, Items)             \
    X(defaultValues, Submap)
SCENE_SCHEMA(animLayer, SCENE_ANIM_LAYER_TABLE)

/// Item of `actions`. `playSpeed` in percent.
#define SCENE_ANIM_LAYER_ACTION_TABLE(X) \
    X(animClip, Object)                  \
    X(playAt, base::TimeCode, {0})       \
    X(playSpeed, base::i32, 100)
SCENE_SCHEMA(animLayerAction, SCENE_ANIM_LAYER_ACTION_TABLE)

/// All schemas of this page.
#define SCENE_ANIMATION_SCHEMAS(X) \
    X(keyframeChannel)             \
    X(keyframeChannelCurve)        \
    X(animClip)                    \
    X(animLayer)                   \
    X(animLayerAction)

} // namespace scene
