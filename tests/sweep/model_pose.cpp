#include "model_pose.h"

#include "model_world.h"
#include "polygon.h"

#include <algorithm>
#include <map>
#include <string>

using namespace test_support;

namespace {

double ticksPerSecond(const aiAnimation& animation) {
    return animation.mTicksPerSecond > 0 ? animation.mTicksPerSecond : 25;
}

/// The keys around a time and how far it is from the first to the second.
struct Between {
    unsigned a = 0, b = 0;
    double u = 0;
};

template <class Key>
Between find(const Key* keys, unsigned count, double time) {
    unsigned next = 0;
    while (next < count && keys[next].mTime <= time) {
        ++next;
    }
    if (next == 0) {
        return {};
    }
    if (next == count) {
        return {count - 1, count - 1, 0};
    }
    return {next - 1, next,
            (time - keys[next - 1].mTime) / (keys[next].mTime - keys[next - 1].mTime)};
}

Vector evaluate(const aiVectorKey* keys, unsigned count, double time) {
    const Between at = find(keys, count, time);
    const aiVector3D &a = keys[at.a].mValue, &b = keys[at.b].mValue;
    return {a.x + at.u * (b.x - a.x), a.y + at.u * (b.y - a.y), a.z + at.u * (b.z - a.z)};
}

Quaternion evaluate(const aiQuatKey* keys, unsigned count, double time) {
    const Between at = find(keys, count, time);
    const auto unit = [](const aiQuaternion& q) -> Quaternion {
        const double size = std::sqrt(double(q.x) * q.x + double(q.y) * q.y + double(q.z) * q.z +
                                      double(q.w) * q.w);
        return {q.x / size, q.y / size, q.z / size, q.w / size};
    };
    return slerp(unit(keys[at.a].mValue), unit(keys[at.b].mValue), at.u);
}

Matrix localMatrix(const aiNodeAnim& channel, double time) {
    Placement placement;
    if (channel.mNumPositionKeys > 0) {
        placement.translation = evaluate(channel.mPositionKeys, channel.mNumPositionKeys, time);
    }
    if (channel.mNumRotationKeys > 0) {
        placement.rotation = evaluate(channel.mRotationKeys, channel.mNumRotationKeys, time);
    }
    if (channel.mNumScalingKeys > 0) {
        placement.scale = evaluate(channel.mScalingKeys, channel.mNumScalingKeys, time);
    }
    return toMatrix(placement);
}

class Poser {
public:
    Poser(const aiScene& scene, double seconds) : scene_(scene) {
        if (scene.mNumAnimations > 0) {
            animation_ = scene.mAnimations[0];
            time_ = seconds * ticksPerSecond(*animation_);
            for (unsigned i = 0; i < animation_->mNumChannels; ++i) {
                channels_.emplace(animation_->mChannels[i]->mNodeName.C_Str(),
                                  animation_->mChannels[i]);
            }
        }
    }

    ModelPose run(const Matrix& worldFromFile) {
        place(*scene_.mRootNode, worldFromFile);
        for (const auto& [node, world] : placed_) {
            for (unsigned i = 0; i < node->mNumMeshes; ++i) {
                addMesh(*node, node->mMeshes[i], world);
            }
        }
        return std::move(pose_);
    }

private:
    void place(const aiNode& node, const Matrix& worldFromParent) {
        const auto channel = channels_.find(node.mName.C_Str());
        const Matrix world =
            worldFromParent * (channel == channels_.end() ? toMatrix(node.mTransformation)
                                                          : localMatrix(*channel->second, time_));
        placed_.emplace_back(&node, world);
        byName_.emplace(node.mName.C_Str(), world);
        for (unsigned i = 0; i < node.mNumChildren; ++i) {
            place(*node.mChildren[i], world);
        }
    }

    std::vector<double> weightsOf(const aiNode& node, const aiMesh& mesh, unsigned meshIndex) const;
    std::vector<Vector> morphed(const aiNode& node, const aiMesh& mesh, unsigned meshIndex) const;
    void skin(std::vector<Vector>& vertices, const aiMesh& mesh, const Matrix& world) const;
    void addMesh(const aiNode& node, unsigned meshIndex, const Matrix& world);

