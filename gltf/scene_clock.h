#pragma once

#include "scene_animation.h"

#include <memory>

namespace gltf {

/// The time of a scene and the animation layers that follow it.
class SceneClock {
public:
    /// `scene` is borrowed.
    explicit SceneClock(base::IPlugin& scene);
    /// Puts the time back as it was, if it was set; the layers are not told.
    ~SceneClock();
    SceneClock(const SceneClock&) = delete;
    SceneClock& operator=(const SceneClock&) = delete;

    /// Has all layers bring their outputs up to the scene's time.
    void tellLayers() const;
    /// Sets the scene's time and tells the layers.
    void set(base::TimeCode time);

private:
    void keepTime();

    base::IPlugin& scene_;
    const base::AttribPath path_; ///< of the scene's time
    base::vector<base::ref<scene::IAnimLayer>> layers_;
    bool isMoved_ = false;
    base::TimeCode saved_;
    /// What is no plain time is set aside.
    std::unique_ptr<base::Attribute> replaced_;
};

} // namespace gltf
