#include "assimp/import_skeleton.h"

#include "assimp/attribute_writing.h"
#include "assimp/library_matrix.h"
#include "assimp/library_text.h"

#include "scene_schema.h"

#include <assimp/mesh.h>
#include <assimp/scene.h>

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
    mat43 pose;
    faults.brokenBindPoses += !readMatrix(bone.mOffsetMatrix, pose);
    return pose;
}

} // namespace

BoundMesh SkeletonImport::readJoints(const aiMesh& mesh) {
    BoundMesh bound;
    for (u32 i = 0; i < mesh.mNumBones; ++i) {
        const aiNode* node = nodes_.find(viewOf(mesh.mBones[i]->mName));
        if (node && !nodes_.isFactor(*node))
            bound.bones.push_back(mesh.mBones[i]);
        else
            ++faults_.missingBones;
    }
    if (bound.bones.empty())
        return bound;
    bound.joints = readVertexJoints(bound.bones, mesh.mNumVertices, faults_);
    bound.hasFreeVertices = bound.joints.hasFreeVertices;
    if (!bound.joints.starts.empty())
        faults_.targetsOfSkins += mesh.mNumAnimMeshes;
    return bound;
}

void SkeletonImport::addObjects(const BoundMesh& bound, const GeometryObjects& objects) {
    for (const ref<IPlugin>& object : objects) {
        if (bound.bones.empty() || !find(*object, mesh_schema::n_jointsSets))
            continue;
        vector<mat43> poses;
        SkinnedMesh skinned{{}, bound.hasFreeVertices};
        for (const aiBone* bone : bound.bones) {
            poses.push_back(readBindPose(*bone, faults_));
            skinned.joints.push_back(nodes_.find(viewOf(bone->mName)));
        }
        if (bound.hasFreeVertices)
            poses.emplace_back();
        using Schema = scene::meshBindPoseSet_schema;
        write(appendItem<Schema>(*object, mesh_schema::n_bindPoseSets), Schema::n_transforms) =
            std::move(poses);
        meshes_.emplace(object.get(), std::move(skinned));
    }
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
