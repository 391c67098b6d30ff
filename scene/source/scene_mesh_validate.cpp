#include "scene_mesh.h"

#include "b_log.h"
#include "scene_mesh_primitive.h"
#include "scene_schema.h"

#include <algorithm>
#include <numeric>

namespace scene {

using base::AttribMap;
using base::log;
using base::name_id;
using base::string;
using base::u32;
using base::u64;
using base::vector;

namespace {

u64 sizeOf(const AttribMap& map, name_id name) {
    const base::Attribute* attribute = map.findAttribute(name);
    return attribute ? attribute->size() : 0;
}

class MeshValidation {
public:
    MeshValidation(const AttribMap& mesh, const string& name)
        : mesh_(mesh), name_(name), positionCount_(sizeOf(mesh, mesh_schema::n_positions)) {}

    bool run(bool triangulated, bool perPosition);

private:
    void checkVertexArrays();
    void checkVertexArray(const AttribMap& owner, name_id name, const char* label,
                          name_id ownIndices);
    void checkPrimitives();
    void checkRange(const AttribMap& primitive, const SchemaAttribute<u32>& start,
                    const SchemaAttribute<u32>& count, const char* noStart, const char* noCount,
                    u64 indexCount);
    void checkFaceSizes(const AttribMap& primitive);
    void checkFaceIndices();
    void checkPositionIndices();
    void checkIndices(name_id indices, u64 elementCount, const char* message);

    /// Logs `pattern`, whose first placeholder is the mesh's name.
    template <class... Args>
    void report(int level, const char* pattern, const Args&... args) {
        log().log(base::logScene, level, pattern, name_, args...);
        good_ = false;
    }

