#include "gltf/exporter.h"
#include "gltf/mesh_indices.h"
#include "gltf/vertex_array.h"

#include "b_log.h"
#include "scene_mesh.h"
#include "scene_mesh_index.h"
#include "scene_mesh_triangulate.h"
#include "scene_schema.h"

#include <algorithm>

namespace gltf {

using base::AttribMap;
using base::i32;
using base::log;
using base::logError;
using base::logScene;
using base::ref;
using base::string;
using base::u32;
using base::u64;
using scene::mesh_schema;
using scene::meshPrimitive_schema;

namespace {

/// glTF's mode for a type of primitive, -1 for what it does not know.
i32 modeOf(i32 primitiveType) {
    switch (primitiveType) {
    case scene::primitivePoints:
        return 0;
    case scene::primitiveLines:
        return 1;
    case scene::primitiveLineStrip:
        return 3;
    case scene::primitiveTriangles:
        return 4;
    case scene::primitiveTriangleStrip:
        return 5;
    case scene::primitiveTriangleFan:
        return 6;
    default:
        return -1;
    }
}

/// The type of a primitive as it is drawn: faces are triangles once the mesh is triangulated, all
/// other kinds stay what they are.
i32 drawnType(const scene::IMesh& mesh, u32 index, bool isTriangulated) {
    const i32 type = getPrimitiveType(mesh, index, false);
    switch (type) {
    case scene::primitivePoints:
    case scene::primitiveLines:
    case scene::primitiveLineStrip:
    case scene::primitiveTriangleStrip:
    case scene::primitiveTriangleFan:
        return type;
    default:
        return isTriangulated ? i32(scene::primitiveTriangles) : type;
    }
}

struct IndexRange {
    u64 start = 0;
    u64 count = 0;
};

const u32* findFirst(const AttribMap& primitive, const scene::SchemaAttribute<u32>& first,
                     const scene::SchemaAttribute<u32>& second) {
    const u32* value = find(primitive, first);
    return value ? value : find(primitive, second);
}

/// The stored range of a primitive, which may lead past the end. The only primitive of a
/// triangulated mesh has all triangles if its range is that of the former faces.
IndexRange storedRange(const AttribMap& primitive, const MeshIndices& indices, bool isOnlyOne) {
    if (isOnlyOne && indices.isTriangulated() &&
        !find(primitive, meshPrimitive_schema::n_triIndexCount))
        return {0, indices.count()};
    const u32* start = findFirst(primitive, meshPrimitive_schema::n_triIndexStart,
                                 meshPrimitive_schema::n_indexStart);
    const u32* count = findFirst(primitive, meshPrimitive_schema::n_triIndexCount,
                                 meshPrimitive_schema::n_indexCount);
    return {start ? *start : 0, count ? *count : indices.rangeEnd()};
}

IndexRange clampedRange(IndexRange range, u64 end, const scene::IMesh& mesh) {
    if (range.start + range.count <= end)
        return range;
    log().log(logScene, logError, "validate |{}| Index offset/count out of bounds {}-{} out of {}!",
              mesh.getName(), range.start, range.count, end);
    range.start = std::min(range.start, end);
    range.count = std::min(range.count, end - range.start);
    return range;
}

ref<GLTF::Accessor> makeIndices(IndexRange range, const ref<GLTF::BufferView>& view) {
    auto accessor = base::makeRef<GLTF::Accessor>(GLTF::Accessor::Type::scalar, GLTF::componentU32,
                                                  static_cast<i32>(range.start * sizeof(u32)),
                                                  static_cast<i32>(range.count), view);
    accessor->computeMinMax();
    return accessor;
}

u32 countPrimitives(const scene::IMesh& mesh) {
    const u32 listCount = getListCount(mesh, mesh_schema::n_primitives);
    u32 count = 0;
    for (u32 i = 0; i < listCount; ++i)
        count += findListItem(mesh, mesh_schema::n_primitives, i) != nullptr;
    return count;
}

/// True if an index leads past the vertices.
bool hasIndexOutOfRange(const GLTF::Mesh& gltfMesh, const MeshIndices& indices) {
    // The bounds are there already. As floats they order like the indices, but for equality.
    const float vertexCount = static_cast<float>(indices.vertexCount());
    u64 seen = 0;
    bool maybe = false;
    for (const ref<GLTF::Primitive>& primitive : gltfMesh.primitives) {
        if (!primitive->indices)
            continue;
        seen += static_cast<u64>(primitive->indices->count);
        maybe |= primitive->indices->max[0] >= vertexCount;
    }
    maybe |= seen < indices.count();
    return maybe && indices.findOutOfRange() != indices.count();
}

} // namespace

ref<GLTF::Mesh> GLTFScenePlugin::convertMesh(scene::IMesh& mesh, u32 materialIndex,
                                             bool withTargets) {
    convertToSingleIndex(mesh, morphBases_.contains(&mesh));
    triangulate(mesh, false, true);

    auto gltfMesh = base::makeRef<GLTF::Mesh>();
    if (const string* name = find(mesh, scene::geometry_schema::n_name))
        gltfMesh->name = *name;
    MeshIndices indices(mesh);
    const bool allTriangles = convertPrimitives(*gltfMesh, mesh, materialIndex, indices);
    if (gltfMesh->primitives.empty()) {
        log().log(logScene, base::logWarning, "validate |{}| Mesh doesn't contain any primitives!",
                  mesh.getName());
        return nullptr;
    }
    if (!convertMeshAttributes(*gltfMesh, mesh)) {
        log().log(logScene, logError, "validate |{}| The vertex positions are missing!",
                  mesh.getName());
        return gltfMesh;
    }
    if (hasIndexOutOfRange(*gltfMesh, indices))
        log().log(logScene, logError, "validate |{}| Found face index out of range at position {}!",
                  mesh.getName(), indices.findOutOfRange());
    else if (exportCompress && !withTargets && allTriangles)
        compressMesh(*gltfMesh, mesh);
    return gltfMesh;
}

/// Returns whether all primitives are lists of triangles.
bool GLTFScenePlugin::convertPrimitives(GLTF::Mesh& gltfMesh, scene::IMesh& mesh, u32 materialIndex,
                                        MeshIndices& indices) {
    const u32 listCount = getListCount(mesh, mesh_schema::n_primitives);
    const u32 primitiveCount = countPrimitives(mesh);
    ref<GLTF::BufferView> view = indices.makeView(mesh);
    bool allTriangles = true;
    u64 drawnCount = 0;
    gltfMesh.primitives.reserve(primitiveCount);
    for (u32 i = 0; i < listCount; ++i) {
        const AttribMap* source = findListItem(mesh, mesh_schema::n_primitives, i);
        if (!source)
            continue;
        const IndexRange range = clampedRange(storedRange(*source, indices, primitiveCount == 1),
                                              indices.rangeEnd(), mesh);
        // Without indices every primitive would draw all vertices.
        if (!view && (primitiveCount > 1 || range.count < indices.vertexCount())) {
            indices.number();
            view = indices.makeView(mesh);
        }
        if (range.count == 0 && indices.rangeEnd() != 0)
            continue;
        // Many primitives that all take the whole array make a huge document of a small mesh.
        drawnCount += range.count;
        checkedLength(drawnCount * sizeof(u32), mesh);

        const i32 type = drawnType(mesh, i, indices.isTriangulated());
        allTriangles &= type == scene::primitiveTriangles;
        auto primitive = base::makeRef<GLTF::Primitive>();
        primitive->mode = modeOf(type);
        if (primitive->mode < 0)
            log().log(logScene, base::logWarning,
                      "gltf |{}| Primitive {} is of no kind that can be drawn!", mesh.getName(), i);
        if (view)
            primitive->indices = makeIndices(range, view);
        if (const auto* materials = find(*source, meshPrimitive_schema::n_materials))
            assignMaterial(*primitive, *materials, materialIndex, &mesh);
        gltfMesh.primitives.push_back(std::move(primitive));
    }
    return allTriangles;
}

/// Prepares one Draco stream of all indices, which the primitives share.
void GLTFScenePlugin::compressMesh(GLTF::Mesh& gltfMesh, const scene::IMesh& mesh) {
    string reason;
    const GLTF::Primitive& first = *std::as_const(gltfMesh).primitives[0];
    // The primitives have ranges of one array.
    const auto extension = GLTF::DracoExtension::make(
        first.attributes, first.indices ? first.indices->bufferView->buffer : nullptr, reason);
    if (!extension) {
        log().log(logScene, logError, "gltf |{}| The mesh can't be compressed, it stays plain: {}!",
                  mesh.getName(), reason);
        return;
    }
    for (const ref<GLTF::Primitive>& primitive : gltfMesh.primitives)
        primitive->extensions[GLTF::dracoExtensionName] = extension;
}

} // namespace gltf
