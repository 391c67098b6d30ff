#include "assimp/vertex_joints.h"

#include "assimp/fault_report.h"

#include <assimp/mesh.h>

#include <algorithm>
#include <span>

namespace assimp {

using base::u32;
using base::u64;
using base::vector;

void SkeletonFaults::report(const base::string& path) const {
    const FaultReport log(path);
    log.warn(missingBones, "assimp |{}| Left out {} bones without a node of their name!");
    log.warn(brokenBindPoses,
             "assimp |{}| Found {} bind poses that are not finite, the identity is taken!");
    log.warn(
        brokenWeights,
        "assimp |{}| Left out {} weights of bones that are no positive numbers or belong to no "
        "vertex!");
    log.inform(freeVertices,
               "assimp |{}| Found {} vertices that no bone moves, they go with their node.");
    log.warn(
        targetsOfSkins,
        "assimp |{}| Left out {} morph targets of meshes that have a skeleton too, as exporters "
        "draw a mesh with either of them!");
}

namespace {

/// Weights from here on are no weights; their sums would leave the range.
constexpr float hugeWeight = 1e18f;

struct Influence {
    u32 joint;
    float weight;
};

/// Calls `use(vertex, weight)` for every weight of a bone that counts.
template <class Use>
void forEachWeight(const aiBone& bone, u32 vertexCount, const Use& use) {
    for (u32 i = 0; bone.mWeights && i < bone.mNumWeights; ++i) {
        const aiVertexWeight& entry = bone.mWeights[i];
        if (entry.mVertexId < vertexCount && entry.mWeight > 0 && entry.mWeight < hugeWeight)
            use(entry.mVertexId, entry.mWeight);
    }
}

/// Counts what `forEachWeight` passes over; weights of zero are no fault.
u64 countBroken(const aiBone& bone, u32 vertexCount) {
    u64 count = 0;
    for (u32 i = 0; bone.mWeights && i < bone.mNumWeights; ++i) {
        const aiVertexWeight& entry = bone.mWeights[i];
        count +=
            !(entry.mVertexId < vertexCount && entry.mWeight >= 0 && entry.mWeight < hugeWeight);
    }
    return count;
}

/// The influences on all vertices, by vertex and then by bone; `starts` has where those of each
/// vertex begin.
vector<Influence> gatherInfluences(const vector<const aiBone*>& bones, u32 vertexCount,
                                   vector<u32>& starts) {
    starts.resize(vertexCount + std::size_t(1));
    u32* start = starts.data();
    for (const aiBone* bone : bones)
        forEachWeight(*bone, vertexCount, [&](u32 vertex, float) { ++start[vertex + 1]; });
    for (u32 v = 0; v < vertexCount; ++v)
        start[v + 1] += start[v];
    vector<Influence> influences(starts.back());
    vector<u32> ends = starts;
    for (u32 joint = 0; joint < bones.size(); ++joint)
        forEachWeight(*bones[joint], vertexCount, [&](u32 vertex, float weight) {
            influences[ends[vertex]++] = {joint, weight};
        });
    return influences;
}

/// Brings the influences on one vertex, sorted by joint, into their final form. Returns how many
/// are left, which all counts and indices in a scene can tell.
std::size_t settle(std::span<Influence> influences) {
    std::size_t count = 0;
    for (const Influence& influence : influences) {
        if (count != 0 && influences[count - 1].joint == influence.joint)
            influences[count - 1].weight += influence.weight;
        else
            influences[count++] = influence;
    }
    const std::span used = influences.first(count);
    std::ranges::sort(used, [](const Influence& a, const Influence& b) {
        return a.weight != b.weight ? a.weight > b.weight : a.joint < b.joint;
    });
    constexpr std::size_t mostInfluences = 0xffff;
    count = std::min(count, mostInfluences);
    double sum = 0;
    for (const Influence& influence : used.first(count))
        sum += influence.weight;
    for (Influence& influence : used.first(count))
        influence.weight = static_cast<float>(influence.weight / sum);
    // Shares that are nothing beside the others.
    while (count > 1 && used[count - 1].weight == 0)
        --count;
    return count;
}

} // namespace

VertexJoints readVertexJoints(const vector<const aiBone*>& bones, u32 vertexCount,
                              SkeletonFaults& faults) {
    for (const aiBone* bone : bones)
        faults.brokenWeights += countBroken(*bone, vertexCount);
    VertexJoints result;
    vector<u32> starts;
    vector<Influence> influences = gatherInfluences(bones, vertexCount, starts);
    if (influences.empty())
        return result;
    result.starts.reserve(starts.size());
    result.joints.reserve(influences.size());
    result.weights.reserve(influences.size());
    for (u32 v = 0; v < vertexCount; ++v) {
        result.starts.push_back(static_cast<u32>(result.joints.size()));
        const std::span own(influences.data() + starts[v], influences.data() + starts[v + 1]);
        for (const Influence& influence : own.first(settle(own))) {
            result.joints.push_back(influence.joint);
            result.weights.push_back(influence.weight);
        }
        if (!own.empty())
            continue;
        result.joints.push_back(static_cast<u32>(bones.size()));
        result.weights.push_back(1);
        result.hasFreeVertices = true;
        ++faults.freeVertices;
    }
    result.starts.push_back(static_cast<u32>(result.joints.size()));
    return result;
}

} // namespace assimp
