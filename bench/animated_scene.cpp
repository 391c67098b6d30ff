#include "animated_scene.h"

#include "scene_animation.h"
#include "scene_keyframe.h"

#include <cmath>

namespace bench {

using base::i64;
using base::TimeCode;
using base::u32;
using scene::IKeyframeChannel;

namespace {

constexpr u32 keyCount = 100;
constexpr i64 ticksPerFrame = TimeCode::ticksPerSecond / 30;

template <class T>
T blend(float phase);
template <>
base::vec3d blend(float phase) {
    return {std::sin(phase), std::cos(phase), 0.1 * phase};
}
template <>
base::vec3f blend(float phase) {
    const float size = 1 + 0.3f * std::sin(phase);
    return {size, size, size};
}
template <>
base::quatf blend(float phase) {
    return {0, std::sin(phase), 0, std::cos(phase)};
}

template <class T>
IKeyframeChannel& addChannel(test_support::SceneBuilder& scene, u32 frameCount, float phase) {
    using Curve = scene::keyframeChannelCurve_schema;
    auto& channel = scene.add<IKeyframeChannel>();
    base::AttribMap& curve =
        test_support::appendItem(channel, scene::keyframeChannel_schema::n_curves);
    auto& times = write(curve, Curve::n_times);
    auto& values = curve.vecAttribute<T>(Curve::n_values);
    for (u32 i = 0; i < keyCount; ++i) {
        // The last key is that of the frame behind those that are sampled.
        times.push_back({i64(i) * frameCount * ticksPerFrame / (keyCount - 1)});
        values.push_back(blend<T>(phase + 0.2f * static_cast<float>(i)));
    }
    return channel;
}

} // namespace

AnimatedScene::AnimatedScene(u32 nodeCount, u32 frames) : scene(makeScene()), frameCount(frames) {
    auto& layer = scene->add<scene::IAnimLayer>("movement");
    auto& clip = scene->add<scene::IAnimClip>("clip");
    auto& positions = write(clip, scene::animClip_schema::n_keyframeChannels);
    write(clip, scene::animClip_schema::n_startTime) = {0};
    write(clip, scene::animClip_schema::n_endTime) = {frameCount * ticksPerFrame};
    const auto link = [&](scene::INode& node, base::name_id attribute, IKeyframeChannel& channel) {
        base::AttribPath path(layer, scene::animLayer_schema::n_outputs);
        path.element(static_cast<u32>(positions.size()));
        node.attribute(attribute, new base::AttribLink(std::move(path)));
        positions.push_back(scene::Object(&channel));
    };
    for (u32 i = 0; i < nodeCount; ++i) {
        const float phase = 0.01f * static_cast<float>(i);
        auto& node = scene->addTo<scene::INode>(*scene->root, "moving");
        nodes.push_back(&node);
        test_support::makeTriangle(scene->addTo<scene::IMesh>(node, "triangle"));
        translations.push_back(&addChannel<base::vec3d>(*scene, frameCount, phase));
        scales.push_back(&addChannel<base::vec3f>(*scene, frameCount, phase));
        rotations.push_back(&addChannel<base::quatf>(*scene, frameCount, phase));
        link(node, scene::node_schema::n_translate, *translations.back());
        link(node, scene::node_schema::n_scale, *scales.back());
        link(node, scene::node_schema::n_rotate, *rotations.back());
    }
    base::AttribMap& action = test_support::appendItem(layer, scene::animLayer_schema::n_actions);
    write(action, scene::animLayerAction_schema::n_animClip) = scene::Object(&clip);
    write(action, scene::animLayerAction_schema::n_playAt) = {0};
    write(*scene->scene, scene::scene_schema::n_animLayers).push_back(scene::Object(&layer));
}

TimeCode frameTime(u32 frame) {
    return {frame * ticksPerFrame};
}

double evaluateAll(const AnimatedScene& animated) {
    double sum = 0;
    for (u32 frame = 0; frame < animated.frameCount; ++frame) {
        const TimeCode time = frameTime(frame);
        for (std::size_t i = 0; i < animated.translations.size(); ++i) {
            sum += scene::computeValue<base::vec3d>(*animated.translations[i], time).x;
            sum += scene::computeValue<base::vec3f>(*animated.scales[i], time).x;
            sum += scene::computeValue<base::quatf>(*animated.rotations[i], time).y;
        }
    }
    return sum;
}

} // namespace bench