    const AttribMap& mesh_;
    const string& name_;
    u64 positionCount_;
    u32 primitiveCount_ = 0;
    bool good_ = true;
};

bool MeshValidation::run(bool triangulated, bool perPosition) {
    checkVertexArrays();
    checkPrimitives();
    if (triangulated)
        checkFaceIndices();
    if (perPosition)
        checkPositionIndices();
    return good_;
}

void MeshValidation::checkVertexArrays() {
    if (positionCount_ == 0)
        report(base::logError, "validate |{}| The vertex positions are missing!");
    checkVertexArray(mesh_, mesh_schema::n_normals, "normals", mesh_schema::n_normalIndices);
    checkVertexArray(mesh_, mesh_schema::n_velocities, "velocities", {});
    const auto forEachSet = [&](const SchemaAttribute<Items>& list, auto check) {
        const u32 count = getListCount(mesh_, list);
        for (u32 i = 0; i < count; ++i)
            if (const AttribMap* set = findListItem(mesh_, list, i))
                check(*set);
    };
    forEachSet(mesh_schema::n_colorSets, [&](const AttribMap& set) {
        const name_id indices = meshColorSet_schema::n_indices;
        checkVertexArray(set, meshColorSet_schema::n_RGB, "rgb colors", indices);
        checkVertexArray(set, meshColorSet_schema::n_RGBA, "rgba colors", indices);
    });
    forEachSet(mesh_schema::n_uvSets, [&](const AttribMap& set) {
        const name_id indices = meshUVSet_schema::n_indices;
        checkVertexArray(set, meshUVSet_schema::n_UV, "uv coordinates", indices);
        checkVertexArray(set, meshUVSet_schema::n_UVW, "uvw coordinates", indices);
        checkVertexArray(set, meshUVSet_schema::n_UVWQ, "uvwq coordinates", indices);
    });
}

/// An array without indices of its own holds one element for each position.
void MeshValidation::checkVertexArray(const AttribMap& owner, name_id name, const char* label,
                                      name_id ownIndices) {
    const u64 count = sizeOf(owner, name);
    if (count == 0 || count == positionCount_ || (ownIndices && sizeOf(owner, ownIndices) != 0))
        return;
    report(base::logError, "validate |{}| Wrong number of {}! Expected {} elements, found {}.",
           label, positionCount_, count);
}

void MeshValidation::checkPrimitives() {
    primitiveCount_ = getListCount(mesh_, mesh_schema::n_primitives);
    if (primitiveCount_ == 0)
        report(base::logWarning, "validate |{}| Mesh doesn't contain any primitives!");
    const u64 triIndexCount = sizeOf(mesh_, mesh_schema::n_triIndices);
    for (u32 i = 0; i < primitiveCount_; ++i) {
        const AttribMap* primitive = findListItem(mesh_, mesh_schema::n_primitives, i);
        if (!primitive)
            continue;
        checkRange(*primitive, meshPrimitive_schema::n_indexStart,
                   meshPrimitive_schema::n_indexCount, "validate |{}| Missing start index!",
                   "validate |{}| Missing index count!", sizeOf(mesh_, mesh_schema::n_indices));
        if (triIndexCount != 0)
            checkRange(*primitive, meshPrimitive_schema::n_triIndexStart,
                       meshPrimitive_schema::n_triIndexCount,
                       "validate |{}| Missing triangle start index!",
                       "validate |{}| Missing triangle index count!", triIndexCount);
        checkFaceSizes(*primitive);
    }
}

/// The only primitive of a mesh needs no range: all indices are its own. A range that ends with
/// the index array is reported too; that is the rule.
void MeshValidation::checkRange(const AttribMap& primitive, const SchemaAttribute<u32>& startName,
                                const SchemaAttribute<u32>& countName, const char* noStart,
                                const char* noCount, u64 indexCount) {
    const u32* start = find(primitive, startName);
    const u32* count = find(primitive, countName);
    if (!start && primitiveCount_ >= 2)
        report(base::logError, noStart);
    if (!count && primitiveCount_ >= 2)
        report(base::logError, noCount);
    if (start && count && u64(*start) + *count >= indexCount)
        report(base::logError, "validate |{}| Index offset/count out of bounds {}-{} out of {}!",
               *start, *count, indexCount);
}

void MeshValidation::checkFaceSizes(const AttribMap& primitive) {
    const FaceSizes sizes = readFaceSizes(primitive);
    if (readTopology(primitive) == 2 || !sizes.known) {
        report(base::logWarning, "validate |{}| Found primitive from unknown type!!");
        return;
    }
    const u64 indexCount = sizeOf(mesh_, mesh_schema::n_indices);
    if (sizes.list) {
        const u64 sum = std::accumulate(sizes.list->begin(), sizes.list->end(), u64(0));
        if (sum != indexCount)
            report(base::logError, "validate |{}| Invalid face vertex counts. Expected {}, got {}!",
                   indexCount, sum);
    } else if (sizes.single == 0 || indexCount % sizes.single != 0) {
        report(base::logError, "validate |{}| Invalid face vertex count {}!", sizes.single);
    }
}

void MeshValidation::checkFaceIndices() {
    const u64 count = sizeOf(mesh_, mesh_schema::n_indices);
    if (count == 0)
        report(base::logWarning, "validate |{}| Missing indices!");
    if (count != sizeOf(mesh_, mesh_schema::n_triIndices))
        report(base::logWarning, "validate |{}| Triangulated indices mismatch!");
    checkIndices(mesh_schema::n_indices, positionCount_,
                 "validate |{}| Found face index out of range at position {}!");
}

void MeshValidation::checkPositionIndices() {
    if (sizeOf(mesh_, mesh_schema::n_positionIndices) == 0)
        report(base::logWarning, "validate |{}| Missing position indices!");
    checkIndices(mesh_schema::n_positionIndices, positionCount_,
                 "validate |{}| Found position index out of range at position {}!");
    const char* normalMessage = "validate |{}| Found normal index out of range at position {}!";
    checkIndices(mesh_schema::n_normalIndices, sizeOf(mesh_, mesh_schema::n_normals),
                 normalMessage);
    // Tangents and bitangents share their indices.
    const u64 tangentCount = sizeOf(mesh_, mesh_schema::n_tangents);
    checkIndices(mesh_schema::n_tangentIndices,
                 tangentCount ? tangentCount : sizeOf(mesh_, mesh_schema::n_bitangents),
                 normalMessage);
}

/// Reports the first index that leads past the end.
void MeshValidation::checkIndices(name_id name, u64 elementCount, const char* message) {
    const vector<u32>* indices = mesh_.findVecAttribute<u32>(name);
    if (!indices)
        return;
    const u32* beyond =
        std::ranges::find_if(*indices, [&](u32 index) { return index >= elementCount; });
    if (beyond != indices->end())
        report(base::logError, message, beyond - indices->begin());
}

} // namespace

bool validate(const AttribMap& mesh, const string& name, bool triangulated, bool perPosition) {
    return MeshValidation(mesh, name).run(triangulated, perPosition);
}

} // namespace scene
