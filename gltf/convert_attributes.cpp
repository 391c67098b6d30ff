#include "gltf/exporter.h"
#include "gltf/joint_channels.h"
#include "gltf/vertex_array.h"

#include "b_log.h"
#include "scene_mesh.h"
#include "scene_schema.h"

#include <algorithm>
#include <cmath>

namespace gltf {

using base::AttribMap;
using base::IPlugin;
using base::log;
using base::logError;
using base::logScene;
using base::logWarning;
using base::name_id;
using base::normal;
using base::ref;
using base::string;
using base::string_view;
using base::u32;
using base::vec2f;
using base::vec3f;
using base::vec4f;
using scene::mesh_schema;
using Type = GLTF::Accessor::Type;

namespace {

using Views = base::vector<ref<GLTF::BufferView>>;

// Reading

/// The array, if it is there and has one element per vertex, made finite.
template <class... Ts>
VertexArray readArray(const AttribMap& map, name_id name, std::size_t vertexCount,
                      const IPlugin& mesh) {
    VertexArray array = findVertexArray<Ts...>(map, name);
    if (!fitsVertices(array, vertexCount, mesh, name.view()))
        return {};
    makeFinite(array, mesh, name.view());
    return array;
}

// Tangents

/// 1 or -1: on which side of normal and tangent the bitangent lies.
float handedness(const float* n, const float* t, const float* b) {
    const float x = n[1] * t[2] - n[2] * t[1];
    const float y = n[2] * t[0] - n[0] * t[2];
    const float z = n[0] * t[1] - n[1] * t[0];
    return std::copysign(1.0f, x * b[0] + y * b[1] + z * b[2]);
}

/// Tangents with the handedness as the fourth component: what the bitangents tell of each vertex
/// that an index names (of all without indices), else what the tangents have.
ref<GLTF::Buffer> makeTangents(const VertexArray& tangents, const VertexArray& normals,
                               const VertexArray& bitangents, const base::vector<u32>* indices,
                               const IPlugin& mesh) {
    const std::size_t count = tangents.count();
    const auto buffer = base::makeRef<GLTF::Buffer>(checkedLength(count * sizeof(vec4f), mesh));
    auto* out = reinterpret_cast<vec4f*>(buffer->data);
    for (std::size_t v = 0; v < count; ++v) {
        const float* t = tangents.element(v);
        const bool isMirrored = !bitangents && tangents.components() == 4 && t[3] < 0;
        out[v] = {t[0], t[1], t[2], isMirrored ? -1.0f : 1.0f};
    }
    if (!bitangents)
        return buffer;
    const auto setHandedness = [&](std::size_t v) {
        out[v].w = handedness(normals.element(v), tangents.element(v), bitangents.element(v));
    };
    if (indices) {
        for (const u32 v : *indices) {
            if (v < count)
                setHandedness(v);
        }
    } else {
        for (std::size_t v = 0; v < count; ++v)
            setHandedness(v);
    }
    return buffer;
}

// Sets

/// A copy of texture coordinates with the second one measured from the other side.
ref<GLTF::Buffer> makeFlipped(const VertexArray& uv, const IPlugin& mesh) {
    const auto buffer =
        base::makeRef<GLTF::Buffer>(checkedLength(uv.valueCount() * sizeof(float), mesh));
    auto* out = reinterpret_cast<vec2f*>(buffer->data);
    const auto* in = reinterpret_cast<const vec2f*>(uv.values());
    for (std::size_t v = 0; v < uv.count(); ++v)
        out[v] = {in[v].x, 1.0f - in[v].y};
    return buffer;
}

void logSet(const IPlugin& mesh, string_view what) {
    log().log(logScene, logWarning, "gltf |{}| {}", mesh.getName(), what);
}

Views convertTextureCoordinates(const IPlugin& mesh, std::size_t vertexCount) {
    using scene::meshUVSet_schema;
    Views views;
    const u32 setCount = getListCount(mesh, mesh_schema::n_uvSets);
    for (u32 i = 0; i < setCount; ++i) {
        const AttribMap* set = findListItem(mesh, mesh_schema::n_uvSets, i);
        if (!set)
            continue;
        if (set->findAttribute(meshUVSet_schema::n_UV)) {
            const VertexArray uv =
                readArray<vec2f>(*set, meshUVSet_schema::n_UV, vertexCount, mesh);
            if (uv)
                views.push_back(makeVertexView(makeFlipped(uv, mesh)));
        } else if (set->findAttribute(meshUVSet_schema::n_UVW)) {
            log().log(logScene, logError,
                      "Non-afine texture coordinates are currently not supported!");
        } else if (set->findAttribute(meshUVSet_schema::n_UVWQ)) {
            logSet(mesh, "Texture coordinates of four components are not supported!");
        }
    }
    return views;
}

Views convertColors(const IPlugin& mesh, std::size_t vertexCount) {
    using scene::meshColorSet_schema;
    Views views;
    const u32 setCount = getListCount(mesh, mesh_schema::n_colorSets);
    // Meshes may share a set, and the conversion of another one replaces its array.
    const base::Attribute* list = mesh.findAttribute(mesh_schema::n_colorSets);
    const bool ownsSets = list && list->asArray() && mayBorrow(mesh, mesh_schema::n_colorSets);
    for (u32 i = 0; i < setCount; ++i) {
        const AttribMap* set = findListItem(mesh, mesh_schema::n_colorSets, i);
        if (!set)
            continue;
        if (set->findAttribute(meshColorSet_schema::n_RGB)) {
            VertexArray rgb = readArray<vec3f>(*set, meshColorSet_schema::n_RGB, vertexCount, mesh);
            if (!ownsSets)
                rgb.setShared();
            if (rgb)
                views.push_back(makeVertexView(rgb, mesh));
        } else if (set->findAttribute(meshColorSet_schema::n_RGBA) ||
                   set->findAttribute(meshColorSet_schema::n_A)) {
            logSet(mesh, "Colors with an alpha component are not supported!");
        }
    }
    return views;
}

// Primitives

void set(GLTF::AttributeMap& attributes, string_view name, const ref<GLTF::Accessor>& accessor) {
    if (accessor)
        attributes[name] = accessor;
}

/// Each primitive gets accessors of its own on the sets.
void setSets(GLTF::AttributeMap& attributes, string_view prefix, Type type, const Views& views,
             std::size_t vertexCount) {
    for (std::size_t i = 0; i < views.size(); ++i) {
        string name(prefix);
        name += std::to_string(i);
        attributes[name] = makeAccessor(type, vertexCount, views[i]);
    }
}

} // namespace

bool GLTFScenePlugin::convertMeshAttributes(GLTF::Mesh& gltfMesh, scene::IMesh& mesh) {
    VertexArray positions = findVertexArray<vec3f>(mesh, mesh_schema::n_positions);
    if (!positions)
        return false;
    const bool isRepaired = makeFinite(positions, mesh, "positions");
    const std::size_t count = positions.count();
    const VertexArray normals = readArray<normal, vec3f>(mesh, mesh_schema::n_normals, count, mesh);
    VertexArray tangents;
    if (normals)
        tangents = readArray<vec4f, vec3f>(mesh, mesh_schema::n_tangents, count, mesh);

    const auto position = makeAccessor(Type::vec3, count, makeVertexView(positions, mesh));
    // A box of the scene does not know of the values that were put in.
    if (isRepaired)
        position->computeMinMax();
    else
        setBounds(*position, mesh.getBounds());
    ref<GLTF::Accessor> normalAccessor, tangentAccessor;
    if (normals)
        normalAccessor = makeAccessor(Type::vec3, count, makeVertexView(normals, mesh));
    if (tangents) {
        const VertexArray bitangents =
            readArray<normal, vec3f>(mesh, mesh_schema::n_bitangents, count, mesh);
        const auto buffer =
            makeTangents(tangents, normals, bitangents, find(mesh, mesh_schema::n_indices), mesh);
        tangentAccessor = makeAccessor(Type::vec4, count, makeVertexView(buffer));
    }
    const Views uvs = exportTextureCoordinates ? convertTextureCoordinates(mesh, count) : Views();
    const Views colors = exportColors ? convertColors(mesh, count) : Views();
    const JointChannels skin = convertJoints(mesh, count);

    for (const ref<GLTF::Primitive>& primitive : gltfMesh.primitives) {
        GLTF::AttributeMap& attributes = primitive->attributes;
        attributes.reserve(6 + uvs.size() + colors.size());
        setSets(attributes, "COLOR_", Type::vec3, colors, count);
        set(attributes, "JOINTS_0", skin.joints);
        set(attributes, "NORMAL", normalAccessor);
        set(attributes, "POSITION", position);
        set(attributes, "TANGENT", tangentAccessor);
        setSets(attributes, "TEXCOORD_", Type::vec2, uvs, count);
        set(attributes, "WEIGHTS_0", skin.weights);
    }
    return true;
}

} // namespace gltf
