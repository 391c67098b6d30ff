#include "assimp/import_polygons.h"

#include "assimp/attribute_writing.h"
#include "assimp/library_text.h"
#include "assimp/manifold.h"
#include "assimp/vertex_frames.h"
#include "assimp/vertex_selection.h"

#include "scene_schema.h"
#include "scene_weld.h"

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

template <class T>
vector<T> elementsAt(const vector<T>& elements, const vector<u32>& indices) {
    vector<T> result;
    result.reserve(indices.size());
    for (const u32 i : indices)
        result.push_back(elements[i]);
    return result;
}

/// Indices of the corners in arrays that are not the positions.
struct ChannelIndices {
    AttribMap* owner;
    const scene::SchemaAttribute<vector<u32>>* name;
    vector<u32> indices;
};

/// Makes the `mesh` object of the polygons.
class PolygonImport {
public:
    PolygonImport(const aiMesh& mesh, const GeometrySettings& settings, MeshFaces faces,
                  vector<vec3f> positions, const vector<u32>& motions, AttribMap& object,
                  GeometryFaults& faults)
        : mesh_(mesh), settings_(settings), faces_(std::move(faces)),
          positions_(std::move(positions)), motions_(motions), object_(object), faults_(faults),
          computesNormals_(settings.normals == Presence::always && !mesh.mNormals),
          computesTangents_(settings.tangents == Presence::always && !mesh.mTangents &&
                            hasNormals() && mesh.mTextureCoords[0]),
          perCorner_(!faces_.sharesVertices || computesNormals_ || computesTangents_) {}

