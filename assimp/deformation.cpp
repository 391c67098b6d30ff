#include "assimp/deformation.h"

#include "assimp/attribute_writing.h"

#include "scene_schema.h"
#include "scene_weld.h"

#include <algorithm>
#include <bit>

namespace assimp {

using base::u16;
using base::u32;
using base::u64;
using base::vec3f;
using base::vector;
using scene::mesh_schema;

namespace {

constexpr vector<vec3f> VertexTarget::*channels[] = {
    &VertexTarget::positions, &VertexTarget::normals, &VertexTarget::tangents};

bool haveEqualJoints(const VertexJoints& joints, u32 a, u32 b) {
    const u32 *starts = joints.starts.data(), *all = joints.joints.data();
    const float* weights = joints.weights.data();
    const u32 count = starts[a + 1] - starts[a];
    return count == starts[b + 1] - starts[b] &&
           std::equal(all + starts[a], all + starts[a] + count, all + starts[b]) &&
           std::equal(weights + starts[a], weights + starts[a] + count, weights + starts[b]);
}

u64 hashJoints(const VertexJoints& joints, u32 vertex, u64 hash) {
    for (u32 i = joints.starts[vertex]; i < joints.starts[vertex + 1]; ++i) {
        hash = scene::mixHash(hash, joints.joints[i]);
        hash = scene::mixHash(hash, std::bit_cast<u32>(joints.weights[i]));
    }
    return hash;
}

/// The arrays that take part in telling vertices apart.
vector<const vec3f*> gatherColumns(const vector<VertexTarget>& targets) {
    vector<const vec3f*> columns;
    for (const VertexTarget& target : targets)
        for (const auto channel : channels)
            if (!(target.*channel).empty())
                columns.push_back((target.*channel).data());
    return columns;
}

template <class T>
vector<T> elementsAt(const vector<vec3f>& elements, const vector<u32>& vertices) {
    vector<T> result;
    result.reserve(vertices.size());
    for (const u32 v : vertices) {
        const vec3f& e = elements[v];
        result.push_back({e.x, e.y, e.z});
    }
    return result;
}

} // namespace

vector<u32> Deformation::findMotions(u32 vertexCount) const {
    const vector<const vec3f*> columns = gatherColumns(targets);
    const bool hasJoints = !joints.starts.empty();
    const auto hashOf = [&](u32 v) {
        u64 hash = hasJoints ? hashJoints(joints, v, 0) : 0;
        for (const vec3f* column : columns)
            for (const float value : {column[v].x, column[v].y, column[v].z})
                hash = scene::mixHash(hash, std::bit_cast<u32>(value));
        return hash;
    };
    const auto areEqual = [&](u32 a, u32 b) {
        for (const vec3f* column : columns)
            if (column[a] != column[b])
                return false;
        return !hasJoints || haveEqualJoints(joints, a, b);
    };
    return scene::Welder(vertexCount, hashOf, areEqual).run().numbers;
}

void writeJoints(const VertexJoints& joints, const vector<u32>& vertexOfPosition,
                 base::AttribMap& mesh) {
    using Schema = scene::meshJointsSet_schema;
    vector<u16> counts;
    vector<u32> indices;
    vector<float> weights;
    counts.reserve(vertexOfPosition.size());
    for (const u32 v : vertexOfPosition) {
        const u32 first = joints.starts[v], last = joints.starts[v + 1];
        counts.push_back(static_cast<u16>(last - first));
        indices.append(joints.joints.cbegin() + first, joints.joints.cbegin() + last);
        weights.append(joints.weights.cbegin() + first, joints.weights.cbegin() + last);
    }
    base::AttribMap& set = appendItem<Schema>(mesh, mesh_schema::n_jointsSets);
    write(set, Schema::n_jointCounts) = std::move(counts);
    write(set, Schema::n_indices) = std::move(indices);
    write(set, Schema::n_weights) = std::move(weights);
}

base::ref<base::IPlugin> makeMorph(vector<VertexTarget> targets,
                                   const vector<u32>& vertexOfPosition,
                                   const base::ref<base::IPlugin>& mesh,
                                   base::PluginFactory& factory) {
    using Item = scene::morphTarget_schema;
    base::ref<base::IPlugin> morph = factory.create(scene::morph_schema::n_kind);
    if (base::string name = mesh->getName(); !name.empty())
        write(*morph, scene::geometry_schema::n_name) = std::move(name);
    write(*morph, scene::morph_schema::n_baseMesh) = mesh;
    for (VertexTarget& target : targets) {
        const base::ref<base::IPlugin> object = factory.create(mesh_schema::n_kind);
        if (!target.name.empty())
            write(*object, scene::geometry_schema::n_name) = target.name;
        write(*object, mesh_schema::n_positions) =
            elementsAt<vec3f>(target.positions, vertexOfPosition);
        if (!target.normals.empty())
            write(*object, mesh_schema::n_normals) =
                elementsAt<base::normal>(target.normals, vertexOfPosition);
        if (!target.tangents.empty())
            write(*object, mesh_schema::n_tangents) =
                elementsAt<base::vec4f>(target.tangents, vertexOfPosition);
        base::AttribMap& item = appendItem<Item>(*morph, scene::morph_schema::n_targets);
        write(item, Item::n_targetMesh) = object;
        write(item, Item::n_weight) = target.weight;
        target = {};
    }
    return morph;
}

} // namespace assimp
