#pragma once

#include "export_fixture.h"

#include <map>

namespace test_support {

inline base::TimeCode secondsToTime(double seconds) {
    return {static_cast<base::i64>(seconds * 46186158000.0)};
}

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
        base::AttribMap& curve = appendItem(channel, scene::keyframeChannel_schema::n_curves);
        for (const double time : seconds)
            write(curve, scene::keyframeChannelCurve_schema::n_times)
                .push_back(secondsToTime(time));
        curve.vecAttribute<T>(scene::keyframeChannelCurve_schema::n_values) = values;
        auto& channels = write(clip, scene::animClip_schema::n_keyframeChannels);
        channels.push_back(scene::Object(&channel));
        base::AttribPath path(layer, scene::animLayer_schema::n_outputs);
        path.element(static_cast<base::u32>(channels.size() - 1));
        map.attribute(attribute, new base::AttribLink(path));
        return curve;
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

struct Samples {
    int input = -1;
    std::vector<double> times;
    AccessorValues values;
};

/// The samples of all channels, by the name of the node, a blank and the path. Those without a
/// sample are wrong already.
inline std::map<std::string, Samples> readSamples(const GltfFile& file) {
    std::map<std::string, Samples> all;
    if (file.count("animations") == 0)
        return all;
    const auto& animation = file.element("animations", 0);
    for (const auto& channel : animation["channels"].GetArray()) {
        const auto& node = file.element("nodes", channel["target"]["node"].GetUint());
        const auto& sampler = animation["samplers"][channel["sampler"].GetUint()];
        EXPECT_STREQ(sampler["interpolation"].GetString(), "LINEAR");
        Samples samples;
        samples.input = sampler["input"].GetInt();
        samples.times = file.accessor(sampler["input"].GetUint()).values;
        samples.values = file.accessor(sampler["output"].GetUint());
        EXPECT_FALSE(samples.times.empty());
        all[std::string(node["name"].GetString()) + " " + channel["target"]["path"].GetString()] =
            samples;
    }
    return all;
}

} // namespace test_support