    /// The vertex behind each position if there are motions.
    vector<u32> run() {
        selectVertices();
        settlePositions();
        writeNormalsAndTangents();
        if (settings_.textureCoordinates)
            writeTextureCoordinates();
        if (settings_.colors)
            writeColors();
        if (perCorner_)
            separateVertices();
        writePositions();
        writePrimitive();
        return std::move(vertexOfPosition_);
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

    /// Of arrays per corner, which share indices, only what differs stays; the indices are kept for
    /// later. Arrays per position stay as they are.
    template <class... Ts>
    void weldCorners(AttribMap& owner, const scene::SchemaAttribute<vector<u32>>& indices,
                     vector<Ts>&... arrays) {
        if (!perCorner_)
            return;
        scene::Welding welding = scene::weld(arrays...);
        ((arrays = elementsAt(arrays, welding.firsts)), ...);
        channels_.push_back({&owner, &indices, std::move(welding.numbers)});
    }

    void selectVertices();
    void selectSharedVertices();
    void settlePositions();
    void writeNormalsAndTangents();
    vector<normal> makeNormals(const Surface& surface);
    vector<vec4f> readTangents(const vector<normal>& normals, vector<normal>& bitangents);
    void writeTangents(const Surface& surface, const vector<normal>& normals);
    void writeTextureCoordinates();
    template <class T>
    void writeTextureSet(const scene::SchemaAttribute<vector<T>>& name, AttribMap& set,
                         const aiVector3D* coordinates);
    void writeColors();
    void separateVertices();
    void writePositions();
    void writePrimitive();

    const aiMesh& mesh_;
    const GeometrySettings& settings_;
    MeshFaces faces_;
    vector<vec3f> positions_; ///< of assimp's vertices, then of the scene mesh
    const vector<u32>& motions_;
    AttribMap& object_;
    GeometryFaults& faults_;
    bool computesNormals_;
    bool computesTangents_;
    bool perCorner_; ///< arrays but the positions have one element per corner, else per position
    VertexSelection selection_;    ///< what the elements of these arrays are read from
    vector<u32> positionIndices_;  ///< of the corners
    vector<u32> vertexOfPosition_; ///< empty without motions
    vector<ChannelIndices> channels_;
};

/// For arrays per corner the vertices of the corners; else all that faces use.
void PolygonImport::selectVertices() {
    if (perCorner_)
        selection_ = {std::move(faces_.corners), mesh_.mNumVertices};
    else
        selectSharedVertices();
}

/// In assimp's order, by which the corners are numbered anew; then copies of vertices, see
/// `separateFans`.
void PolygonImport::selectSharedVertices() {
    constexpr u32 unused = 0xffffffff;
    positionIndices_ = faces_.corners;
    vector<u32> table(separateFans(positionIndices_, mesh_.mNumVertices, faces_), unused);
    u32* entries = table.data();
    for (std::size_t c = 0; c < positionIndices_.size(); ++c)
        entries[std::as_const(positionIndices_)[c]] = std::as_const(faces_.corners)[c];
    vector<u32> used;
    used.reserve(table.size());
    for (u32& entry : table)
        if (entry != unused) {
            used.push_back(entry);
            entry = static_cast<u32>(used.size()) - 1;
        }
    for (u32& index : positionIndices_)
        index = entries[index];
    selection_ = {std::move(used), mesh_.mNumVertices};
}

/// Makes the positions and position indices of the scene mesh.
void PolygonImport::settlePositions() {
    if (!selection_.isWhole)
        positions_ = elementsAt(positions_, selection_.vertices);
    if (!motions_.empty())
        vertexOfPosition_ = selection_.vertices;
    if (!perCorner_)
        return;
    scene::Welding welding = scene::weld(positions_);
    if (!motions_.empty()) {
        const vector<u32> motions = elementsAt(motions_, selection_.vertices);
        welding = scene::weldRows({welding.numbers.cbegin(), motions.cbegin()},
                                  static_cast<u32>(motions.size()));
        vertexOfPosition_ = elementsAt(vertexOfPosition_, welding.firsts);
    }
    positions_ = elementsAt(positions_, welding.firsts);
    positionIndices_ = std::move(welding.numbers);
}

void PolygonImport::writeNormalsAndTangents() {
    if (!hasNormals())
        return;
    const Surface surface{positions_, positionIndices_, faces_.cornerCounts};
    vector<normal> normals = makeNormals(surface);
    if (computesTangents_ || (mesh_.mTangents && settings_.tangents != Presence::never))
        writeTangents(surface, normals);
    weldCorners(object_, mesh_schema::n_normalIndices, normals);
    write(object_, mesh_schema::n_normals) = std::move(normals);
}

vector<normal> PolygonImport::makeNormals(const Surface& surface) {
    if (computesNormals_)
        return settings_.normalsMethod == scene::NormalsMethod::flat
                   ? computeFlatNormals(surface)
                   : computeSmoothNormals(surface, settings_.normalsAngle);
    vector<normal> normals = readRepaired<normal>(mesh_.mNormals);
    if (settings_.flip)
        for (normal& n : normals)
            n = {-n.x, -n.y, -n.z};
    faults_.zeroNormals += repairNormals(normals, surface, perCorner_);
    return normals;
}
/// The tangents of the file. Its bitangents decide on which side the tangents' w is.
vector<vec4f> PolygonImport::readTangents(const vector<normal>& normals,
                                          vector<normal>& bitangents) {
    const vector<vec3f> directions = readRepaired<vec3f>(mesh_.mTangents);
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
    return tangents;
}

void PolygonImport::writeTangents(const Surface& surface, const vector<normal>& normals) {
    vector<normal> bitangents;
    vector<vec4f> tangents =
        computesTangents_
            ? computeTangents(surface, normals, selection_.read<vec2f>(mesh_.mTextureCoords[0]))
            : readTangents(normals, bitangents);
    if (bitangents.empty()) {
        weldCorners(object_, mesh_schema::n_tangentIndices, tangents);
    } else {
        weldCorners(object_, mesh_schema::n_tangentIndices, tangents, bitangents);
        write(object_, mesh_schema::n_bitangents) = std::move(bitangents);
    }
    write(object_, mesh_schema::n_tangents) = std::move(tangents);
}

/// Sets of two coordinates go to `UV`, of three to `UVW`, unless the third is always zero: it
/// stands in many files that mean two, and only those can be exported.
void PolygonImport::writeTextureCoordinates() {
    for (u32 i = 0; i < AI_MAX_NUMBER_OF_TEXTURECOORDS; ++i) {
        const aiVector3D* coordinates = mesh_.mTextureCoords[i];
        if (!coordinates)
            continue;
        using Schema = scene::meshUVSet_schema;
        AttribMap& set = appendItem<Schema>(object_, mesh_schema::n_uvSets);
        if (const base::string name = textureSetName(mesh_, i); !name.empty())
            write(set, Schema::n_name) = name;
        const bool isDeep =
            mesh_.mNumUVComponents[i] > 2 &&
            std::ranges::any_of(selection_.vertices, [&](u32 v) { return coordinates[v].z != 0; });
        if (isDeep)
            writeTextureSet(Schema::n_UVW, set, coordinates);
        else
            writeTextureSet(Schema::n_UV, set, coordinates);
    }
}

template <class T>
void PolygonImport::writeTextureSet(const scene::SchemaAttribute<vector<T>>& name, AttribMap& set,
                                    const aiVector3D* coordinates) {
    vector<T> elements = readRepaired<T>(coordinates);
    weldCorners(set, scene::meshUVSet_schema::n_indices, elements);
    write(set, name) = std::move(elements);
}

/// Every set has `RGB`; `RGBA` is added where some vertex is not opaque.
void PolygonImport::writeColors() {
    for (const aiColor4D* source : mesh_.mColors) {
        if (!source)
            continue;
        using Schema = scene::meshColorSet_schema;
        AttribMap& set = appendItem<Schema>(object_, mesh_schema::n_colorSets);
        vector<vec4f> colors = readColors(source, selection_, faults_);
        weldCorners(set, Schema::n_indices, colors);
        vector<vec3f>& opaque = write(set, Schema::n_RGB);
        opaque.reserve(colors.size());
        for (const vec4f& c : std::as_const(colors))
            opaque.push_back({c.x, c.y, c.z});
        if (std::ranges::any_of(std::as_const(colors), [](const vec4f& c) { return c.w != 1; }))
            write(set, Schema::n_RGBA) = std::move(colors);
    }
}

/// Makes corners of faces that merely touch different vertices, see `separateFans`, by copies of
/// their positions.
void PolygonImport::separateVertices() {
    const auto cornerCount = static_cast<u32>(positionIndices_.size());
    const auto positionCount = static_cast<u32>(positions_.size());
    vector<u32> vertices;
    u32 vertexCount = positionCount;
    if (channels_.empty()) {
        vertices = positionIndices_;
    } else {
        vector<const u32*> columns{positionIndices_.cbegin()};
        for (const ChannelIndices& channel : std::as_const(channels_))
            columns.push_back(channel.indices.data());
        scene::Welding welding = scene::weldRows(columns, cornerCount);
        vertices = std::move(welding.numbers);
        vertexCount = static_cast<u32>(welding.firsts.size());
    }
    const u32 copiesEnd = separateFans(vertices, vertexCount, faces_);
    positions_.resize(positionCount + copiesEnd - vertexCount);
    if (!motions_.empty())
        vertexOfPosition_.resize(positions_.size());
    vec3f* positions = positions_.data();
    u32* indices = positionIndices_.data();
    u32* origins = vertexOfPosition_.data();
    for (u32 c = 0; c < cornerCount; ++c) {
        const u32 vertex = std::as_const(vertices)[c];
        if (vertex < vertexCount)
            continue;
        const u32 copy = positionCount + vertex - vertexCount;
        positions[copy] = positions[indices[c]];
        if (origins)
            origins[copy] = origins[indices[c]];
        indices[c] = copy;
    }
}

void PolygonImport::writePositions() {
    write(object_, mesh_schema::n_positions) = std::move(positions_);
    write(object_, channels_.empty() ? mesh_schema::n_indices : mesh_schema::n_positionIndices) =
        std::move(positionIndices_);
    for (ChannelIndices& channel : channels_)
        write(*channel.owner, *channel.name) = std::move(channel.indices);
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

base::string textureSetName(const aiMesh& mesh, u32 channel) {
    vector<base::string> names;
    if (channel >= AI_MAX_NUMBER_OF_TEXTURECOORDS || !mesh.mTextureCoords[channel])
        return {};
    const auto isTaken = [&](const base::string& name) {
        return std::ranges::find(std::as_const(names), name) != names.cend();
    };
    for (u32 i = 0; i <= channel; ++i) {
        if (!mesh.mTextureCoords[i])
            continue;
        base::string name(mesh.HasTextureCoordsName(i) ? viewOf(*mesh.GetTextureCoordsName(i))
                                                       : "");
        if (!names.empty() && (name.empty() || isTaken(name)))
            for (name = "UV" + std::to_string(i); isTaken(name);)
                name += '_';
        names.push_back(name);
    }
    return names.back();
}

vector<u32> importPolygons(const aiMesh& mesh, const GeometrySettings& settings, MeshFaces faces,
                           vector<vec3f> positions, const vector<u32>& motions, AttribMap& object,
                           GeometryFaults& faults) {
    return PolygonImport(mesh, settings, std::move(faces), std::move(positions), motions, object,
                         faults)
        .run();
}

} // namespace assimp
