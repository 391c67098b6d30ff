#include "pose_model.h"

#include "scene_animation.h"
#include "scene_mesh.h"

#include <assimp/scene.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <string>

namespace test_support {

namespace {

using base::IPlugin;
using namespace scene;

using Matrix = aiMatrix4x4t<double>;
using Quat = aiQuaterniont<double>;

Matrix matrixOf(const aiMatrix4x4& m) {
    return {m.a1, m.a2, m.a3, m.a4, m.b1, m.b2, m.b3, m.b4, m.c1, m.c2, m.c3, m.c4, 0, 0, 0, 1};
}
Matrix matrixOf(const base::mat43& m) {
    return {m.m.r0.x, m.m.r0.y, m.m.r0.z, m.t.x, m.m.r1.x, m.m.r1.y, m.m.r1.z, m.t.y,
            m.m.r2.x, m.m.r2.y, m.m.r2.z, m.t.z, 0,        0,        0,        1};
}

/// What `mix` makes of the keys around `ticks` and the share of the second.
template <class Key, class Mix>
auto sample(const Key* keys, unsigned count, double ticks, const Mix& mix) {
    unsigned next = 0;
    while (next < count && keys[next].mTime <= ticks)
        ++next;
    const Key &a = keys[next ? next - 1 : 0], &b = keys[std::min(next, count - 1)];
    const double span = b.mTime - a.mTime;
    return mix(a.mValue, b.mValue, span > 0 ? (ticks - a.mTime) / span : 0);
}

Point mixPoints(const aiVector3D& a, const aiVector3D& b, double u) {
    return Point(a.x, a.y, a.z) * (1 - u) + Point(b.x, b.y, b.z) * u;
}
Quat mixTurns(const aiQuaternion& a, const aiQuaternion& b, double u) {
    Quat result;
    Quat::Interpolate(result, Quat(a.w, a.x, a.y, a.z), Quat(b.w, b.x, b.y, b.z), u);
    return result.Normalize();
}

/// A channel without keys of one kind leaves that as it is at rest; scale and rotation of all
/// nodes with such channels are those of the identity.
Matrix transformAt(const aiNodeAnim& channel, double ticks, const aiNode& node) {
    const aiMatrix4x4& rest = node.mTransformation;
    Point t(rest.a4, rest.b4, rest.c4), s(1, 1, 1);
    Quat r;
    if (channel.mNumPositionKeys)
        t = sample(channel.mPositionKeys, channel.mNumPositionKeys, ticks, mixPoints);
    if (channel.mNumRotationKeys)
        r = sample(channel.mRotationKeys, channel.mNumRotationKeys, ticks, mixTurns);
    if (channel.mNumScalingKeys)
        s = sample(channel.mScalingKeys, channel.mNumScalingKeys, ticks, mixPoints);
    // The library's constructor from these three scales last.
    return Matrix({1, 1, 1}, r, t) * Matrix(s, {}, {});
}

class FilePose {
public:
    FilePose(const aiScene& file, unsigned clip, double seconds) : file_(file) {
        if (clip < file.mNumAnimations) {
            const aiAnimation& animation = *file.mAnimations[clip];
            ticks_ = seconds * animation.mTicksPerSecond;
            for (unsigned i = 0; i < animation.mNumChannels; ++i)
                channels_.emplace(animation.mChannels[i]->mNodeName.C_Str(),
                                  animation.mChannels[i]);
        }
        place(*file.mRootNode, Matrix(), true);
    }

    std::vector<Corners> run() {
        for (const auto& [node, world] : inOrder_)
            for (unsigned i = 0; i < node->mNumMeshes; ++i)
                pose(*file_.mMeshes[node->mMeshes[i]], world);
        return result_;
    }

private:
    void place(const aiNode& node, const Matrix& parent, bool isRoot) {
        Matrix world = parent;
        if (const auto found = channels_.find(node.mName.C_Str()); found != channels_.end())
            world = parent * transformAt(*found->second, ticks_, node);
        else if (!isRoot)
            world = parent * matrixOf(node.mTransformation);
        byName_.emplace(node.mName.C_Str(), world);
        inOrder_.emplace_back(&node, world);
        for (unsigned i = 0; i < node.mNumChildren; ++i)
            place(*node.mChildren[i], world, false);
    }

    void pose(const aiMesh& mesh, const Matrix& world) {
        const auto positionOf = [&](unsigned v) {
            const aiVector3D& p = mesh.mVertices[v];
            return Point(p.x, p.y, p.z);
        };
        Corners moved(mesh.mNumVertices);
        std::vector<double> sums(mesh.mNumVertices);
        for (unsigned b = 0; b < mesh.mNumBones; ++b) {
            const aiBone& bone = *mesh.mBones[b];
            const Matrix m = byName_.at(bone.mName.C_Str()) * matrixOf(bone.mOffsetMatrix);
            for (unsigned i = 0; i < bone.mNumWeights; ++i) {
                const auto [v, weight] = bone.mWeights[i];
                moved[v] += m * positionOf(v) * double(weight);
                sums[v] += weight;
            }
        }
        Corners& corners = result_.emplace_back();
        for (unsigned f = 0; f < mesh.mNumFaces; ++f)
            for (unsigned i = 0; i < mesh.mFaces[f].mNumIndices; ++i) {
                const unsigned v = mesh.mFaces[f].mIndices[i];
                corners.push_back(sums[v] > 0 ? moved[v] / sums[v] : world * positionOf(v));
            }
    }

