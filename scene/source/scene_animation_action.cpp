#include "scene_animation_action.h"

namespace scene {

LayerAction readAction(const base::AttribMap& action) {
    using Action = animLayerAction_schema;
    using Clip = animClip_schema;
    LayerAction result;
    if (const base::TimeCode* playAt = find(action, Action::n_playAt))
        result.playAt = *playAt;
    result.playSpeed = read(action, Action::n_playSpeed);
    base::IPlugin* clip = findObject(action, Action::n_animClip);
    if (!clip || clip->typeName() != Clip::n_kind)
        return result;
    result.clip = clip;
    const base::TimeCode* start = find(*clip, Clip::n_startTime);
    const base::TimeCode* end = find(*clip, Clip::n_endTime);
    if (start)
        result.start = *start;
    if (start && end)
        result.duration = scaledTicks(WideTicks(end->ticks) - start->ticks, result.playSpeed);
    return result;
}

} // namespace scene
