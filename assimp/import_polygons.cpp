#include "assimp/import_polygons.h"

#include "assimp/library_text.h"
#include "assimp/vertex_frames.h"
#include "assimp/vertex_selection.h"
#include "assimp/weld.h"

#include "scene_mesh_index.h"
#include "scene_schema.h"

#include <assimp/mesh.h>

namespace assimp {

using base::AttribMap;
using base::normal;
using base::u16;
using base::u32;
using base::vec2f;
using base::vec3f;
using base::vec4f;
using base::vector;
using scene::mesh_schema;
using scene::Presence;

namespace {

/// Appends an item to one of the lists of a mesh.
template <class Schema>
AttribMap& appendItem(AttribMap& mesh, const scene::SchemaAttribute<scene::Items>& list) {
    base::AttribArray& items = write(mesh, list);
    items.setTypeName(Schema::n_kind);
    auto item = std::make_unique<AttribMap>(mesh.factory(), Schema::n_kind);
    items.append(item.get());
    return *item.release();
}

/// Makes the `mesh` object of the polygons.
class PolygonImport {
public:
    PolygonImport(const aiMesh& mesh, const GeometrySettings& settings, MeshFaces faces,
                  vector<vec3f> positions, AttribMap& object, GeometryFaults& faults)
        : mesh_(mesh), settings_(settings), faces_(std::move(faces)),
          positions_(std::move(positions)), object_(object), faults_(faults),
          computesNormals_(settings.normals == Presence::always && !mesh.mNormals),
          computesTangents_(settings.tangents == Presence::always && !mesh.mTangents &&
                            hasNormals() && mesh.mTextureCoords[0]),
          perCorner_(!faces_.sharesVertices || computesNormals_ || computesTangents_) {}

    void run() {
        selectVertices();
        settlePositions();
        writeNormalsAndTangents();
        if (settings_.textureCoordinates)
            writeTextureCoordinates();
        if (settings_.colors)
            writeColors();
        writePositions();
        writePrimitive();
        if (settings_.multiIndex == Presence::never)
            scene::convertToSingleIndex(object_);
    }

private:
    bool hasNormals() const {
        return settings_.normals != Presence::never && (mesh_.mNormals || computesNormals_);
    }

    template <class T, class Source>
    vector<T> readRepaired(const Source* elements) {
        vector<T> result = selection_.read<T>(elements);
        faults_.nonFiniteValues += repairValues(result);
        return result;
    }

    void selectVertices();
    void settlePositions();
    void writeNormalsAndTangents();
    vector<vec4f> readTangents(const vector<normal>& normals);
    void writeTextureCoordinates();
    void writeColors();
    void writePositions();
    void writePrimitive();

