#include "scene_mesh_triangulate.h"

#include "b_log.h"
#include "scene_mesh.h"
#include "scene_mesh_channels.h"
#include "scene_mesh_edit.h"
#include "scene_mesh_primitive.h"
#include "scene_schema.h"

#include <algorithm>
#include <memory>
#include <numeric>
#include <span>
#include <utility>

namespace scene {

using base::AttribMap;
using base::log;
using base::logError;
using base::logScene;
using base::u16;
using base::u32;
using base::u64;
using base::vector;

namespace {

/// Indices that a mesh may come to: the buffers of a document hold up to 2 GiB. Primitives that
/// all take the whole index array could make a small mesh a huge one.
constexpr u64 maxTriangleIndices = u64(1) << 29;

/// The face sizes of a primitive whose faces are cut up or taken over one by one: unknown for
/// strips and fans, and for lines in a list of sizes.
FaceSizes readPolygonSizes(const AttribMap& primitive) {
    if (!isFaceList(readTopology(primitive)))
        return {};
    const FaceSizes sizes = readFaceSizes(primitive);
    const bool lines = sizes.list && std::ranges::all_of(*sizes.list, [](u16 n) { return n < 3; });
    return lines ? FaceSizes() : sizes;
}

vector<AttribMap*> findPrimitives(AttribMap& mesh) {
    vector<AttribMap*> primitives;
    const u32 count = getListCount(mesh, mesh_schema::n_primitives);
    for (u32 i = 0; i < count; ++i)
        if (AttribMap* primitive = findListItem(mesh, mesh_schema::n_primitives, i))
            primitives.push_back(primitive);
    return primitives;
}

/// A list of sizes needs work even if it holds triangles alone: readers take faces of mixed size
/// for polygons.
bool needsTriangulation(const vector<AttribMap*>& primitives, u32 largestFace) {
    return std::ranges::any_of(primitives, [&](const AttribMap* primitive) {
        const FaceSizes sizes = readPolygonSizes(*primitive);
        return sizes.list || sizes.single > largestFace;
    });
}

class MeshTriangulation {
public:
    MeshTriangulation(AttribMap& mesh, const vector<base::vec3f>& positions,
                      vector<AttribMap*> primitives, u32 largestFace)
        : mesh_(mesh), name_(objectName(mesh)), positionCount_(static_cast<u32>(positions.size())),
          largestFace_(largestFace), primitives_(std::move(primitives)),
          polygons_(positions, name_) {}
    bool run();

private:
    bool findFaceIndices();
    std::span<const u32> findCorners(const AttribMap& primitive) const;
    u64 countIndices(const FaceSizes& sizes, u64 cornerCount) const;
    bool reserve();
    void addPrimitive(AttribMap& primitive);
    void addEqualFaces(u32 size, std::span<const u32> corners);
    void addFaces(const vector<u16>& sizes, std::span<const u32> corners);
    void addFace(std::span<const u32> corners);

