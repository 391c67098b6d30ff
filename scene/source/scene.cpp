#include "scene.h"

#include "scene_animation.h"
#include "scene_matrix.h"
#include "scene_mesh.h"
#include "scene_transform.h"

#include "b_exception.h"
#include "b_log.h"

#include <algorithm>

namespace scene {

namespace {

/// Deepest tree that is followed upwards.
constexpr std::size_t maximumDepth = 4096;
/// Links that are followed one after the other, as in every look-up.
constexpr int maximumHops = 64;

/// What stands at the end of `path`, itself a link perhaps.
const base::Attribute* findPathEnd(const base::AttribPath& path) {
    const base::Attribute* at = path.root();
    for (std::size_t i = 1; at && i < path.steps().size(); ++i) {
        const base::PathStep& step = path.steps()[i];
        if (step.kind == base::PathStepKind::attribute)
            at = at->asMap() ? at->asMap()->findAttribute(step.name, false) : nullptr;
        else if (step.kind == base::PathStepKind::element)
            at = at->asArray() ? at->asArray()->item(step.index) : nullptr;
    }
    return at;
}

} // namespace

base::name_id IBounded::interfaceName() {
    static const base::name_id name = base::nameServer().id("IBounded");
    return name;
}

base::name_id IHierarchical::interfaceName() {
    static const base::name_id name = base::nameServer().id("IHierarchical");
    return name;
}

const base::AttribPath* findLayerPath(const base::Attribute* attribute) {
    for (int hops = 0; attribute && hops < maximumHops; ++hops) {
        const base::AttribLink* link = attribute->asLink();
        const base::IPlugin* root = link ? link->path().root() : nullptr;
        if (!root)
            return nullptr;
        if (root->typeName() == animLayer_schema::n_kind && findOutputIndex(link->path()))
            return &link->path();
        attribute = findPathEnd(link->path());
    }
    return nullptr;
}

base::IPluginInterface* IGeometry::queryInterface(base::name_id name) {
    return name == IBounded::interfaceName() ? this : base::IPlugin::queryInterface(name);
}

base::box3f IGeometry::getBounds() const {
    return getGeometryBounds(*this);
}

base::IPluginInterface* INode::queryInterface(base::name_id name) {
    if (name == IBounded::interfaceName())
        return static_cast<IBounded*>(this);
    if (name == IHierarchical::interfaceName())
        return static_cast<IHierarchical*>(this);
    return base::IPlugin::queryInterface(name);
}

base::box3f INode::getBounds() const {
    return getGeometryBounds(*this);
}

INode* INode::findParent() const {
    if (!pluginFactory())
        return nullptr;
    for (const base::ref<base::IPlugin>& object : pluginFactory()->plugins()) {
        if (!object || object->typeName() != n_kind)
            continue;
        const auto* children = find(*object, n_children);
        if (!children || std::find(children->begin(), children->end(), this) == children->end())
            continue;
        if (auto* node = dynamic_cast<INode*>(object.get()))
            return node;
    }
    return nullptr;
}

base::u32 INode::getChildCount() const {
    const auto* children = find(*this, n_children);
    return children ? static_cast<base::u32>(children->size()) : 0;
}

base::IPlugin* INode::findChild(base::u32 index) const {
    const auto* children = find(*this, n_children);
    return children && index < children->size() ? (*children)[index].get() : nullptr;
}

base::u32 INode::getTransform(base::mat43& transform, const base::mat43* parentWorld) const {
    bool repaired = false;
    transform = composeTransform(*this, repaired);
    const base::u32 faults = repaired ? faultNotFinite : 0;
    if (scene::read(*this, n_inheritsTransform))
        return faults;
    base::mat43 undo, freed;
    if (!parentWorld || !invert(*parentWorld, undo) ||
        !fitsFloat(freed = multiply(undo, transform)))
        return faults | faultParent;
    transform = freed;
    return faults;
}

void INode::getTransform(base::mat43& transform) const {
    INode* parent = scene::read(*this, n_inheritsTransform) ? nullptr : findParent();
    base::mat43 parentWorld;
    if (parent)
        parent->getWorldTransform(parentWorld);
    getTransform(transform, parent ? &parentWorld : nullptr);
}

void INode::getWorldTransform(base::mat43& transform) const {
    base::vector<const INode*> chain{this};
    for (const INode* node = findParent(); node && chain.size() < maximumDepth;
         node = node->findParent()) {
        if (std::find(chain.begin(), chain.end(), node) != chain.end())
            break;
        chain.push_back(node);
    }
    chain.back()->getTransform(transform, nullptr);
    for (std::size_t i = chain.size() - 1; i-- > 0;) {
        base::mat43 local;
        chain[i]->getTransform(local, &transform);
        transform = multiply(transform, local);
    }
}

void INode::setTransform(const base::mat43& transform) {
    base::mat43 own = transform;
    if (INode* parent = scene::read(*this, n_inheritsTransform) ? nullptr : findParent()) {
        base::mat43 parentWorld;
        parent->getWorldTransform(parentWorld);
        own = multiply(parentWorld, transform);
    }
    storeTransform(*this, own);
}

bool INode::hasTransformChannels() const {
    return findLayerPath(findAttribute(n_translate, false)) ||
           findLayerPath(findAttribute(n_scale, false)) ||
           findLayerPath(findAttribute(n_rotate, false));
}

void INode::getTransformKeyTimes(base::vector<base::TimeCode>& times) const {
    times.clear();
    for (const base::name_id name :
         {base::name_id(n_translate), base::name_id(n_scale), base::name_id(n_rotate)})
        mergeKeyTimes(findAttribute(name, false), times);
}

float getFieldOfView(float width, float height, float focalLength, base::u8 fit, float aspect) {
    const auto angle = [focalLength](float size) {
        return 2 * std::atan(size * 0.5f / focalLength);
    };
    switch (fit) {
    case 0:
        return angle(aspect >= 1 ? height : width);
    case 1:
        return angle(width);
    case 2:
        return angle(height);
    case 3:
        return angle(std::sqrt(width * width + height * height));
    default:
        throw base::switch_exception("scene", "scene::getFieldOfView", __LINE__);
    }
}

} // namespace scene
