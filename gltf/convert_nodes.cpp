#include "gltf/exporter.h"
#include "gltf/scene_kind.h"

#include "scene_schema.h"
#include "scene_transform.h"

#include <cmath>

namespace gltf {

using base::IPlugin;
using base::mat43;
using base::name_id;
using base::ref;
using base::string;
using base::string_view;
using base::u32;
using base::u8;
using base::vec3f;

namespace {

/// Levels of the tree that are converted; beyond them recursion would exhaust the stack.
constexpr u32 maximumLevel = 4096;
/// Nodes in the tree from which on a node that was met before is not repeated with all that is
/// below it: shared nodes that share nodes multiply without end.
constexpr u32 maximumRepeatedNodes = 1u << 20;

void logNode(const IPlugin& node, int level, string_view text) {
    base::log().log(base::logScene, level, "gltf |{}| {}", node.getName(), text);
}

mat43 worldFromNode(const TreePosition& position) {
    mat43 world = position.parentFromNode;
    for (const TreePosition* above = position.parent; above; above = above->parent)
        world = scene::multiply(above->parentFromNode, world);
    return world;
}

/// True if the node at `position` or one above it is animated.
bool isPlacedByAnimation(const TreePosition* position) {
    while (position && !position->isAnimated)
        position = position->parent;
    return position != nullptr;
}

vec3f negated(const vec3f& v) {
    return {-v.x, -v.y, -v.z};
}

/// `matrix` followed by the turn that takes the scene's up axis to Y.
mat43 turnedUp(const mat43& matrix, u8 upAxis) {
    const auto& [m, t] = matrix;
    switch (upAxis) {
    case 0:
        return {{negated(m.r1), m.r0, m.r2}, {-t.y, t.x, t.z}};
    case 2:
        return {{m.r0, m.r2, negated(m.r1)}, {t.x, t.z, -t.y}};
    default:
        return matrix;
    }
}

ref<GLTF::Node::Transform> makeMatrix(const mat43& matrix) {
    const auto& [m, t] = matrix;
    const float rows[16] = {m.r0.x, m.r0.y, m.r0.z, static_cast<float>(t.x),
                            m.r1.x, m.r1.y, m.r1.z, static_cast<float>(t.y),
                            m.r2.x, m.r2.y, m.r2.z, static_cast<float>(t.z),
                            0,      0,      0,      1};
    return base::makeRef<GLTF::Node::TransformMatrix>(rows, false);
}

ref<GLTF::Node::Transform> makeParts(const mat43& matrix) {
    const auto [translation, rotation, scale] = scene::decomposeTransform(matrix);
    auto parts = base::makeRef<GLTF::Node::TransformTRS>();
    parts->translation = {translation.x, translation.y, translation.z};
    parts->rotation = {rotation.x, rotation.y, rotation.z, rotation.w};
    parts->scale = {scale.x, scale.y, scale.z};
    return parts;
}

void setName(GLTF::Node& gltfNode, const IPlugin& node) {
    if (const string* name = find(node, scene::node_schema::n_name))
        gltfNode.name = *name;
}

/// The mesh that a skin or morph deforms, null if it has none.
template <class Deformer>
IPlugin* findBaseMesh(IPlugin& child) {
    const auto* deformer = findClass<const Deformer>(child);
    IPlugin* object = deformer ? findObject(*deformer, Deformer::Schema::n_baseMesh) : nullptr;
    return object && object->typeName() == scene::mesh_schema::n_kind ? object : nullptr;
}

/// The slot of materials for a node and what is below it: its own, else that from above. A
/// negative one lies past the end of every list.
u32 readMaterialIndex(const IPlugin& node, u32 inherited) {
    const base::Attribute* index = node.findAttribute(scene::node_schema::n_materialIndex);
    if (!index)
        return inherited;
    if (index->type() == base::TypeTraits<u32>::n_name)
        return *static_cast<const u32*>(index->data());
    const base::i32* value = find(node, scene::node_schema::n_materialIndex);
    return value ? static_cast<u32>(*value) : inherited;
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
    constexpr u32 animatedParent = scene::INode::faultParent << 1;
    const bool isFree = parent && !read(node, scene::node_schema::n_inheritsTransform);
    mat43 transform;
    u32 faults = 0;
    if (isFree) {
        const mat43 parentWorld = worldFromNode(*parent);
        faults = node.getTransform(transform, &parentWorld);
        if (isPlacedByAnimation(parent) && !node.hasTransformChannels())
            faults |= animatedParent;
    } else {
        faults = node.getTransform(transform, nullptr);
    }
    if (faults == 0)
        return transform;

    u32& known = transformFaults_[&node];
    const u32 added = faults & ~known;
    known |= faults;
    if ((added & scene::INode::faultNotFinite) != 0)
        logNode(node, base::logWarning,
                "The transform has values that are not finite, they are ignored.");
    if ((added & scene::INode::faultParent) != 0)
        logNode(node, base::logWarning,
                "The transform can't be freed of its parent's, the parent is unknown or its "
                "transform has no inverse.");
    if ((added & animatedParent) != 0)
        logNode(node, base::logWarning,
                "The node does not inherit the transform of its parent, which is animated: it is "
                "placed for the present time only!");
    return transform;
}

ref<GLTF::Node> GLTFScenePlugin::convertRoot(const scene::INode& root, u8 upAxis) {
    const TreePosition position{root,
                                nullptr,
                                1,
                                readMaterialIndex(root, 0),
                                root.hasTransformChannels(),
                                findParentFromNode(root, nullptr)};
    const auto gltfRoot = base::makeRef<GLTF::Node>();
    // Always a matrix: the turn of the axes can't be a part of animated values.
    gltfRoot->transform = makeMatrix(turnedUp(position.parentFromNode, upAxis));
    setName(*gltfRoot, root);
    convertNode(*gltfRoot, position);
    return gltfRoot;
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
    const auto gltfChild = base::makeRef<GLTF::Node>();
    if (read(*node, scene::node_schema::n_isJoint))
        nodeMap[node] = gltfChild.get();
    ++nodeCount_;
    setName(*gltfChild, *node);

    const TreePosition position{*node,
                                &parent,
                                parent.level + 1,
                                readMaterialIndex(*node, parent.materialIndex),
                                node->hasTransformChannels(),
                                findParentFromNode(*node, &parent)};
    convertTransform(position, *gltfChild);
    gltfNode.children.push_back(gltfChild);
    convertNode(*gltfChild, position);
}

/// False, with a message, for a node that would make the tree endless, too deep or too large, and
/// for a joint that has its place already.
bool GLTFScenePlugin::mayPlace(const scene::INode& child, const TreePosition& parent) {
    const auto walked = walkedNodes_.find(&child);
    if (walked != walkedNodes_.end() && walked->second) {
        logNode(child, base::logError, "The node is a child of its own descendant, it is skipped!");
        return false;
    }
    if (nodeMap.contains(&child)) {
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
    gltfNode.transform = position.isAnimated ? makeParts(position.parentFromNode)
                                             : makeMatrix(position.parentFromNode);
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

/// Cameras, lights, hair, points and instancers leave no trace in the document.
void GLTFScenePlugin::convertObject(GLTF::Node& gltfNode, IPlugin& child, u32 materialIndex) {
    const name_id kind = child.typeName();
    if (kind == scene::mesh_schema::n_kind) {
        convertMeshChild(gltfNode, child, materialIndex, false);
    } else if (kind == scene::lines_schema::n_kind) {
        convertLinesChild(gltfNode, child, materialIndex);
    } else if (kind == scene::skin_schema::n_kind) {
        // The mesh in its rest pose; the holder gets no skin.
        if (IPlugin* baseMesh = findBaseMesh<scene::ISkin>(child))
            convertMeshChild(gltfNode, *baseMesh, materialIndex, false);
    } else if (kind == scene::morph_schema::n_kind) {
        // The mesh as it is without its targets.
        if (IPlugin* baseMesh = findBaseMesh<scene::IMorph>(child))
            convertMeshChild(gltfNode, *baseMesh, materialIndex, true);
    }
}

void GLTFScenePlugin::convertMeshChild(GLTF::Node& gltfNode, IPlugin& child, u32 materialIndex,
                                       bool withTargets) {
    auto* mesh = findClass<scene::IMesh>(child);
    if (!mesh)
        return;
    const auto [entry, isNew] = meshMap.try_emplace(mesh, nullptr);
    ref<GLTF::Mesh> gltfMesh = entry->second;
    if (isNew) {
        gltfMesh = convertMesh(*mesh, materialIndex, withTargets);
        entry->second = gltfMesh.get();
    }
    if (gltfMesh)
        attachMesh(gltfNode, std::move(gltfMesh));
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
