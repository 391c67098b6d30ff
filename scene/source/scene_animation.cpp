#include "scene_animation.h"

namespace scene {

using base::TimeCode;
using base::u32;
using base::vector;

void mergeKeyTimes(const base::Attribute* attribute, vector<TimeCode>& times) {
    const base::AttribPath* path = findLayerPath(attribute);
    auto* layer = path ? dynamic_cast<IAnimLayer*>(path->root()) : nullptr;
    if (!layer || path->steps().size() < 3)
        return;
    layer->collectKeyTimes(path->steps()[2].index, times);
    std::sort(times.begin(), times.end());
    times.erase(std::unique(times.begin(), times.end()), times.end());
}

void IAnimLayer::changed(u32, const base::AttribPath&) {}

void IAnimLayer::collectKeyTimes(u32, vector<TimeCode>&) const {}

} // namespace scene
