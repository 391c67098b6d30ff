#include "gltf/joint_channels.h"

#include "gltf/vertex_array.h"

#include "b_log.h"
#include "scene_mesh.h"
#include "scene_schema.h"

#include <algorithm>
#include <numeric>

namespace gltf {

using base::ref;
using base::u16;
using base::u32;
using base::u64;
using base::u8;
using scene::meshJointsSet_schema;

namespace {

constexpr std::size_t jointsPerVertex = 4;

/// The arrays of a joint set, all integers widened.
struct JointSource {
    base::vector<u32> counts;
    base::vector<u32> joints;
    VertexArray weights;
    bool hasJoints, hasWeights; ///< such an array is there, if only an empty one
};

base::vector<u32> readIntegers(const base::AttribMap& set, base::name_id name) {
    base::vector<u32> values;
    scene::visitVector<u32, u16, u8>(
        set, name, [&](const auto& elements) { values.assign(elements.begin(), elements.end()); });
    return values;
}

/// Checks that the arrays hold as many entries as the counts add up to.
bool isComplete(const JointSource& source, std::size_t vertexCount, const base::IPlugin& mesh) {
    base::Log& log = base::log();
    constexpr int setIndex = 0;
    if (source.counts.size() != vertexCount) {
        log.log(base::logScene, base::logError,
                "{}| Wrong joint counts in vertex weights at index {}! Expected {} elements, found "
                "{}.",
                mesh.getName(), setIndex, vertexCount, source.counts.size());
        return false;
    }
    const u64 sum = std::accumulate(source.counts.begin(), source.counts.end(), u64(0));
    if (!source.hasJoints || source.joints.size() < sum) {
        log.log(base::logScene, base::logError,
                "{}| Missing joint indices in vertex weights at index {}!", mesh.getName(),
                setIndex);
        return false;
    }
    if (!source.hasWeights || source.weights.count() < sum) {
        log.log(base::logScene, base::logError, "{}| Missing weights in joint weights at index {}!",
                mesh.getName(), setIndex);
        return false;
    }
    return true;
}

/// Makes the four weights that are left of more add up to 1.
void normalize(float* weights) {
    const float sum = weights[0] + weights[1] + weights[2] + weights[3];
    const float scale = 1 / sum;
    // A sum of zero, or one too close to it to divide by, leaves the weights.
    if (!isFinite(&scale, 1))
        return;
    for (std::size_t i = 0; i < jointsPerVertex; ++i)
        weights[i] *= scale;
}

/// Fills the slots of all vertices, which are zero; returns how many joint indices are too large.
std::size_t fillSlots(const JointSource& source, u16* joints, float* weights) {
    std::size_t tooLarge = 0, position = 0;
    for (const u32 count : source.counts) {
        const std::size_t used = std::min<std::size_t>(count, jointsPerVertex);
        for (std::size_t i = 0; i < used; ++i) {
            const u32 joint = source.joints[position + i];
            if (joint > 0xffff) {
                ++tooLarge;
                continue;
            }
            joints[i] = static_cast<u16>(joint);
            weights[i] = source.weights.values()[position + i];
        }
        std::fill(joints + used, joints + jointsPerVertex, used ? joints[0] : u16(0));
        if (count > jointsPerVertex)
            normalize(weights);
        position += count;
        joints += jointsPerVertex;
        weights += jointsPerVertex;
    }
    return tooLarge;
}

} // namespace

JointChannels convertJoints(const base::IPlugin& mesh, std::size_t vertexCount) {
    const base::AttribMap* set = findListItem(mesh, scene::mesh_schema::n_jointsSets, 0);
    if (!set || !set->findAttribute(meshJointsSet_schema::n_jointCounts))
        return {};
    JointSource source{readIntegers(*set, meshJointsSet_schema::n_jointCounts),
                       readIntegers(*set, meshJointsSet_schema::n_indices),
                       findVertexArray<float>(*set, meshJointsSet_schema::n_weights),
                       set->findAttribute(meshJointsSet_schema::n_indices) != nullptr,
                       set->findAttribute(meshJointsSet_schema::n_weights) != nullptr};
    if (!isComplete(source, vertexCount, mesh))
        return {};
    makeFinite(source.weights, mesh, "weights");

    const u64 slotCount = u64(vertexCount) * jointsPerVertex;
    const auto joints = GLTF::Buffer::zeroed(checkedLength(slotCount * sizeof(u16), mesh));
    const auto weights = GLTF::Buffer::zeroed(checkedLength(slotCount * sizeof(float), mesh));
    const std::size_t tooLarge = fillSlots(source, reinterpret_cast<u16*>(joints->data),
                                           reinterpret_cast<float*>(weights->data));
    if (tooLarge != 0)
        base::log().log(base::logScene, base::logError,
                        "gltf |{}| Found {} joint indices above 65535, they are left out!",
                        mesh.getName(), tooLarge);
    return {makeAccessor(GLTF::Accessor::Type::vec4, vertexCount, makeVertexView(joints),
                         GLTF::componentU16),
            makeAccessor(GLTF::Accessor::Type::vec4, vertexCount, makeVertexView(weights))};
}

} // namespace gltf
