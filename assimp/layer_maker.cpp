#include "assimp/layer_maker.h"

#include <algorithm>

namespace assimp {

using base::AttribMap;
using base::i64;
using base::IPlugin;
using base::ref;
using base::TimeCode;
using base::u32;
using scene::animClip_schema;
using scene::animLayer_schema;
using scene::scene_schema;

/// The first clip reaches back to 0: where no clip plays, an animated attribute has no value.
TimeCode LayerMaker::startOf(std::size_t index) const {
    return index == 0 ? std::min(TimeCode{0}, clips_[0].first) : clips_[index].first;
}

/// No clip reaches into the next one, where it would show again behind that one's end.
TimeCode LayerMaker::endOf(std::size_t index) const {
    return index + 1 == clips_.size() ? clips_[index].end : clips_[index].last;
}

ref<IPlugin> LayerMaker::makeClip(std::size_t index) {
    const ClipTracks& source = clips_[index];
    ref<IPlugin> clip = factory_.create(animClip_schema::n_kind);
    if (!source.name.empty())
        write(*clip, animClip_schema::n_name) = source.name;
    write(*clip, animClip_schema::n_keyframeChannels) = std::move(channels_[index]);
    write(*clip, animClip_schema::n_startTime) = startOf(index);
    write(*clip, animClip_schema::n_endTime) = endOf(index);
    return clip;
}

void LayerMaker::finish(IPlugin& scene, u32 framesPerSecond) {
    if (!layer_)
        return;
    using Action = scene::animLayerAction_schema;
    const i64 frame = TimeCode::ticksPerSecond / framesPerSecond;
    TimeCode playAt{0}, end{0};
    for (std::size_t i = 0; i < clips_.size(); ++i) {
        AttribMap& action = appendItem<Action>(*layer_, animLayer_schema::n_actions);
        write(action, Action::n_animClip) = makeClip(i);
        write(action, Action::n_playAt) = playAt;
        end.ticks = playAt.ticks + endOf(i).ticks - startOf(i).ticks;
        playAt.ticks = (end.ticks + 2 * frame - 1) / frame * frame;
    }
    write(*layer_, animLayer_schema::n_name) = "Animation";
    write(scene, scene_schema::n_animLayers).push_back(layer_);
    if (framesPerSecond != scene_schema::n_framesPerSecond.defaultValue)
        write(scene, scene_schema::n_framesPerSecond) = framesPerSecond;
    const TimeCode start = std::max(TimeCode{0}, clips_[0].first);
    write(scene, scene_schema::n_startTime) = start;
    write(scene, scene_schema::n_endTime) = end;
    write(scene, scene_schema::n_time) = start;
    layer_->attribute(animLayer_schema::n_time,
                      new base::AttribLink(base::AttribPath(scene, scene_schema::n_time)));
}

} // namespace assimp
