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

/// The check of faces that `scene::validate` does for meshes of triangles alone.
bool checkIndices(const base::IPlugin& mesh) {
    const auto* indices = find(mesh, scene::mesh_schema::n_indices);
    const auto* positions = find(mesh, scene::mesh_schema::n_positions);
    if (!indices || !positions)
        return true;
    const u32* beyond =
        std::ranges::find_if(*indices, [&](u32 index) { return index >= positions->size(); });
    if (beyond == indices->end())
        return true;
    base::log().log(base::logScene, base::logError,
                    "validate |{}| Found face index out of range at position {}!", mesh.getName(),
                    beyond - indices->begin());
    return false;
}

void checkMesh(base::IPlugin& mesh, SceneCounts& counts) {
    ++counts.meshes;
    bool isGood = scene::convertToSingleIndex(mesh);
    isGood &= scene::validate(mesh, mesh.getName(), false, false);
    isGood &= checkIndices(mesh);
    isGood &= scene::triangulate(mesh, false, false);
    counts.faultyMeshes += isGood ? 0 : 1;
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

SceneCounts checkScene(base::PluginFactory& scene) {
    // Views of buffers in scenes that were made in memory.
    scene.afterLoadAll(1, 0);
    SceneCounts counts;
    for (u32 id = 0; id < scene.pluginCount(); ++id) {
        const base::ref<base::IPlugin> object = scene.plugin(id);
        if (!object)
            continue;
        if (object->typeName() == scene::node_schema::n_kind)
            ++counts.nodes;
        else if (object->typeName() == scene::mesh_schema::n_kind)
            checkMesh(*object, counts);
    }
    return counts;
}

} // namespace host
