#pragma once

#include "scene_keyframe.h"

#include <cmath>

/// Builds channels for tests.
namespace keyframe_test {

using namespace scene;
using Curve = keyframeChannelCurve_schema;

inline base::TimeCode atSecond(double seconds) {
    return {std::llround(seconds * static_cast<double>(base::TimeCode::ticksPerSecond))};
}

inline IKeyframeChannel& addChannel(base::PluginFactory& factory, const char* name) {
    auto& channel =
        dynamic_cast<IKeyframeChannel&>(*factory.create(keyframeChannel_schema::n_kind));
    write(channel, keyframeChannel_schema::n_name) = name;
    return channel;
}

/// The first curve of `channel`, made where it has none.
inline base::AttribMap& curveOf(IKeyframeChannel& channel) {
    return *channel.attribute(1, keyframeChannel_schema::n_curves);
}

/// Gives `channel` a curve with keys at so many seconds.
template <class T>
base::AttribMap& setKeys(IKeyframeChannel& channel, std::initializer_list<double> seconds,
                         base::vector<T> values) {
    base::AttribMap& curve = curveOf(channel);
    auto& times = write(curve, Curve::n_times);
    times.clear();
    for (const double second : seconds)
        times.push_back(atSecond(second));
    curve.vecAttribute<T>(Curve::n_values) = std::move(values);
    return curve;
}

} // namespace keyframe_test
