#include "scene_mesh.h"

#include "b_factory.h"
#include "scene_mesh_primitive.h"
#include "scene_schema.h"

#include <algorithm>
#include <optional>

namespace scene {

using base::AttribArray;
using base::AttribMap;
using base::Attribute;
using base::box3f;
using base::i32;
using base::TypeTraits;
using base::u16;
using base::u32;
using base::vec3f;

base::string objectName(const AttribMap& object) {
    const base::string* name = find(object, geometry_schema::n_name);
    return name ? *name : base::string();
}

u32 getListCount(const AttribMap& mesh, const SchemaAttribute<Items>& list) {
    const Attribute* attribute = mesh.findAttribute(list);
    if (!attribute)
        return 0;
    if (const AttribArray* items = attribute->asArray())
        return items->size();
    const auto* objects = mesh.findVecAttribute<Object>(list);
    return objects ? static_cast<u32>(objects->size()) : 0;
}

AttribMap* findListItem(const AttribMap& mesh, const SchemaAttribute<Items>& list, u32 index) {
    const Attribute* attribute = mesh.findAttribute(list);
    if (!attribute)
        return nullptr;
    if (const AttribArray* items = attribute->asArray())
        return findItemMap(*items, index);
    const auto* objects = mesh.findVecAttribute<Object>(list);
    return objects && index < objects->size() ? (*objects)[index].get() : nullptr;
}

std::optional<u32> readTopology(const AttribMap& primitive) {
    const Attribute* attribute = primitive.findAttribute(meshPrimitive_schema::n_topology);
    if (!attribute)
        return std::nullopt;
    if (attribute->type() == TypeTraits<u16>::n_name)
        return *static_cast<const u16*>(attribute->data());
    const auto* values = find(primitive, meshPrimitive_schema::n_topology);
    if (!values || values->empty())
        return std::nullopt;
    return values->front();
}

namespace {

i32 typeOfFaces(const FaceSizes& faces) {
    if (!faces.known)
        return primitiveNone;
    if (faces.list) {
        const bool allLines = std::ranges::all_of(*faces.list, [](u16 n) { return n < 3; });
        return allLines ? primitiveLines : primitiveMixedPolygons;
    }
    switch (faces.single) {
    case 1:
        return primitivePoints;
    case 2:
        return primitiveLines;
    case 3:
        return primitiveTriangles;
    case 4:
        return primitiveQuads;
    default:
        return primitivePolygons;
    }
}

bool hasTriIndices(const AttribMap& mesh) {
    const auto* triangles = find(mesh, mesh_schema::n_triIndices);
    return triangles && !triangles->empty();
}

} // namespace

FaceSizes readFaceSizes(const AttribMap& primitive) {
    const Attribute* attribute = primitive.findAttribute(meshPrimitive_schema::n_vcounts);
    if (!attribute)
        return {};
    if (attribute->type() == TypeTraits<u16>::n_name)
        return {true, *static_cast<const u16*>(attribute->data()), nullptr};
    const auto* list = find(primitive, meshPrimitive_schema::n_vcounts);
    if (!list || list->empty())
        return {};
    return list->size() == 1 ? FaceSizes{true, list->front(), nullptr} : FaceSizes{true, 0, list};
}

i32 getPrimitiveType(const AttribMap& mesh, u32 index, bool triangulated) {
    const AttribMap* primitive = findListItem(mesh, mesh_schema::n_primitives, index);
    if (!primitive)
        return primitiveNone;
    const std::optional<u32> topology = readTopology(*primitive);
    const FaceSizes faces = readFaceSizes(*primitive);
    if (!isFaceList(topology)) {
        if (*topology == 5 || *topology == 6)
            return primitiveTriangleFan;
        return faces.isSingle(2) ? primitiveLineStrip : primitiveTriangleStrip;
    }
    if (triangulated && hasTriIndices(mesh))
        return primitiveTriangles;
    return typeOfFaces(faces);
}

namespace {

/// The first of the two attributes that the primitive stores, the former only if `triangulated`.
const u32* findRangeValue(const AttribMap& mesh, u32 index, bool triangulated,
                          const SchemaAttribute<u32>& ofTriangles,
                          const SchemaAttribute<u32>& ofFaces) {
    const AttribMap* primitive = findListItem(mesh, mesh_schema::n_primitives, index);
    if (!primitive)
        return nullptr;
    const u32* value = triangulated ? find(*primitive, ofTriangles) : nullptr;
    return value ? value : find(*primitive, ofFaces);
}

} // namespace

u32 getPrimitiveIndexStart(const AttribMap& mesh, u32 index, bool triangulated) {
    const u32* start =
        findRangeValue(mesh, index, triangulated, meshPrimitive_schema::n_triIndexStart,
                       meshPrimitive_schema::n_indexStart);
    return start ? *start : 0;
}

u32 getPrimitiveIndexCount(const AttribMap& mesh, u32 index, bool triangulated) {
    const u32* count =
        findRangeValue(mesh, index, triangulated, meshPrimitive_schema::n_triIndexCount,
                       meshPrimitive_schema::n_indexCount);
    if (count)
        return *count;
    const auto* indices = triangulated && hasTriIndices(mesh)
                              ? find(mesh, mesh_schema::n_triIndices)
                              : find(mesh, mesh_schema::n_indices);
    return indices ? static_cast<u32>(indices->size()) : 0;
}

namespace {

/// The difference of a number to itself is 0 exactly for finite ones.
bool isFinite(const auto& p) {
    return (p.x - p.x) + (p.y - p.y) + (p.z - p.z) == 0;
}

/// The box of the finite points; empty if there is none.
template <class Point>
box3f boundsOf(const base::vector<Point>& points) {
    box3f box;
    for (const Point& p : points) {
        if (!isFinite(p))
            continue;
        box.min = {std::min(box.min.x, p.x), std::min(box.min.y, p.y), std::min(box.min.z, p.z)};
        box.max = {std::max(box.max.x, p.x), std::max(box.max.y, p.y), std::max(box.max.z, p.z)};
    }
    return box;
}

} // namespace

box3f getGeometryBounds(const AttribMap& geometry) {
    const box3f* stored = find(geometry, geometry_schema::n_bounds);
    if (stored && isFinite(stored->min) && isFinite(stored->max) && !stored->isEmpty())
        return *stored;
    box3f box;
    const auto measure = [&box](const auto& points) { box = boundsOf(points); };
    if (!visitVector<vec3f>(geometry, mesh_schema::n_positions, measure))
        visitVector<vec3f, base::vec4f>(geometry, lines_schema::n_points, measure);
    return box;
}

} // namespace scene
