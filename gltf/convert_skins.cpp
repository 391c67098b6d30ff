#include "gltf/exporter.h"
#include "gltf/index_attribute.h"
#include "gltf/node_transform.h"
#include "gltf/scene_kind.h"
#include "gltf/vertex_array.h"

#include "b_log.h"
#include "scene_mesh.h"
#include "scene_schema.h"

#include <algorithm>

namespace gltf {

using base::AttribMap;
using base::IPlugin;
using base::mat43;
using base::ref;
using base::string;
using base::u32;
using base::vector;
using scene::mesh_schema;
using scene::meshJointsSet_schema;
using scene::skin_schema;

namespace {

/// What is logged of a skin once.
enum SkinFault : u32 {
    noVertexJoints = 1,
    furtherSet = 2,
    endlessPose = 4,
    gapsInJoints = 8,
    unknownJoints = 16,
    missingPoses = 32,
};

/// What a skin is made of.
struct SkinSource {
    const vector<mat43>* transforms = nullptr;
    const vector<scene::Object>* joints = nullptr;
    u32 jointsSet = 0;
};

/// The list's entry at the index that the skin stores, which is clamped to the last one.
const AttribMap* findSet(const scene::ISkin& skin,
                         const scene::DefaultedAttribute<base::i32>& indexName, const IPlugin& mesh,
                         const scene::SchemaAttribute<scene::Items>& list, u32& index) {
    const u32 count = getListCount(mesh, list);
    if (count == 0)
        return nullptr;
    index = std::min(readIndex(skin, indexName, 0), count - 1);
    return findListItem(mesh, list, index);
}

/// False, silently, if something is missing.
bool findSource(const scene::ISkin& skin, SkinSource& source) {
    const scene::IMesh* mesh = findMesh(skin, skin_schema::n_baseMesh);
    if (!mesh)
        return false;
    u32 bindPoseSet = 0;
    const AttribMap* bindPoses = findSet(skin, skin_schema::n_bindPoseSetIndex, *mesh,
                                         mesh_schema::n_bindPoseSets, bindPoseSet);
    const AttribMap* joints = findSet(skin, skin_schema::n_jointsSetIndex, *mesh,
                                      mesh_schema::n_jointsSets, source.jointsSet);
    if (!bindPoses || !joints)
        return false;
    for (const base::name_id name :
         {meshJointsSet_schema::n_jointCounts.id, meshJointsSet_schema::n_indices.id,
          meshJointsSet_schema::n_weights.id})
        if (!joints->findAttribute(name))
            return false;
    source.transforms = find(*bindPoses, scene::meshBindPoseSet_schema::n_transforms);
    source.joints = find(skin, skin_schema::n_joints);
    return source.transforms && !source.transforms->empty() && source.joints &&
           !source.joints->empty();
}

/// The matrices as they stand in the scene; those that are not finite become the identity.
ref<GLTF::Accessor> makeMatrices(const vector<mat43>& transforms, const scene::ISkin& skin,
                                 bool& isRepaired) {
    auto buffer =
        base::makeRef<GLTF::Buffer>(checkedLength(transforms.size() * 16 * sizeof(float), skin));
    auto* out = reinterpret_cast<float*>(buffer->data);
    for (const mat43& transform : transforms) {
        auto columns = columnsOf(transform);
        if (!isFinite(columns.data(), columns.size())) {
            columns = columnsOf({});
            isRepaired = true;
        }
        out = std::copy(columns.begin(), columns.end(), out);
    }
    const base::i32 length = buffer->byteLength;
    return makeAccessor(
        GLTF::Accessor::Type::mat4, transforms.size(),
        base::makeRef<GLTF::BufferView>(0, length, std::move(buffer), GLTF::BufferView::noTarget));
}

/// The joints of the vertices, four each; null if they have none.
const GLTF::Accessor* findVertexJoints(const GLTF::Mesh& gltfMesh) {
    if (gltfMesh.primitives.empty())
        return nullptr;
    const auto* joints = std::as_const(*gltfMesh.primitives[0]).attributes.get("JOINTS_0");
    return joints ? joints->get() : nullptr;
}

/// True if all joints of the vertices are among the first `count`.
bool areBelow(const GLTF::Accessor& vertexJoints, std::size_t count) {
    const auto* joints = reinterpret_cast<const base::u16*>(vertexJoints.bufferView->buffer->data);
    return std::all_of(joints, joints + 4 * std::size_t(vertexJoints.count),
                       [&](base::u16 joint) { return joint < count; });
}

} // namespace

/// Makes places in the table for the joints of `skin`. Logs nothing: its conversion does.
void GLTFScenePlugin::gatherJoints(const IPlugin& skin) {
    const base::Attribute* joints = skin.findAttribute(skin_schema::n_joints);
    if (!joints || joints->type() != base::TypeTraits<scene::Object>::n_array_name)
        return;
    for (const scene::Object& joint : *static_cast<const vector<scene::Object>*>(joints->data())) {
        if (const auto* node = dynamic_cast<const scene::INode*>(joint.get()))
            nodeMap.try_emplace(node);
    }
}

ref<GLTF::Skin> GLTFScenePlugin::convertSkin(const scene::ISkin& skin, const GLTF::Mesh& gltfMesh) {
    SkinSource source;
    if (!findSource(skin, source))
        return nullptr;
    const GLTF::Accessor* vertexJoints = findVertexJoints(gltfMesh);
    if (!vertexJoints) {
        warnOnce(skin, noVertexJoints,
                 "gltf |{}| The mesh has no joints at its vertices, it gets no skin!");
        return nullptr;
    }
    if (!areBelow(*vertexJoints, source.joints->size())) {
        warnOnce(skin, unknownJoints,
                 "gltf |{}| The vertices of the mesh name joints that the skin does not have, it "
                 "gets no skin!");
        return nullptr;
    }
    if (source.transforms->size() < source.joints->size())
        warnOnce(skin, missingPoses,
                 "gltf |{}| The skin has fewer bind poses than joints, the document is not valid!");
    if (source.jointsSet != 0)
        warnOnce(skin, furtherSet,
                 "gltf |{}| The skin names another set of joints than the first, which alone is "
                 "exported!");
    auto gltfSkin = base::makeRef<GLTF::Skin>();
    if (const string* name = find(skin, scene::geometry_schema::n_name))
        gltfSkin->name = *name;
    bool isRepaired = false;
    gltfSkin->inverseBindMatrices = makeMatrices(*source.transforms, skin, isRepaired);
    if (isRepaired)
        warnOnce(skin, endlessPose,
                 "gltf |{}| The skin has bind poses that are not finite, they are ignored.");
    addJoints(*gltfSkin, *source.joints, skin);
    return gltfSkin;
}

void GLTFScenePlugin::addJoints(GLTF::Skin& gltfSkin, const vector<scene::Object>& joints,
                                const scene::ISkin& skin) {
    bool hasGaps = false;
    gltfSkin.joints.reserve(joints.size());
    for (const scene::Object& joint : joints) {
        const auto* node = dynamic_cast<const scene::INode*>(joint.get());
        if (!node) {
            // Left out, it would shift the numbers by which vertices name their joints.
            hasGaps = true;
            gltfSkin.joints.push_back(base::makeRef<GLTF::Node>());
            if (gltfRoot_)
                gltfRoot_->children.push_back(gltfSkin.joints.back());
            continue;
        }
        Joint& known = nodeMap[node];
        if (!known.node) {
            known.node = base::makeRef<GLTF::Node>();
            expectedJoints_.push_back(node);
        }
        gltfSkin.joints.push_back(known.node);
    }
    if (hasGaps)
        warnOnce(skin, gapsInJoints,
                 "gltf |{}| The skin has joints that are no nodes, empty ones stand for them!");
}

/// Names the joints of skins that the tree does not hold.
void GLTFScenePlugin::reportMissingJoints() {
    for (const scene::INode* joint : expectedJoints_) {
        if (!nodeMap.at(joint).isPlaced)
            base::log().log(base::logScene, base::logWarning,
                            "gltf |{}| The joint is not in the scene's tree, it stays empty!",
                            joint->getName());
    }
}

void GLTFScenePlugin::convertSkinChild(GLTF::Node& gltfNode, IPlugin& child, u32 materialIndex) {
    const auto* skin = findClass<const scene::ISkin>(child);
    scene::IMesh* baseMesh = skin ? findMesh(*skin, skin_schema::n_baseMesh) : nullptr;
    if (!baseMesh)
        return;
    if (GLTF::Node* holder = convertMeshChild(gltfNode, *baseMesh, materialIndex, false))
        holder->skin = convertSkin(*skin, *holder->mesh);
}

} // namespace gltf
