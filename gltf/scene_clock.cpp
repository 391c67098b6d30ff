#include "gltf/scene_clock.h"

#include "gltf/scene_kind.h"

#include "scene_schema.h"

namespace gltf {

using scene::scene_schema;

SceneClock::SceneClock(base::IPlugin& scene) : scene_(scene), path_(scene, scene_schema::n_time) {
    const auto* layers = find(scene, scene_schema::n_animLayers);
    if (!layers)
        return;
    for (const scene::Object& object : *layers) {
        if (!object || object->typeName() != scene::animLayer_schema::n_kind)
            continue;
        if (auto* layer = findClass<scene::IAnimLayer>(*object))
            layers_.push_back(layer);
    }
}

SceneClock::~SceneClock() {
    if (!isMoved_)
        return;
    if (replaced_)
        scene_.attribute(scene_schema::n_time, replaced_.release());
    else
        write(scene_, scene_schema::n_time) = saved_;
}

void SceneClock::tellLayers() const {
    for (const base::ref<scene::IAnimLayer>& layer : layers_)
        layer->changed(base::eventTimeChanged, path_);
}

void SceneClock::set(base::TimeCode time) {
    if (!isMoved_)
        keepTime();
    write(scene_, scene_schema::n_time) = time;
    tellLayers();
}

void SceneClock::keepTime() {
    const base::Attribute* own = scene_.findAttribute(scene_schema::n_time, false, false);
    if (own && own->type() != base::TypeTraits<base::TimeCode>::n_name) {
        replaced_.reset(own->clone());
        scene_.removeAttribute(scene_schema::n_time);
    } else if (const base::TimeCode* time = find(scene_, scene_schema::n_time)) {
        saved_ = *time;
    }
    isMoved_ = true;
}

} // namespace gltf