    const aiScene& file_;
    double ticks_ = 0;
    std::map<std::string, const aiNodeAnim*> channels_;
    std::map<std::string, Matrix> byName_;
    std::vector<std::pair<const aiNode*, Matrix>> inOrder_;
    std::vector<Corners> result_;
};

class ScenePose {
public:
    std::vector<Corners> run(IPlugin& scene) {
        place(*findObject(scene, scene_schema::n_root), Matrix());
        for (const auto& [node, world] : inOrder_)
            if (const auto* children = find(*node, node_schema::n_children))
                for (const auto& child : *children)
                    pose(*child, world);
        return result_;
    }

private:
    void place(IPlugin& node, const Matrix& world) {
        byNode_.emplace(&node, world);
        inOrder_.emplace_back(&node, world);
        if (const auto* children = find(node, node_schema::n_children))
            for (const auto& child : *children)
                if (auto* below = dynamic_cast<INode*>(child.get())) {
                    base::mat43 m;
                    below->getTransform(m);
                    place(*child, world * matrixOf(m));
                }
    }

    void pose(IPlugin& object, const Matrix& world) {
        IPlugin* mesh = findObject(object, skin_schema::n_baseMesh);
        if (object.typeName() == mesh_schema::n_kind)
            mesh = &object;
        if (!mesh)
            return;
        Corners points;
        for (const base::vec3f& p : *find(*mesh, mesh_schema::n_positions))
            points.emplace_back(p.x, p.y, p.z);
        if (object.typeName() == skin_schema::n_kind)
            bend(points, object, *mesh);
        else
            for (Point& p : points)
                p = world * p;
        const auto* indices = find(*mesh, mesh_schema::n_positionIndices);
        Corners& corners = result_.emplace_back();
        for (const base::u32 i : indices ? *indices : *find(*mesh, mesh_schema::n_indices))
            corners.push_back(points.at(i));
    }

    void bend(Corners& points, const IPlugin& skin, const IPlugin& mesh) {
        using Set = meshJointsSet_schema;
        const base::AttribMap& set = *findListItem(mesh, mesh_schema::n_jointsSets, 0);
        const base::AttribMap& bind = *findListItem(mesh, mesh_schema::n_bindPoseSets, 0);
        const auto& joints = *find(skin, skin_schema::n_joints);
        const auto& transforms = *find(bind, meshBindPoseSet_schema::n_transforms);
        ASSERT_EQ(joints.size(), transforms.size());
        std::vector<Matrix> matrices;
        for (std::size_t j = 0; j < joints.size(); ++j)
            matrices.push_back(byNode_.at(joints[j].get()) * matrixOf(transforms[j]));
        const auto& counts = *find(set, Set::n_jointCounts);
        ASSERT_EQ(counts.size(), points.size());
        std::size_t at = 0;
        for (std::size_t v = 0; v < points.size(); ++v) {
            Point sum;
            for (int i = 0; i < counts[v]; ++i, ++at)
                sum += matrices.at((*find(set, Set::n_indices))[at]) * points[v] *
                       double((*find(set, Set::n_weights))[at]);
            points[v] = sum;
        }
    }

    std::map<const IPlugin*, Matrix> byNode_;
    std::vector<std::pair<IPlugin*, Matrix>> inOrder_;
    std::vector<Corners> result_;
};

} // namespace

std::vector<Corners> poseFile(const aiScene& file, unsigned clip, double seconds) {
    return FilePose(file, clip, seconds).run();
}

std::vector<Corners> poseScene(IPlugin& scene, double seconds) {
    write(scene,
          scene_schema::n_time) = {std::llround(seconds * double(base::TimeCode::ticksPerSecond))};
    if (const auto* layers = find(scene, scene_schema::n_animLayers))
        for (const auto& layer : *layers)
            dynamic_cast<IAnimLayer&>(*layer).changed(
                base::eventTimeChanged, base::AttribPath(scene, scene_schema::n_time));
    return ScenePose().run(scene);
}

double poseDifference(const std::vector<Corners>& a, const std::vector<Corners>& b) {
    EXPECT_EQ(a.size(), b.size());
    double distance = 0, size = 0;
    for (std::size_t m = 0; m < std::min(a.size(), b.size()); ++m) {
        EXPECT_EQ(a[m].size(), b[m].size()) << "mesh " << m;
        for (std::size_t c = 0; c < std::min(a[m].size(), b[m].size()); ++c) {
            size = std::max(size, a[m][c].Length());
            distance = std::max(distance, (a[m][c] - b[m][c]).Length());
        }
    }
    return distance / size;
}

} // namespace test_support
