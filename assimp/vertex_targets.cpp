#include "assimp/vertex_targets.h"

#include "assimp/import_geometry.h"
#include "assimp/library_text.h"

#include "b_vector_math.h"

#include <assimp/mesh.h>

#include <algorithm>
#include <cmath>

namespace assimp {

using base::u32;
using base::vec3f;
using base::vector;

namespace {

/// Differences of directions below which a target does not turn them: what normalising leaves.
constexpr float leastTurn = 1e-5f;

bool isUsable(const aiMesh& mesh, u32 index) {
    const aiAnimMesh* target = mesh.mAnimMeshes[index];
    return target && target->mNumVertices == mesh.mNumVertices;
}

bool isRelative(const aiMesh& mesh) {
    return mesh.mMethod == aiMorphingMethod_MORPH_RELATIVE;
}

vec3f finite(const vec3f& v, base::u64& faultCount) {
    if (std::isfinite(v.x) && std::isfinite(v.y) && std::isfinite(v.z))
        return {v.x + 0.0f, v.y + 0.0f, v.z + 0.0f}; // no negative zeros, equal values shall weld
    ++faultCount;
    return {};
}

vector<vec3f> readPositions(const aiMesh& mesh, const aiAnimMesh& target,
                            const vector<vec3f>& positions, base::u64& faultCount) {
    vector<vec3f> differences(positions.size());
    vec3f* to = differences.data();
    for (std::size_t v = 0; target.mVertices && v < positions.size(); ++v) {
        const vec3f shape{target.mVertices[v].x, target.mVertices[v].y, target.mVertices[v].z};
        to[v] = finite(isRelative(mesh) ? shape : shape - positions[v], faultCount);
    }
    return differences;
}

vec3f unit(const aiVector3D& v) {
    const float length = v.Length();
    return length > 0 ? vec3f{v.x / length, v.y / length, v.z / length} : vec3f{};
}

/// Differences of the directions `target` to `base`; empty if there are none.
vector<vec3f> readDirections(const aiVector3D* target, const aiVector3D* base, u32 count,
                             float sign, base::u64& faultCount) {
    vector<vec3f> differences;
    bool turns = false;
    differences.reserve(count);
    for (u32 v = 0; v < count; ++v) {
        const vec3f difference = finite((unit(target[v]) - unit(base[v])) * sign, faultCount);
        turns |= length(difference) > leastTurn;
        differences.push_back(difference);
    }
    return turns ? differences : vector<vec3f>();
}

/// Gives all targets the channel if some have it, as readers of files want them to be alike.
void equalize(vector<VertexTarget>& targets, vector<vec3f> VertexTarget::*channel) {
    const auto has = [&](const VertexTarget& target) { return !(target.*channel).empty(); };
    if (std::ranges::any_of(std::as_const(targets), has))
        for (VertexTarget& target : targets)
            (target.*channel).resize(target.positions.size());
}

} // namespace

vector<u32> findTargetGroups(const aiMesh& mesh, bool inGroups) {
    vector<u32> lasts;
    const auto nameOf = [&](u32 i) { return viewOf(mesh.mAnimMeshes[i]->mName); };
    for (u32 i = 0, count = 0; i < mesh.mNumAnimMeshes; ++i) {
        if (!isUsable(mesh, i))
            continue;
        if (inGroups && !lasts.empty() && isUsable(mesh, i - 1) && nameOf(i) == nameOf(i - 1))
            lasts.back() = count;
        else
            lasts.push_back(count);
        ++count;
    }
    return lasts;
}

vector<VertexTarget> readVertexTargets(const aiMesh& mesh, const vector<vec3f>& positions,
                                       const GeometrySettings& settings, bool inGroups,
                                       GeometryFaults& faults) {
    vector<VertexTarget> targets;
    const float sign = settings.flip ? -1.0f : 1.0f;
    const bool hasNormals = mesh.mNormals && settings.normals != scene::Presence::never;
    const bool hasTangents =
        hasNormals && mesh.mTangents && settings.tangents != scene::Presence::never;
    for (u32 i = 0; i < mesh.mNumAnimMeshes; ++i) {
        if (!isUsable(mesh, i)) {
            ++faults.brokenTargets;
            continue;
        }
        const aiAnimMesh& source = *mesh.mAnimMeshes[i];
        VertexTarget& target = targets.emplace_back();
        target.name = viewOf(source.mName);
        target.weight = std::isfinite(source.mWeight) ? source.mWeight : 0;
        target.positions = readPositions(mesh, source, positions, faults.nonFiniteValues);
        const auto read = [&](const aiVector3D* own, const aiVector3D* base, float directionSign) {
            return readDirections(own, base, mesh.mNumVertices, directionSign,
                                  faults.nonFiniteValues);
        };
        // Of differences between directions alone nothing is known.
        if (hasNormals && source.mNormals && !isRelative(mesh))
            target.normals = read(source.mNormals, mesh.mNormals, sign);
        if (hasTangents && source.mTangents && !isRelative(mesh))
            target.tangents = read(source.mTangents, mesh.mTangents, 1);
    }
    equalize(targets, &VertexTarget::normals);
    equalize(targets, &VertexTarget::tangents);
    if (!inGroups)
        return targets;

    u32 first = 0;
    for (const u32 last : findTargetGroups(mesh, inGroups)) {
        if (first == last)
            targets[last].weight = 0;
        for (; first < last; ++first, ++faults.stages)
            targets[first].weight = 0;
        ++first;
    }
    return targets;
}

} // namespace assimp
