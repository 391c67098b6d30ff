#include "gltf/node_sampler.h"

#include "scene_schema.h"

#include <cmath>

namespace gltf {

using base::mat43;
using base::u32;
using base::vec3d;
using base::vector;
using scene::INode;
using scene::node_schema;

namespace {

/// The transform of the last of `chain` in the world.
mat43 worldFromLast(const vector<const INode*>& chain) {
    mat43 world;
    chain[0]->getTransform(world, nullptr);
    for (std::size_t i = 1; i < chain.size(); ++i) {
        mat43 local;
        chain[i]->getTransform(local, &world);
        world = scene::multiply(world, local);
    }
    return world;
}

const base::AttribLink* findLink(const INode& node, base::name_id name) {
    const base::Attribute* attribute = node.findAttribute(name, false);
    return attribute ? attribute->asLink() : nullptr;
}

template <class T>
std::span<double> componentsOf(T& value) {
    return {&value.x, sizeof value / sizeof(double)};
}

double sumOf(const vec3d& v) {
    return v.x + v.y + v.z;
}

} // namespace

NodeSampler::NodeSampler(const INode& node, vector<const INode*> ancestors)
    : node_(&node), ancestors_(std::move(ancestors)) {
    isConnected_ = ancestors_.empty() && connect();
}

/// False for a node that has to be asked each time: something else than the three properties
/// varies, or a link leads to an output in a roundabout way.
bool NodeSampler::connect() {
    constexpr base::u8 aimed = 1, axisAngle = 1;
    bool repaired = false;
    values_ = scene::readTransform(*node_, repaired);
    if (node_->parent() || values_.transformation == aimed || values_.rotateMode <= axisAngle)
        return false;
    for (const base::name_id name : {node_schema::n_transformation.id, node_schema::n_rotateMode.id,
                                     node_schema::n_inheritsTransform.id, node_schema::n_shear.id,
                                     node_schema::n_rotatePivot.id, node_schema::n_scalePivot.id})
        if (findLink(*node_, name))
            return false;
    const std::pair<base::name_id, Source*> properties[] = {{node_schema::n_translate, &translate_},
                                                            {node_schema::n_rotate, &rotate_},
                                                            {node_schema::n_scale, &scale_}};
    for (const auto& [name, source] : properties) {
        const base::AttribLink* link = findLink(*node_, name);
        if (link && !source->connect(*link))
            return false;
    }
    return true;
}

bool NodeSampler::Source::connect(const base::AttribLink& link) {
    constexpr std::size_t outputSteps = 3;
    const auto output = scene::findOutputIndex(link.path());
    layer = dynamic_cast<const scene::IAnimLayer*>(link.path().root());
    if (!layer || !output || link.path().steps().size() != outputSteps)
        return false;
    outputs.set(layer->findAttribute(scene::animLayer_schema::n_outputs, false, false));
    index = *output;
    return outputs.target() && outputs.target()->asArray();
}

/// False if the output is not up to date, or no number: then a look-up settles what counts.
bool NodeSampler::Source::load(std::span<double> components) const {
    if (!layer)
        return true;
    const vector<base::u8>& isOutOfDate = layer->outputMask();
    if (index >= isOutOfDate.size() || isOutOfDate[index] != 0 || !outputs.target())
        return false;
    const auto& array = static_cast<const base::AttribArray&>(*outputs.target());
    const base::Attribute* output = array.item(index);
    return output && scene::loadReal(*output, components);
}

bool NodeSampler::loadSources() {
    if (!translate_.load(componentsOf(values_.translate)) ||
        !rotate_.load(componentsOf(values_.rotate)) || !scale_.load(componentsOf(values_.scale)))
        return false;
    // One sum tells as well as all of the numbers whether each is finite.
    const base::quatd& q = values_.rotate;
    return std::isfinite(sumOf(values_.translate) + sumOf(values_.scale) + (q.x + q.y + q.z + q.w));
}

u32 NodeSampler::getTransform(mat43& transform) {
    if (!isConnected_ || !loadSources())
        return readTransform(transform);
    bool repaired = false;
    transform = scene::composeTransform(values_, repaired);
    return repaired ? INode::faultNotFinite : 0;
}

u32 NodeSampler::readTransform(mat43& transform) const {
    if (ancestors_.empty())
        return node_->getTransform(transform, nullptr);
    const mat43 parentWorld = worldFromLast(ancestors_);
    return node_->getTransform(transform, &parentWorld);
}

} // namespace gltf
