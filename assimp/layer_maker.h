#pragma once

#include "assimp/attribute_writing.h"
#include "assimp/clip_tracks.h"

#include "scene_schema.h"

namespace assimp {

/// A curve object over the keys of `track`.
template <class T>
base::ref<base::IPlugin> makeChannel(const base::string& name, const KeyTrack<T>& track,
                                     base::PluginFactory& factory) {
    using Schema = scene::keyframeChannel_schema;
    using Curve = scene::keyframeChannelCurve_schema;
    base::ref<base::IPlugin> channel = factory.create(Schema::n_kind);
    write(*channel, Schema::n_name) = name;
    base::AttribMap& curve = appendItem<Curve>(*channel, Schema::n_curves);
    write(curve, Curve::n_times) = track.times;
    curve.vecAttribute<T>(Curve::n_values) = track.values;
    writeUnlessDefault(curve, Curve::n_preExtrapolation, track.preExtrapolation);
    writeUnlessDefault(curve, Curve::n_postExtrapolation, track.postExtrapolation);
    return channel;
}

/// Collects the outputs of a layer and makes the layer.
class LayerMaker {
public:
    LayerMaker(const base::vector<ClipTracks>& clips, base::PluginFactory& factory)
        : clips_(clips), channels_(clips.size()), factory_(factory) {}

    /// Links the attribute `name` of `owner` to a new output. `tracks` has an entry for each clip;
    /// null: it holds `rest`, in one object for all clips of the same range.
    template <class T>
    void animate(base::AttribMap& owner, base::name_id name, const base::string& label,
                 const base::vector<const KeyTrack<T>*>& tracks, const T& rest) {
        if (!layer_)
            layer_ = factory_.create(scene::animLayer_schema::n_kind);
        const auto output = static_cast<base::u32>(channels_[0].size());
        base::map<std::pair<base::TimeCode, base::TimeCode>, base::ref<base::IPlugin>> held;
        for (std::size_t i = 0; i < clips_.size(); ++i) {
            if (tracks[i]) {
                channels_[i].push_back(makeChannel(label, *tracks[i], factory_));
                continue;
            }
            base::ref<base::IPlugin>& shared = held[{clips_[i].first, clips_[i].last}];
            if (!shared)
                shared = makeChannel(label, hold(clips_[i], rest), factory_);
            channels_[i].push_back(shared);
        }
        base::AttribPath path(*layer_, scene::animLayer_schema::n_outputs);
        owner.attribute(name, new base::AttribLink(path.element(output)));
    }

    /// Gives the layer its clips and the scene the layer, if there are any outputs.
    void finish(base::IPlugin& scene, base::u32 framesPerSecond);

private:
    /// Keys at both ends: exports take the range of time from those of keys.
    template <class T>
    static KeyTrack<T> hold(const ClipTracks& clip, const T& rest) {
        if (clip.first == clip.last)
            return {{clip.first}, {rest}};
        return {{clip.first, clip.last}, {rest, rest}};
    }
    base::TimeCode startOf(std::size_t index) const;
    base::TimeCode endOf(std::size_t index) const;
    base::ref<base::IPlugin> makeClip(std::size_t index);

    const base::vector<ClipTracks>& clips_;
    base::vector<base::vector<base::ref<base::IPlugin>>> channels_; ///< of each clip
    base::PluginFactory& factory_;
    base::ref<base::IPlugin> layer_;
};

} // namespace assimp
