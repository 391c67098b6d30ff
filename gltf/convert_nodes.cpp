#include "gltf/exporter.h"
#include "gltf/index_attribute.h"
#include "gltf/node_transform.h"
#include "gltf/scene_kind.h"

#include "scene_animation.h"
#include "scene_schema.h"
#include "scene_transform.h"

#include <algorithm>

namespace gltf {

using base::IPlugin;
using base::mat43;
using base::name_id;
using base::ref;
using base::string;
using base::string_view;
using base::u32;
using base::u8;

namespace {

/// Levels of the tree that are converted; beyond them recursion would exhaust the stack.
constexpr u32 maximumLevel = 4096;
/// Nodes in the tree from which on a node that was met before is not repeated with all that is
/// below it: shared nodes that share nodes multiply without end.
constexpr u32 maximumRepeatedNodes = 1u << 20;
/// A fault of a node's place beside those of its own transform.
constexpr u32 animatedParent = scene::INode::faultParent << 1;

void logNode(const IPlugin& node, int level, string_view text) {
    base::log().log(base::logScene, level, "gltf |{}| {}", node.getName(), text);
}

mat43 worldFromNode(const TreePosition& position) {
    mat43 world = position.parentFromNode;
    for (const TreePosition* above = position.parent; above; above = above->parent)
        world = scene::multiply(above->parentFromNode, world);
    return world;
}

/// True if all parts of the transform of `node` are sampled, so that it can undo what moves.
bool isWhollyAnimated(const scene::INode& node) {
    using Schema = scene::node_schema;
    const name_id parts[] = {Schema::n_translate, Schema::n_scale, Schema::n_rotate};
    return std::ranges::all_of(
        parts, [&](name_id part) { return scene::findLayerPath(node.findAttribute(part, false)); });
}

/// True if the node at `position` or one above it is animated.
bool isPlacedByAnimation(const TreePosition* position) {
    while (position && !position->isAnimated)
        position = position->parent;
    return position != nullptr;
}

void setName(GLTF::Node& gltfNode, const IPlugin& node) {
    if (const string* name = find(node, scene::node_schema::n_name))
        gltfNode.name = *name;
}

/// True for the edges of a mesh: lines assigned to an object or to faces.
bool hasAssignment(const IPlugin& lines) {
    const name_id name = scene::lines_schema::n_assignment;
    const base::Attribute* assignment = lines.findAttribute(name);
    if (!assignment)
        return false;
    if (assignment->type() == base::TypeTraits<scene::Object>::n_name)
        return static_cast<const scene::Object*>(assignment->data())->get() != nullptr;
    const auto* faces = find(lines, scene::lines_schema::n_assignment);
    return faces && !faces->empty();
}

} // namespace

/// The transform of `node` below `parent`, null at the root.
mat43 GLTFScenePlugin::findParentFromNode(const scene::INode& node, const TreePosition* parent) {
    const bool isFree = parent && !scene::read(node, scene::node_schema::n_inheritsTransform);
    mat43 transform;
    u32 faults = 0;
    if (isFree) {
        const mat43 parentWorld = worldFromNode(*parent);
        faults = node.getTransform(transform, &parentWorld);
        if (isPlacedByAnimation(parent) && !isWhollyAnimated(node))
            faults |= animatedParent;
    } else {
        faults = node.getTransform(transform, nullptr);
    }
    if (faults != 0)
        logTransformFaults(node, faults);
    return transform;
}

/// Warns of an object, whose name stands for "{}". `fault` is a bit that tells the text from the
/// others that there are for objects of its kind.
void GLTFScenePlugin::warnOnce(const IPlugin& object, u32 fault, string_view text) {
    u32& known = faults_[&object];
    if ((known & fault) == 0)
        base::log().log(base::logScene, base::logWarning, text, object.getName());
    known |= fault;
}

void GLTFScenePlugin::logTransformFaults(const scene::INode& node, u32 faults) {
    const std::pair<u32, const char*> texts[] = {
        {scene::INode::faultNotFinite,
         "gltf |{}| The transform has values that are not finite, they are ignored."},
        {scene::INode::faultParent,
         "gltf |{}| The transform can't be freed of its parent's, the parent is unknown or its "
         "transform has no inverse."},
        {animatedParent,
         "gltf |{}| The node does not inherit the transform of its parent, which is animated: it "
         "is placed for the present time only!"}};
    for (const auto& [fault, text] : texts)
        if ((faults & fault) != 0)
            warnOnce(node, fault, text);
}

void GLTFScenePlugin::convertRoot(const scene::INode& root, u8 upAxis) {
    const TreePosition position{root,
                                nullptr,
                                1,
                                readIndex(root, scene::node_schema::n_materialIndex, 0),
                                root.hasTransformChannels(),
                                findParentFromNode(root, nullptr)};
    // Always a matrix: the turn of the axes can't be a part of animated values.
    gltfRoot_->transform = makeTransform(turnedUp(position.parentFromNode, upAxis));
    setName(*gltfRoot_, root);
    if (Joint* joint = findJoint(root))
        *joint = {gltfRoot_, true};
    convertNode(*gltfRoot_, position);
    reportMissingJoints();
}

void GLTFScenePlugin::convertNode(GLTF::Node& gltfNode, const TreePosition& position) {
    const auto* children = find(position.node, scene::node_schema::n_children);
    if (!children || children->empty())
        return;
    bool hasNodes = false;
    for (const scene::Object& child : *children) {
        if (!child || child->typeName() != scene::node_schema::n_kind)
            continue;
        if (!hasNodes)
            walkedNodes_[&position.node] = true;
        hasNodes = true;
        convertChildNode(gltfNode, *child, position);
    }
    if (hasNodes)
        walkedNodes_[&position.node] = false;
    for (const scene::Object& child : *children) {
        if (child)
            convertObject(gltfNode, *child, position.materialIndex);
    }
}

void GLTFScenePlugin::convertChildNode(GLTF::Node& gltfNode, IPlugin& child,
                                       const TreePosition& parent) {
    const auto* node = findClass<const scene::INode>(child);
    if (!node || !mayPlace(*node, parent))
        return;
    const ref<GLTF::Node> gltfChild = placeNode(*node);
    setName(*gltfChild, *node);

    const TreePosition position{
        *node,
        &parent,
        parent.level + 1,
        readIndex(*node, scene::node_schema::n_materialIndex, parent.materialIndex),
        node->hasTransformChannels(),
        findParentFromNode(*node, &parent)};
    convertTransform(position, *gltfChild);
    gltfNode.children.push_back(gltfChild);
    convertNode(*gltfChild, position);
}

/// Null for a node that is no joint, as far as is known.
GLTFScenePlugin::Joint* GLTFScenePlugin::findJoint(const scene::INode& node) {
    if (nodeMap.empty())
        return nullptr;
    const auto joint = nodeMap.find(&node);
    return joint != nodeMap.end() ? &joint->second : nullptr;
}

/// A node of the document for `node`; for a joint the one that its skins have.
ref<GLTF::Node> GLTFScenePlugin::placeNode(const scene::INode& node) {
    ++nodeCount_;
    Joint* joint =
        scene::read(node, scene::node_schema::n_isJoint) ? &nodeMap[&node] : findJoint(node);
    if (!joint)
        return base::makeRef<GLTF::Node>();
    if (!joint->node)
        joint->node = base::makeRef<GLTF::Node>();
    joint->isPlaced = true;
    return joint->node;
}

/// False, with a message, for a node that would make the tree endless, too deep or too large, and
/// for a joint that has its place already.
bool GLTFScenePlugin::mayPlace(const scene::INode& child, const TreePosition& parent) {
    const auto walked = walkedNodes_.find(&child);
    if (walked != walkedNodes_.end() && walked->second) {
        logNode(child, base::logError, "The node is a child of its own descendant, it is skipped!");
        return false;
    }
    if (const Joint* joint = findJoint(child); joint && joint->isPlaced) {
        logNode(child, base::logWarning,
                "The joint is the child of several nodes, only the first place counts!");
        return false;
    }
    if (parent.level >= maximumLevel) {
        logNode(child, base::logError, "The node lies too deep in the tree, it is skipped!");
        return false;
    }
    if (walked != walkedNodes_.end() && nodeCount_ >= maximumRepeatedNodes) {
        logNode(child, base::logError,
                "The node was met before and the tree is too large, it is skipped!");
        return false;
    }
    return true;
}

void GLTFScenePlugin::convertTransform(const TreePosition& position, GLTF::Node& gltfNode) {
    if (!position.isAnimated) {
        gltfNode.transform = makeTransform(position.parentFromNode);
        return;
    }
    scene::TransformParts parts;
    if (!splitTransform(position.parentFromNode, parts))
        logTransformFaults(position.node, scene::INode::faultNotFinite);
    gltfNode.transform = makeTransform(parts);
    if (!exportAnimations)
        return;
    base::vector<base::TimeCode> times;
    position.node.getTransformKeyTimes(times);
    if (!times.empty() && times.front() != times.back())
        makeNodeAnimation(position, gltfNode, times);
}

GLTF::Node* GLTFScenePlugin::attachMesh(GLTF::Node& gltfNode, ref<GLTF::Mesh> mesh) {
    if (!gltfNode.mesh) {
        gltfNode.mesh = std::move(mesh);
        return &gltfNode;
    }
    const auto holder = base::makeRef<GLTF::Node>();
    holder->mesh = std::move(mesh);
    gltfNode.children.push_back(holder);
    return holder.get();
}

/// Cameras, hair, points and instancers leave no trace in the document.
void GLTFScenePlugin::convertObject(GLTF::Node& gltfNode, IPlugin& child, u32 materialIndex) {
    const name_id kind = child.typeName();
    if (kind == scene::mesh_schema::n_kind) {
        if (auto* mesh = findClass<scene::IMesh>(child))
            convertMeshChild(gltfNode, *mesh, materialIndex, false);
    } else if (kind == scene::lines_schema::n_kind) {
        convertLinesChild(gltfNode, child, materialIndex);
    } else if (kind == scene::skin_schema::n_kind) {
        convertSkinChild(gltfNode, child, materialIndex);
    } else if (kind == scene::morph_schema::n_kind) {
        convertMorphChild(gltfNode, child, materialIndex);
    } else if (kind == scene::light_schema::n_kind) {
        convertLightChild(gltfNode, child);
    }
}

/// Returns the node that took the mesh, null if it gave nothing.
GLTF::Node* GLTFScenePlugin::convertMeshChild(GLTF::Node& gltfNode, scene::IMesh& mesh,
                                              u32 materialIndex, bool withTargets) {
    const auto [entry, isNew] = meshMap.try_emplace(&mesh, nullptr);
    ref<GLTF::Mesh> gltfMesh = entry->second;
    if (isNew) {
        gltfMesh = convertMesh(mesh, materialIndex, withTargets);
        entry->second = gltfMesh.get();
    }
    return gltfMesh ? attachMesh(gltfNode, std::move(gltfMesh)) : nullptr;
}

void GLTFScenePlugin::convertLinesChild(GLTF::Node& gltfNode, IPlugin& child, u32 materialIndex) {
    auto* lines = findClass<scene::ILines>(child);
    if (!lines)
        return;
    const bool isEdges = hasAssignment(*lines);
    if (isEdges ? !exportEdges : !exportHair)
        return;
    const auto [entry, isNew] = linesMap.try_emplace(lines, nullptr);
    ref<GLTF::Mesh> gltfMesh = entry->second;
    if (isNew) {
        gltfMesh = convertLines(*lines, materialIndex, isEdges);
        entry->second = gltfMesh.get();
    }
    if (gltfMesh)
        attachMesh(gltfNode, std::move(gltfMesh));
}

} // namespace gltf
