#pragma once

#include "GLTF/document.h"
#include "gltf/node_sampler.h"

/// What the walk of the tree finds to be animated, and the samples taken of it. Samples are taken
/// at those times of one common grid that lie from `start` to `end`, both included.
namespace gltf {

struct NodeAnimation {
    const scene::INode* node = nullptr;
    GLTF::Node* gltfNode = nullptr;
    /// One channel per animated property, in the order translation, scale, rotation.
    base::ref<GLTF::Animation> animation;
    base::TimeCode start, end; ///< first and last key
    base::u32 paths = 0;       ///< bit n is set if there is a channel of path n
    // Borrowed room for the samples; none for a property without a channel.
    base::vec3f* translations = nullptr;
    base::quatf* rotations = nullptr;
    base::vec3f* scales = nullptr;
    std::size_t sampleCount = 0; ///< samples taken so far
    NodeSampler sampler;
};

struct MorphAnimation {
    base::ref<GLTF::Animation> animation; ///< one channel, of weights
    base::TimeCode start, end;            ///< first and last key of all weights
    const scene::IMorph* morph = nullptr;
    base::vector<float> weights;     ///< those of all targets that count, sample by sample
    base::vector<base::u32> targets; ///< their places in the morph's list
};

inline void addChannel(GLTF::Animation& animation, GLTF::Node& target,
                       GLTF::Animation::Channel::Path path) {
    auto channel = base::makeRef<GLTF::Animation::Channel>();
    channel->target.node = &target;
    channel->target.path = path;
    animation.channels.push_back(std::move(channel));
}

} // namespace gltf