    const aiScene& scene_;
    const aiAnimation* animation_ = nullptr;
    double time_ = 0;
    std::map<std::string, const aiNodeAnim*> channels_;
    std::vector<std::pair<const aiNode*, Matrix>> placed_;
    std::map<std::string, Matrix> byName_;
    ModelPose pose_;
};

/// The weights of the morph targets. FBX names its keys by node and place of the mesh, and numbers
/// the channels of the file: a channel with shapes in between has a target of its name for each, of
/// which the last is the whole shape.
std::vector<double> Poser::weightsOf(const aiNode& node, const aiMesh& mesh,
                                     unsigned meshIndex) const {
    std::vector<double> weights;
    std::vector<unsigned> targetOfChannel;
    for (unsigned t = 0; t < mesh.mNumAnimMeshes; ++t) {
        const aiAnimMesh& target = *mesh.mAnimMeshes[t];
        if (t > 0 && target.mName.length > 0 && target.mName == mesh.mAnimMeshes[t - 1]->mName) {
            weights[t - 1] = 0;
            targetOfChannel.back() = t;
        } else {
            targetOfChannel.push_back(t);
        }
        weights.push_back(target.mWeight);
    }
    const std::string name = node.mName.C_Str();
    const auto place = std::find(node.mMeshes, node.mMeshes + node.mNumMeshes, meshIndex);
    const std::string numbered = name + "*" + std::to_string(place - node.mMeshes);
    for (unsigned i = 0; animation_ && i < animation_->mNumMorphMeshChannels; ++i) {
        const aiMeshMorphAnim& channel = *animation_->mMorphMeshChannels[i];
        const std::string target = channel.mName.C_Str();
        if (target != name && target != numbered) {
            continue;
        }
        const Between at = find(channel.mKeys, channel.mNumKeys, time_);
        const aiMeshMorphKey &a = channel.mKeys[at.a], &b = channel.mKeys[at.b];
        for (unsigned k = 0; k < a.mNumValuesAndWeights; ++k) {
            weights.at(targetOfChannel.at(a.mValues[k])) =
                a.mWeights[k] + at.u * (b.mWeights[k] - a.mWeights[k]);
        }
    }
    return weights;
}

std::vector<Vector> Poser::morphed(const aiNode& node, const aiMesh& mesh,
                                   unsigned meshIndex) const {
    const std::vector<double> weights = weightsOf(node, mesh, meshIndex);
    std::vector<Vector> result;
    for (unsigned v = 0; v < mesh.mNumVertices; ++v) {
        const aiVector3D& base = mesh.mVertices[v];
        Vector position{base.x, base.y, base.z};
        // A mesh with a skeleton is exported without its targets.
        for (unsigned t = 0; mesh.mNumBones == 0 && t < mesh.mNumAnimMeshes; ++t) {
            if (!mesh.mAnimMeshes[t]->mVertices) {
                continue;
            }
            const aiVector3D& whole = mesh.mAnimMeshes[t]->mVertices[v];
            position[0] += weights[t] * (double(whole.x) - base.x);
            position[1] += weights[t] * (double(whole.y) - base.y);
            position[2] += weights[t] * (double(whole.z) - base.z);
        }
        result.push_back(position);
    }
    return result;
}

void Poser::skin(std::vector<Vector>& vertices, const aiMesh& mesh, const Matrix& world) const {
    struct Influence {
        double weight;
        unsigned bone;
    };
    std::vector<std::vector<Influence>> influences(vertices.size());
    std::vector<Matrix> matrices;
    for (unsigned b = 0; b < mesh.mNumBones; ++b) {
        const aiBone& bone = *mesh.mBones[b];
        matrices.push_back(byName_.at(bone.mName.C_Str()) * toMatrix(bone.mOffsetMatrix));
        for (unsigned w = 0; w < bone.mNumWeights; ++w) {
            if (bone.mWeights[w].mWeight > 0) {
                influences.at(bone.mWeights[w].mVertexId).push_back({bone.mWeights[w].mWeight, b});
            }
        }
    }
    for (size_t v = 0; v < vertices.size(); ++v) {
        std::stable_sort(
            influences[v].begin(), influences[v].end(),
            [](const Influence& x, const Influence& y) { return x.weight > y.weight; });
        influences[v].resize(std::min<size_t>(influences[v].size(), 4));
        double total = 0;
        for (const Influence& influence : influences[v]) {
            total += influence.weight;
        }
        if (!(total > 0)) {
            vertices[v] = transformPoint(world, vertices[v]);
            continue;
        }
        Vector sum{};
        for (const Influence& influence : influences[v]) {
            const Vector moved = transformPoint(matrices[influence.bone], vertices[v]);
            for (size_t axis = 0; axis < 3; ++axis) {
                sum[axis] += influence.weight / total * moved[axis];
            }
        }
        vertices[v] = sum;
    }
}

void Poser::addMesh(const aiNode& node, unsigned meshIndex, const Matrix& world) {
    const aiMesh& mesh = *scene_.mMeshes[meshIndex];
    std::vector<Vector> vertices = morphed(node, mesh, meshIndex);
    if (mesh.mNumBones > 0) {
        skin(vertices, mesh, world);
    } else {
        for (Vector& vertex : vertices) {
            vertex = transformPoint(world, vertex);
        }
    }
    std::vector<char> use(vertices.size(), 0); // 1: by a face that may be missing, 2: needed
    for (unsigned f = 0; f < mesh.mNumFaces; ++f) {
        const aiFace& face = mesh.mFaces[f];
        std::vector<Vector> corners;
        for (unsigned i = 0; i < face.mNumIndices; ++i) {
            const aiVector3D& p = mesh.mVertices[face.mIndices[i]];
            corners.push_back({p.x, p.y, p.z});
        }
        const bool isSurface = corners.size() >= 3;
        const char level = !isSurface ? 0 : measurePolygon(corners).removableTriangles == 0 ? 2 : 1;
        for (unsigned i = 0; i < face.mNumIndices; ++i) {
            use[face.mIndices[i]] = std::max(use[face.mIndices[i]], level);
        }
    }
    for (size_t v = 0; v < vertices.size(); ++v) {
        if (use[v] > 0) {
            pose_.vertices.push_back(vertices[v]);
            pose_.isNeeded.push_back(use[v] == 2);
        }
    }
}

} // namespace

