#include "assimp/import_skeleton.h"

#include "assimp/attribute_writing.h"
#include "assimp/import_nodes.h"
#include "assimp/library_text.h"

#include "scene_schema.h"

#include <assimp/mesh.h>
#include <assimp/scene.h>

#include <algorithm>
#include <cmath>
#include <span>

namespace assimp {

using base::IPlugin;
using base::mat43;
using base::ref;
using base::u32;
using base::vector;
using scene::mesh_schema;
using scene::node_schema;
using scene::skin_schema;

namespace {

/// Inverse of the bone's place in the space of the mesh; the identity where it is not finite.
mat43 readBindPose(const aiBone& bone, SkeletonFaults& faults) {
    const aiMatrix4x4& m = bone.mOffsetMatrix;
    if (!std::ranges::all_of(std::span(&m.a1, 12), [](float v) { return std::isfinite(v); })) {
        ++faults.brokenBindPoses;
        return {};
    }
    return {{{m.a1, m.a2, m.a3}, {m.b1, m.b2, m.b3}, {m.c1, m.c2, m.c3}}, {m.a4, m.b4, m.c4}};
}

} // namespace

VertexJoints SkeletonImport::readJoints(const aiMesh& mesh) {
    bones_.clear();
    for (u32 i = 0; i < mesh.mNumBones; ++i) {
        const aiNode* node = nodes_.find(viewOf(mesh.mBones[i]->mName));
        if (node && !isTransformFactor(*node))
            bones_.push_back(mesh.mBones[i]);
        else
            ++faults_.missingBones;
    }
    if (bones_.empty())
        return {};
    VertexJoints joints = readVertexJoints(bones_, mesh.mNumVertices, faults_);
    hasFreeVertices_ = joints.hasFreeVertices;
    if (!joints.starts.empty())
        faults_.targetsOfSkins += mesh.mNumAnimMeshes;
    return joints;
}

void SkeletonImport::addObjects(const GeometryObjects& objects) {
    for (const ref<IPlugin>& object : objects) {
        if (bones_.empty() || !find(*object, mesh_schema::n_jointsSets))
            continue;
        vector<mat43> poses;
        SkinnedMesh skinned{{}, hasFreeVertices_};
        for (const aiBone* bone : std::as_const(bones_)) {
            poses.push_back(readBindPose(*bone, faults_));
            skinned.joints.push_back(nodes_.find(viewOf(bone->mName)));
        }
        if (hasFreeVertices_)
            poses.emplace_back();
        using Schema = scene::meshBindPoseSet_schema;
        write(appendItem<Schema>(*object, mesh_schema::n_bindPoseSets), Schema::n_transforms) =
            std::move(poses);
        meshes_.emplace(object.get(), std::move(skinned));
    }
    bones_.clear();
}

ref<IPlugin> SkeletonImport::makeSkin(const ref<IPlugin>& mesh, const SkinnedMesh& skinned,
                                      IPlugin& node, base::PluginFactory& factory) {
    ref<IPlugin> skin = factory.create(skin_schema::n_kind);
    if (base::string name = mesh->getName(); !name.empty())
        write(*skin, scene::geometry_schema::n_name) = std::move(name);
    write(*skin, skin_schema::n_baseMesh) = mesh;
    vector<ref<IPlugin>>& joints = write(*skin, skin_schema::n_joints);
    joints.reserve(skinned.joints.size() + 1);
    for (const aiNode* source : skinned.joints)
        joints.push_back(nodes_.objectOf(*source));
    if (skinned.hasFreeVertices)
        joints.push_back(&node);
    for (const ref<IPlugin>& joint : std::as_const(joints))
        write(*joint, node_schema::n_isJoint) = true;
    return skin;
}

void SkeletonImport::connect(base::PluginFactory& factory) {
    if (meshes_.empty())
        return;
    for (const auto& [source, object] : nodes_.made()) {
        if (source->mNumMeshes == 0 || !find(*object, node_schema::n_children))
            continue;
        for (ref<IPlugin>& child : write(*object, node_schema::n_children))
            if (const auto found = meshes_.find(child.get()); found != meshes_.end())
                child = makeSkin(child, found->second, *object, factory);
    }
}

} // namespace assimp