    const aiMesh& mesh_;
    const GeometrySettings& settings_;
    MeshFaces faces_;
    vector<vec3f> positions_; ///< of assimp's vertices, then of the scene mesh
    AttribMap& object_;
    GeometryFaults& faults_;
    bool computesNormals_;
    bool computesTangents_;
    bool perCorner_; ///< arrays but the positions have one element per corner, else per position
    VertexSelection selection_;   ///< what the elements of these arrays are read from
    vector<u32> positionIndices_; ///< of the corners
    bool hasCornerChannels_ = false;
};

/// For arrays per corner the vertices of the corners; else all that faces use, in assimp's order,
/// by which the corners are numbered anew.
void PolygonImport::selectVertices() {
    if (perCorner_) {
        selection_ = {std::move(faces_.corners), mesh_.mNumVertices};
        return;
    }

    vector<u32> numbers(mesh_.mNumVertices);
    u32* numberOf = numbers.data();
    for (const u32 corner : std::as_const(faces_.corners))
        numberOf[corner] = 1;
    vector<u32> used;
    used.reserve(mesh_.mNumVertices);
    for (u32 v = 0; v < mesh_.mNumVertices; ++v)
        if (numberOf[v] != 0) {
            numberOf[v] = static_cast<u32>(used.size());
            used.push_back(v);
        }
    for (u32& corner : faces_.corners)
        corner = numberOf[corner];
    positionIndices_ = std::move(faces_.corners);
    selection_ = {std::move(used), mesh_.mNumVertices};
}

/// Makes the positions and position indices of the scene mesh.
void PolygonImport::settlePositions() {
    if (!selection_.isWhole)
        positions_ = selection_.read<vec3f>(std::as_const(positions_).data());
    if (!perCorner_)
        return;
    Welding welding = weld(positions_);
    vector<vec3f> positions;
    positions.reserve(welding.firsts.size());
    for (const u32 first : std::as_const(welding.firsts))
        positions.push_back(std::as_const(positions_)[first]);
    positions_ = std::move(positions);
    positionIndices_ = std::move(welding.numbers);
}

void PolygonImport::writeNormalsAndTangents() {
    if (!hasNormals())
        return;
    hasCornerChannels_ = true;
    const Surface surface{positions_, positionIndices_, faces_.cornerCounts};
    vector<normal> normals;
    if (!computesNormals_) {
        normals = readRepaired<normal>(mesh_.mNormals);
        if (settings_.flip)
            for (normal& n : normals)
                n = {-n.x, -n.y, -n.z};
        faults_.zeroNormals += repairNormals(normals, surface, perCorner_);
    } else if (settings_.normalsMethod == scene::NormalsMethod::flat) {
        normals = computeFlatNormals(surface);
    } else {
        normals = computeSmoothNormals(surface, settings_.normalsAngle);
    }

    if (computesTangents_) {
        const vector<vec2f> uvs = selection_.read<vec2f>(mesh_.mTextureCoords[0]);
        write(object_, mesh_schema::n_tangents) = computeTangents(surface, normals, uvs);
    } else if (mesh_.mTangents && settings_.tangents != Presence::never) {
        write(object_, mesh_schema::n_tangents) = readTangents(normals);
    }
    write(object_, mesh_schema::n_normals) = std::move(normals);
}

/// The tangents of the file. Writes its bitangents, whose side decides the tangents' w.
vector<vec4f> PolygonImport::readTangents(const vector<normal>& normals) {
    const vector<vec3f> directions = readRepaired<vec3f>(mesh_.mTangents);
    vector<normal> bitangents;
    if (mesh_.mBitangents)
        bitangents = readRepaired<normal>(mesh_.mBitangents);
    vector<vec4f> tangents;
    tangents.reserve(directions.size());
    for (std::size_t i = 0; i < directions.size(); ++i) {
        const vec3f& t = directions[i];
        const normal& n = normals[i];
        const normal b = bitangents.empty() ? normal{} : std::as_const(bitangents)[i];
        const float side = (n.y * t.z - n.z * t.y) * b.x + (n.z * t.x - n.x * t.z) * b.y +
                           (n.x * t.y - n.y * t.x) * b.z;
        tangents.push_back({t.x, t.y, t.z, side});
    }
    faults_.zeroTangents += repairTangents(tangents, normals);
    if (!bitangents.empty())
        write(object_, mesh_schema::n_bitangents) = std::move(bitangents);
    return tangents;
}

/// Sets of two coordinates go to `UV`, of three to `UVW`, unless the third is always zero: it
/// stands in many files that mean two, and only those can be exported.
void PolygonImport::writeTextureCoordinates() {
    for (u32 i = 0; i < AI_MAX_NUMBER_OF_TEXTURECOORDS; ++i) {
        const aiVector3D* coordinates = mesh_.mTextureCoords[i];
        if (!coordinates)
            continue;
        hasCornerChannels_ = true;
        using Schema = scene::meshUVSet_schema;
        AttribMap& set = appendItem<Schema>(object_, mesh_schema::n_uvSets);
        if (mesh_.HasTextureCoordsName(i))
            write(set, Schema::n_name) = viewOf(*mesh_.GetTextureCoordsName(i));
        const bool isDeep =
            mesh_.mNumUVComponents[i] > 2 &&
            std::ranges::any_of(selection_.vertices, [&](u32 v) { return coordinates[v].z != 0; });
        if (isDeep)
            write(set, Schema::n_UVW) = readRepaired<vec3f>(coordinates);
        else
            write(set, Schema::n_UV) = readRepaired<vec2f>(coordinates);
    }
}

/// Every set has `RGB`; `RGBA` is added where some vertex is not opaque.
void PolygonImport::writeColors() {
    for (const aiColor4D* colors : mesh_.mColors) {
        if (!colors)
            continue;
        hasCornerChannels_ = true;
        using Schema = scene::meshColorSet_schema;
        AttribMap& set = appendItem<Schema>(object_, mesh_schema::n_colorSets);
        write(set, Schema::n_RGB) = readRepaired<vec3f>(colors);
        if (std::ranges::any_of(selection_.vertices, [&](u32 v) { return colors[v].a != 1; }))
            write(set, Schema::n_RGBA) = readRepaired<vec4f>(colors);
    }
}

/// Positions with an index array of their own are needed only where another array has more
/// elements.
void PolygonImport::writePositions() {
    const bool isWelded = perCorner_ && positions_.size() < positionIndices_.size();
    const auto& indices =
        isWelded && hasCornerChannels_ ? mesh_schema::n_positionIndices : mesh_schema::n_indices;
    write(object_, mesh_schema::n_positions) = std::move(positions_);
    write(object_, indices) = std::move(positionIndices_);
}

/// One primitive over all corners. A single count stands for equal ones.
void PolygonImport::writePrimitive() {
    using Schema = scene::meshPrimitive_schema;
    constexpr u16 faceList = 1;
    AttribMap& primitive = appendItem<Schema>(object_, mesh_schema::n_primitives);
    write(primitive, Schema::n_topology) = {faceList};
    vector<u16>& counts = faces_.cornerCounts;
    const auto differs = [](u16 a, u16 b) { return a != b; };
    if (std::ranges::adjacent_find(std::as_const(counts), differs) == counts.cend())
        counts = vector<u16>(1, std::as_const(counts)[0]);
    write(primitive, Schema::n_vcounts) = std::move(counts);
}

} // namespace

void importPolygons(const aiMesh& mesh, const GeometrySettings& settings, MeshFaces faces,
                    vector<vec3f> positions, AttribMap& object, GeometryFaults& faults) {
    PolygonImport(mesh, settings, std::move(faces), std::move(positions), object, faults).run();
}

} // namespace assimp
