#pragma once

#include "scene_animation.h"
#include "scene_transform.h"

namespace gltf {

/// Answers what the `getTransform` of an animated node does, many times while nothing in the scene
/// changes but its time and the outputs of its animation layers.
class NodeSampler {
public:
    NodeSampler() = default;
    /// The node is borrowed. `ancestors` are the nodes above it, from the root down, if it does
    /// not inherit their transforms, else none.
    NodeSampler(const scene::INode& node, base::vector<const scene::INode*> ancestors);

    /// Returns the faults of `scene::INode::getTransform`.
    base::u32 getTransform(base::mat43& transform);

private:
    /// The output of a layer that a property is linked to.
    struct Source {
        const scene::IAnimLayer* layer = nullptr; ///< null for a property without a link
        base::AttribWeakLink outputs;
        base::u32 index = 0;

        bool connect(const base::AttribLink& link);
        bool load(std::span<double> components) const;
    };

    bool connect();
    bool loadSources();
    base::u32 readTransform(base::mat43& transform) const;

    const scene::INode* node_ = nullptr;
    base::vector<const scene::INode*> ancestors_;
    /// True for a node of the common kind, of which only translation, rotation and scale vary.
    bool isConnected_ = false;
    scene::TransformValues values_;
    Source translate_, rotate_, scale_;
};

} // namespace gltf
