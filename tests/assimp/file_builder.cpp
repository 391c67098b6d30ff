#include "file_builder.h"

#include "assimp/import_scene.h"

#include <algorithm>

namespace test_support {

namespace {

/// Appends to one of the library's arrays of pointers.
template <class T>
T& append(T**& array, unsigned& count, T* item) {
    T** longer = new T*[count + 1];
    std::copy(array, array + count, longer);
    longer[count++] = item;
    delete[] array;
    array = longer;
    return *item;
}

template <class Key, class Source>
Key* makeKeys(const Source& source, unsigned& count) {
    count = static_cast<unsigned>(source.size());
    Key* keys = count ? new Key[count] : nullptr;
    for (unsigned i = 0; i < count; ++i)
        keys[i] = Key(source[i].first, source[i].second);
    return keys;
}

} // namespace

FileBuilder::FileBuilder() : scene(std::make_unique<aiScene>()) {
    scene->mRootNode = new aiNode("root");
}

aiNode& FileBuilder::node(const std::string& name, aiNode& parent, const aiMatrix4x4& transform) {
    auto* child = new aiNode(name);
    child->mParent = &parent;
    child->mTransformation = transform;
    return append(parent.mChildren, parent.mNumChildren, child);
}

aiMesh& FileBuilder::mesh(aiNode& user, const std::vector<aiVector3D>& corners) {
    auto* mesh = new aiMesh;
    mesh->mName = "mesh";
    mesh->mNumVertices = static_cast<unsigned>(corners.size());
    mesh->mVertices = new aiVector3D[corners.size()];
    std::ranges::copy(corners, mesh->mVertices);
    mesh->mNumFaces = mesh->mNumVertices / 3;
    mesh->mFaces = new aiFace[mesh->mNumFaces];
    for (unsigned f = 0; f < mesh->mNumFaces; ++f) {
        mesh->mFaces[f].mNumIndices = 3;
        mesh->mFaces[f].mIndices = new unsigned[3]{3 * f, 3 * f + 1, 3 * f + 2};
    }
    use(user, scene->mNumMeshes);
    return append(scene->mMeshes, scene->mNumMeshes, mesh);
}

void FileBuilder::use(aiNode& user, unsigned mesh) {
    auto* longer = new unsigned[user.mNumMeshes + 1];
    std::copy(user.mMeshes, user.mMeshes + user.mNumMeshes, longer);
    longer[user.mNumMeshes++] = mesh;
    delete[] user.mMeshes;
    user.mMeshes = longer;
}

void FileBuilder::bone(aiMesh& mesh, const std::string& name, const aiMatrix4x4& offset,
                       const Weights& weights) {
    auto* bone = new aiBone;
    bone->mName = name;
    bone->mOffsetMatrix = offset;
    bone->mNumWeights = static_cast<unsigned>(weights.size());
    bone->mWeights = new aiVertexWeight[weights.size()];
    for (unsigned i = 0; i < weights.size(); ++i)
        bone->mWeights[i] = aiVertexWeight(weights[i].first, weights[i].second);
    append(mesh.mBones, mesh.mNumBones, bone);
}

aiAnimMesh& FileBuilder::target(aiMesh& mesh, const std::string& name, float weight,
                                const std::vector<aiVector3D>& differences) {
    auto* target = new aiAnimMesh;
    target->mName = name;
    target->mWeight = weight;
    target->mNumVertices = static_cast<unsigned>(differences.size());
    target->mVertices = new aiVector3D[differences.size()];
    for (unsigned v = 0; v < differences.size(); ++v)
        target->mVertices[v] = mesh.mVertices[v] + differences[v];
    return append(mesh.mAnimMeshes, mesh.mNumAnimMeshes, target);
}

aiAnimation& FileBuilder::animation(double ticksPerSecond, double duration) {
    auto* animation = new aiAnimation;
    animation->mTicksPerSecond = ticksPerSecond;
    animation->mDuration = duration;
    return append(scene->mAnimations, scene->mNumAnimations, animation);
}

aiNodeAnim& FileBuilder::channel(aiAnimation& animation, const std::string& node,
                                 const Keys& keys) {
    auto* channel = new aiNodeAnim;
    channel->mNodeName = node;
    channel->mPositionKeys = makeKeys<aiVectorKey>(keys.positions, channel->mNumPositionKeys);
    channel->mRotationKeys = makeKeys<aiQuatKey>(keys.rotations, channel->mNumRotationKeys);
    channel->mScalingKeys = makeKeys<aiVectorKey>(keys.scales, channel->mNumScalingKeys);
    return append(animation.mChannels, animation.mNumChannels, channel);
}

void FileBuilder::weights(aiAnimation& animation, const std::string& name,
                          const std::vector<std::pair<double, std::vector<double>>>& keys) {
    auto* channel = new aiMeshMorphAnim;
    channel->mName = name;
    channel->mNumKeys = static_cast<unsigned>(keys.size());
    channel->mKeys = new aiMeshMorphKey[keys.size()];
    for (unsigned k = 0; k < keys.size(); ++k) {
        aiMeshMorphKey& key = channel->mKeys[k];
        key.mTime = keys[k].first;
        key.mNumValuesAndWeights = static_cast<unsigned>(keys[k].second.size());
        key.mValues = new unsigned[keys[k].second.size()];
        key.mWeights = new double[keys[k].second.size()];
        for (unsigned i = 0; i < keys[k].second.size(); ++i) {
            key.mValues[i] = i;
            key.mWeights[i] = keys[k].second[i];
        }
    }
    append(animation.mMorphMeshChannels, animation.mNumMorphMeshChannels, channel);
}

aiMatrix4x4 translated(float x, float y, float z) {
    return {1, 0, 0, x, 0, 1, 0, y, 0, 0, 1, z, 0, 0, 0, 1};
}

aiQuaternion turned(float degrees, const aiVector3D& axis) {
    return {axis, degrees * 3.14159265f / 180};
}

aiMatrix4x4 matrixOf(const aiQuaternion& rotation) {
    return aiMatrix4x4(rotation.GetMatrix());
}

base::IPlugin& FileImport::importFile(FileBuilder& file, const std::string& name) {
    document_ = std::make_unique<scene::SceneFactory>();
    scene::register_scene_schema(*document_);
    assimp::importScene(*file.scene, settings_, path(name), *document_);
    return only(scene::scene_schema::n_kind);
}

} // namespace test_support