KeyRange keyRange(const aiScene& scene) {
    KeyRange range;
    if (scene.mNumAnimations == 0) {
        return range;
    }
    const aiAnimation& animation = *scene.mAnimations[0];
    const auto add = [&](double time) {
        time /= ticksPerSecond(animation);
        range.first = range.isEmpty ? time : std::min(range.first, time);
        range.last = range.isEmpty ? time : std::max(range.last, time);
        range.isEmpty = false;
    };
    const auto addEnds = [&](const auto* keys, unsigned count) {
        for (unsigned i = 0; i < count; ++i) {
            add(keys[i].mTime);
        }
    };
    for (unsigned i = 0; i < animation.mNumChannels; ++i) {
        const aiNodeAnim& channel = *animation.mChannels[i];
        addEnds(channel.mPositionKeys, channel.mNumPositionKeys);
        addEnds(channel.mRotationKeys, channel.mNumRotationKeys);
        addEnds(channel.mScalingKeys, channel.mNumScalingKeys);
    }
    for (unsigned i = 0; i < animation.mNumMorphMeshChannels; ++i) {
        addEnds(animation.mMorphMeshChannels[i]->mKeys, animation.mMorphMeshChannels[i]->mNumKeys);
    }
    return range;
}

ModelPose poseOf(const aiScene& scene, const Matrix& worldFromFile, double seconds) {
    return Poser(scene, seconds).run(worldFromFile);
}
