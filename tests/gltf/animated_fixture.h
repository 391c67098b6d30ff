#pragma once

#include "export_fixture.h"
#include "support/gltf_pose.h"

#include <map>

namespace test_support {

/// An exporting scene with one layer, which plays one clip from a second before time 0 on.
struct AnimatedScene : Exporting {
    AnimatedScene() {
        write(*scene, scene::scene_schema::n_animLayers).push_back(scene::Object(&layer));
        base::AttribMap& action = appendItem(layer, scene::animLayer_schema::n_actions);
        write(action, scene::animLayerAction_schema::n_animClip) = scene::Object(&clip);
        write(action, scene::animLayerAction_schema::n_playAt) = secondsToTime(-1);
        write(clip, scene::animClip_schema::n_startTime) = secondsToTime(-1);
    }

    /// Links an attribute of `map` to a channel with keys at `seconds`. Returns its curve.
    template <class T>
    base::AttribMap& animate(base::AttribMap& map, base::name_id attribute,
                             std::initializer_list<double> seconds,
                             std::initializer_list<T> values) {
        auto& channel = add<scene::IKeyframeChannel>();
        auto& channels = write(clip, scene::animClip_schema::n_keyframeChannels);
        channels.push_back(scene::Object(&channel));
        base::AttribPath path(layer, scene::animLayer_schema::n_outputs);
        path.element(static_cast<base::u32>(channels.size() - 1));
        map.attribute(attribute, new base::AttribLink(path));
        return setKeys<T>(channel, seconds, values);
    }
    /// A node with a mesh, which alone would keep it in the document.
    scene::INode& addNode(scene::INode& parent, const char* name) {
        auto& node = addTo<scene::INode>(parent, name);
        makeTriangle(addTo<scene::IMesh>(node, "mesh"));
        return node;
    }

    scene::IAnimLayer& layer = add<scene::IAnimLayer>();
    scene::IAnimClip& clip = add<scene::IAnimClip>();
};

/// The channels of the animation, by the name of the node, a blank and the path. Those without a
/// sample are wrong already.
inline std::map<std::string, AnimationChannel> readSamples(const GltfFile& file) {
    std::map<std::string, AnimationChannel> all;
    for (const AnimationChannel& channel : animationChannels(file)) {
        EXPECT_FALSE(channel.times.empty());
        const char* name = file.element("nodes", channel.node)["name"].GetString();
        all[name + (" " + channel.path)] = channel;
    }
    return all;
}

} // namespace test_support