    AttribMap& mesh_;
    base::string name_;
    u32 positionCount_;
    u32 largestFace_;               ///< corners of the largest face that stays as it is
    vector<AttribMap*> primitives_; ///< without the gaps of the list
    vector<u32> impliedIndices_;
    std::span<const u32> indices_;
    vector<u32> triangles_;
    PolygonTriangulator polygons_;
    MeshEdit edit_;
};

bool MeshTriangulation::run() {
    if (!findFaceIndices() || !reserve())
        return false;
    for (AttribMap* primitive : primitives_)
        addPrimitive(*primitive);
    edit_.replace(mesh_, mesh_schema::n_triIndices,
                  std::make_unique<base::TypedVectorAttribute<u32>>(std::move(triangles_)));
    edit_.commit();
    return true;
}

/// "indices", else the position indices of a mesh that could not be converted, else all positions
/// in order.
bool MeshTriangulation::findFaceIndices() {
    const vector<u32>* faces = findIndices(mesh_, mesh_schema::n_indices);
    const vector<u32>* global = findIndices(mesh_, mesh_schema::n_positionIndices);
    if (faces && global && faces->size() != global->size()) {
        log().log(logScene, logError,
                  "triangulate |{}| Inconsistent position ({}) and global index count ({}).", name_,
                  faces->size(), global->size());
        return false;
    }
    if (!faces && !global) {
        impliedIndices_.resizeUninitialized(positionCount_);
        std::iota(impliedIndices_.begin(), impliedIndices_.end(), 0u);
        faces = &impliedIndices_;
    }
    const vector<u32>& used = faces ? *faces : *global;
    indices_ = {used.data(), used.size()};
    return true;
}

/// The stored range of the primitive, cut to what is there.
std::span<const u32> MeshTriangulation::findCorners(const AttribMap& primitive) const {
    const u32* start = find(primitive, meshPrimitive_schema::n_indexStart);
    const u32* count = find(primitive, meshPrimitive_schema::n_indexCount);
    const std::size_t begin = std::min<std::size_t>(start ? *start : 0, indices_.size());
    const std::size_t rest = indices_.size() - begin;
    return indices_.subspan(begin, count ? std::min<std::size_t>(*count, rest) : rest);
}

/// Upper bound of the entries that the primitive comes to.
u64 MeshTriangulation::countIndices(const FaceSizes& sizes, u64 cornerCount) const {
    const auto ofFace = [&](u32 n) { return n > largestFace_ ? u64(n - 2) * 3 : u64(n); };
    if (!sizes.known || (!sizes.list && sizes.single == 0))
        return cornerCount;
    if (!sizes.list)
        return cornerCount / sizes.single * ofFace(sizes.single);
    u64 sum = 0;
    for (const u16 n : *sizes.list)
        sum += ofFace(n);
    return std::min(sum, cornerCount * 3);
}

bool MeshTriangulation::reserve() {
    u64 sum = 0;
    for (const AttribMap* primitive : primitives_)
        sum += countIndices(readPolygonSizes(*primitive), findCorners(*primitive).size());
    if (sum > maxTriangleIndices) {
        log().log(logScene, logError,
                  "gltf |{}| The primitives come to more triangle indices than can be stored! "
                  "Expected at most {}, found {}.",
                  name_, maxTriangleIndices, sum);
        return false;
    }
    triangles_.reserve(sum);
    return true;
}

void MeshTriangulation::addPrimitive(AttribMap& primitive) {
    const u32* start = find(primitive, meshPrimitive_schema::n_indexStart);
    const u32* count = find(primitive, meshPrimitive_schema::n_indexCount);
    if (u64(start ? *start : 0) + (count ? *count : 0) > indices_.size())
        log().log(logScene, logError,
                  "validate |{}| Index offset/count out of bounds {}-{} out of {}!", name_,
                  start ? *start : 0, count ? *count : 0, indices_.size());

    const std::size_t before = triangles_.size();
    const std::span<const u32> corners = findCorners(primitive);
    const FaceSizes sizes = readPolygonSizes(primitive);
    if (!sizes.known)
        triangles_.append(corners.begin(), corners.end());
    else if (sizes.list)
        addFaces(*sizes.list, corners);
    else
        addEqualFaces(sizes.single, corners);
    const auto store = [&](const SchemaAttribute<u32>& name, std::size_t value) {
        edit_.replace(primitive, name,
                      std::make_unique<base::TypedAttribute<u32>>(static_cast<u32>(value)));
    };
    store(meshPrimitive_schema::n_triIndexStart, before);
    store(meshPrimitive_schema::n_triIndexCount, triangles_.size() - before);
}

void MeshTriangulation::addEqualFaces(u32 size, std::span<const u32> corners) {
    if (size == 0 || corners.size() % size != 0)
        log().log(logScene, logError, "validate |{}| Invalid face vertex count {}!", name_, size);
    if (size == 0)
        return;
    const std::size_t whole = corners.size() / size * size;
    if (size <= largestFace_) {
        triangles_.append(corners.begin(), corners.begin() + static_cast<std::ptrdiff_t>(whole));
        return;
    }
    for (std::size_t begin = 0; begin < whole; begin += size)
        polygons_.triangulatePolygon(corners.data() + begin, size, triangles_);
}

void MeshTriangulation::addFaces(const vector<u16>& sizes, std::span<const u32> corners) {
    const u64 sum = std::accumulate(sizes.begin(), sizes.end(), u64(0));
    if (sum != corners.size())
        log().log(logScene, logError,
                  "validate |{}| Invalid face vertex counts. Expected {}, got {}!", name_,
                  corners.size(), sum);
    for (const u16 size : sizes) {
        if (size > corners.size())
            return;
        addFace(corners.first(size));
        corners = corners.subspan(size);
    }
}

/// Faces of fewer than 3 corners have nothing to draw among polygons.
void MeshTriangulation::addFace(std::span<const u32> corners) {
    if (corners.size() > largestFace_)
        polygons_.triangulatePolygon(corners.data(), static_cast<u32>(corners.size()), triangles_);
    else if (corners.size() >= 3)
        triangles_.append(corners.begin(), corners.end());
}

} // namespace

bool triangulate(AttribMap& mesh, bool keepQuads, bool) {
    const auto* positions = find(mesh, mesh_schema::n_positions);
    if (!positions || positions->empty() || findIndices(mesh, mesh_schema::n_triIndices))
        return true;
    const u32 largestFace = keepQuads ? 4 : 3;
    vector<AttribMap*> primitives = findPrimitives(mesh);
    return !needsTriangulation(primitives, largestFace) ||
           MeshTriangulation(mesh, *positions, std::move(primitives), largestFace).run();
}

} // namespace scene
