#include "host/scene_contents.h"

#include "b_log.h"
#include "scene_mesh.h"
#include "scene_mesh_index.h"
#include "scene_mesh_triangulate.h"
#include "scene_schema.h"

#include <algorithm>

namespace host {

using base::u32;
using base::u64;

namespace {

const scene::SchemaName* const unexportedTypes[] = {
    &scene::camera_schema::n_kind,
    &scene::clipPlane_schema::n_kind,
    &scene::environment_schema::n_kind,
    &scene::fur_schema::n_kind,
    &scene::hair_schema::n_kind,
    &scene::instancer_schema::n_kind,
    &scene::points_schema::n_kind,
    &scene::sceneReference_schema::n_kind,
    &scene::stereoCamera_schema::n_kind,
    &scene::hairMaterial_schema::n_kind,
    &scene::toonMaterial_schema::n_kind,
    &scene::cellularTexture_schema::n_kind,
    &scene::checkerTexture_schema::n_kind,
    &scene::cubistTexture_schema::n_kind,
    &scene::curvatureTexture_schema::n_kind,
    &scene::dotsTexture_schema::n_kind,
    &scene::embeddedTexture_schema::n_kind,
    &scene::mixTexture_schema::n_kind,
    &scene::noiseTexture_schema::n_kind,
    &scene::randomTexture_schema::n_kind,
    &scene::vertColorTexture_schema::n_kind,
};

u64 countTriangles(const base::AttribMap& mesh, u32 primitive) {
    const u64 corners = scene::getPrimitiveIndexCount(mesh, primitive, true);
    switch (scene::getPrimitiveType(mesh, primitive, true)) {
    case scene::primitiveTriangles:
        return corners / 3;
    case scene::primitiveTriangleStrip:
    case scene::primitiveTriangleFan:
        return corners < 3 ? 0 : corners - 2;
    default:
        return 0;
    }
}

template <class... Values>
void report(const base::IPlugin& mesh, int level, const char* text, const Values&... values) {
    base::log().log(base::logScene, level, text, mesh.getName(), values...);
}

/// The ranges that the primitives store in an index array with `end` entries.
void checkRanges(const base::IPlugin& mesh, bool isTriangulated, u64 end) {
    using Primitive = scene::meshPrimitive_schema;
    const auto& startName = isTriangulated ? Primitive::n_triIndexStart : Primitive::n_indexStart;
    const auto& countName = isTriangulated ? Primitive::n_triIndexCount : Primitive::n_indexCount;
    const u32 primitiveCount = scene::getListCount(mesh, scene::mesh_schema::n_primitives);
    for (u32 i = 0; i < primitiveCount; ++i) {
        const auto* primitive = scene::findListItem(mesh, scene::mesh_schema::n_primitives, i);
        const u32* start = primitive ? find(*primitive, startName) : nullptr;
        const u32* count = primitive ? find(*primitive, countName) : nullptr;
        const u64 first = start ? *start : 0, length = count ? *count : 0;
        if (first + length > end)
            report(mesh, base::logError,
                   "validate |{}| Index offset/count out of bounds {}-{} out of {}!", first, length,
                   end);
    }
}

/// Logs what is wrong with a mesh in its final form, in the words of the export. The rules of
/// `scene::validate` are stricter than those.
void checkTriangulated(const base::IPlugin& mesh) {
    using Mesh = scene::mesh_schema;
    if (scene::getListCount(mesh, Mesh::n_primitives) == 0)
        return report(mesh, base::logWarning, "validate |{}| Mesh doesn't contain any primitives!");
    const auto* positions = find(mesh, Mesh::n_positions);
    if (!positions || positions->empty())
        return report(mesh, base::logError, "validate |{}| The vertex positions are missing!");
    const auto* triangles = find(mesh, Mesh::n_triIndices);
    const bool isTriangulated = triangles && !triangles->empty();
    const auto* indices = isTriangulated ? triangles : find(mesh, Mesh::n_indices);
    const bool hasIndices = indices && !indices->empty();
    checkRanges(mesh, isTriangulated, hasIndices ? indices->size() : positions->size());
    if (!hasIndices)
        return;
    const u32* beyond =
        std::ranges::find_if(*indices, [&](u32 index) { return index >= positions->size(); });
    if (beyond != indices->end())
        report(mesh, base::logError, "validate |{}| Found face index out of range at position {}!",
               beyond - indices->begin());
}

void checkMesh(base::IPlugin& mesh, SceneCounts& counts) {
    ++counts.meshes;
    scene::convertToSingleIndex(mesh);
    scene::triangulate(mesh, false, true);
    checkTriangulated(mesh);
    const u32 primitives = scene::getListCount(mesh, scene::mesh_schema::n_primitives);
    for (u32 i = 0; i < primitives; ++i)
        counts.triangles += countTriangles(mesh, i);
}

} // namespace

base::vector<ObjectName> findUnexported(const base::PluginFactory& scene) {
    base::vector<ObjectName> found;
    for (const base::ref<base::IPlugin>& object : scene.plugins()) {
        const auto isType = [&](const scene::SchemaName* type) {
            return *type == object->typeName();
        };
        if (object && std::ranges::any_of(unexportedTypes, isType))
            found.push_back({object->typeName().text(), object->getName()});
    }
    return found;
}

SceneCounts checkScene(base::PluginFactory& scene, const Messages& messages) {
    // Views of buffers in scenes that were made in memory.
    scene.afterLoadAll(1, 0);
    SceneCounts counts;
    for (u32 id = 0; id < scene.pluginCount(); ++id) {
        const base::ref<base::IPlugin> object = scene.plugin(id);
        if (!object)
            continue;
        const std::size_t messagesBefore = messages.all().size();
        if (object->typeName() == scene::node_schema::n_kind)
            ++counts.nodes;
        else if (object->typeName() == scene::mesh_schema::n_kind)
            checkMesh(*object, counts);
        counts.faultyMeshes += messages.all().size() == messagesBefore ? 0 : 1;
    }
    return counts;
}

} // namespace host
