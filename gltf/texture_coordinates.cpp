#include "gltf/texture_coordinates.h"

#include "scene_mesh.h"
#include "scene_schema.h"

namespace gltf {

using base::AttribMap;
using base::string;
using base::vec2f;
using scene::mesh_schema;
using scene::meshUVSet_schema;

namespace {

/// True if the set becomes texture coordinates of the document: it has one pair of numbers for each
/// vertex.
bool isExportedUVSet(const AttribMap& set, std::size_t vertexCount) {
    const base::Attribute* uv = set.findAttribute(meshUVSet_schema::n_UV);
    return uv && uv->type() == base::TypeTraits<vec2f>::n_array_name && vertexCount != 0 &&
           static_cast<const base::vector<vec2f>*>(uv->data())->size() == vertexCount;
}

} // namespace

base::i32 findTexCoord(const scene::IMesh& mesh, base::string_view name) {
    const auto* positions = find(mesh, mesh_schema::n_positions);
    const std::size_t vertexCount = positions ? positions->size() : 0;
    const base::u32 setCount = getListCount(mesh, mesh_schema::n_uvSets);
    base::i32 exportedCount = 0;
    for (base::u32 i = 0; i < setCount; ++i) {
        const AttribMap* set = findListItem(mesh, mesh_schema::n_uvSets, i);
        if (!set)
            continue;
        const bool isExported = isExportedUVSet(*set, vertexCount);
        const string* setName = find(*set, meshUVSet_schema::n_name);
        if (setName && *setName == name)
            return isExported ? exportedCount : 0;
        exportedCount += isExported;
    }
    return 0;
}

} // namespace gltf
