#include "gltf/exporter.h"
#include "gltf/node_transform.h"

#include "scene_schema.h"

#include <algorithm>

namespace gltf {

using base::mat43;
using base::TimeCode;
using base::vector;
using scene::node_schema;
using Channel = GLTF::Animation::Channel;

namespace {

/// The nodes above one that does not inherit their transforms, from the root down.
vector<const scene::INode*> findAncestors(const TreePosition& position) {
    vector<const scene::INode*> ancestors;
    if (read(position.node, node_schema::n_inheritsTransform))
        return ancestors;
    for (const TreePosition* above = position.parent; above; above = above->parent)
        ancestors.push_back(&above->node);
    std::reverse(ancestors.begin(), ancestors.end());
    return ancestors;
}

} // namespace

/// Enters a node whose transform follows keys into the list of those to be sampled.
void GLTFScenePlugin::makeNodeAnimation(const TreePosition& position, GLTF::Node& gltfNode,
                                        const vector<TimeCode>& times) {
    NodeAnimation& entry = nodeAnimations.emplace_back();
    entry.node = &position.node;
    entry.gltfNode = &gltfNode;
    entry.animation = base::makeRef<GLTF::Animation>();
    entry.start = times.front();
    entry.end = times.back();
    const std::pair<base::name_id, Channel::Path> properties[] = {
        {node_schema::n_translate, Channel::translation},
        {node_schema::n_scale, Channel::scale},
        {node_schema::n_rotate, Channel::rotation}};
    for (const auto& [name, path] : properties) {
        const base::Attribute* property = position.node.findAttribute(name, false);
        if (!property || !property->asLink())
            continue;
        addChannel(*entry.animation, gltfNode, path);
        entry.paths |= 1u << path;
    }
    entry.sampler = NodeSampler(position.node, findAncestors(position));
}

void GLTFScenePlugin::sampleNodeAnimation(NodeAnimation& entry, TimeCode time) {
    if (time < entry.start || time > entry.end)
        return;
    mat43 transform;
    base::u32 faults = entry.sampler.getTransform(transform);
    scene::TransformParts parts;
    if (!splitTransform(transform, parts))
        faults |= scene::INode::faultNotFinite;
    if (faults != 0)
        logTransformFaults(*entry.node, faults);
    if (entry.translations)
        entry.translations[entry.sampleCount] = parts.translation;
    if (entry.scales)
        entry.scales[entry.sampleCount] = parts.scale;
    if (entry.rotations)
        entry.rotations[entry.sampleCount] = parts.rotation;
    ++entry.sampleCount;
}

} // namespace gltf
