#include "assimp/import_geometry.h"

#include "assimp/deformation.h"
#include "assimp/fault_report.h"
#include "assimp/import_polygons.h"
#include "assimp/library_text.h"
#include "assimp/vertex_selection.h"

#include "scene_mesh_index.h"
#include "scene_schema.h"

#include <assimp/mesh.h>

#include <algorithm>
#include <cstring>

namespace assimp {

using base::AttribMap;
using base::u32;
using base::u64;
using base::vec3f;
using base::vec4f;
using base::vector;
using scene::Presence;

GeometrySettings::GeometrySettings(const AttribMap& importer) {
    using Schema = scene::sceneImporter_schema;
    meshes = read(importer, Schema::n_importMeshes);
    lines = read(importer, Schema::n_importHair);
    points = read(importer, Schema::n_importPoints);
    triangulate = read(importer, Schema::n_importTriangulateMeshes);
    flip = read(importer, Schema::n_flipNormals);
    colors = read(importer, Schema::n_importColors);
    textureCoordinates = read(importer, Schema::n_importTextureCoordinates);
    multiIndex = Presence(read(importer, Schema::n_importMultiIndex));
    normals = Presence(read(importer, Schema::n_importNormals));
    tangents = Presence(read(importer, Schema::n_importTangents));
    normalsMethod = scene::NormalsMethod(read(importer, Schema::n_computeNormalsMethod));
    normalsAngle = read(importer, Schema::n_computeNormalsAngle);
}

void GeometryFaults::report(const base::string& path) const {
    const FaultReport log(path);
    log.inform(degenerateFaces, "assimp |{}| Left out {} faces without area.");
    log.warn(
        brokenFaces,
        "assimp |{}| Left out {} faces with an index out of range or more than 65535 corners!");
    log.warn(nonFiniteValues,
             "assimp |{}| Found {} vertex values that are no finite numbers, zero is taken!");
    log.warn(zeroNormals,
             "assimp |{}| Found {} normals without a direction, those of the faces are taken!");
    log.warn(zeroTangents, "assimp |{}| Found {} tangents without a direction, any are taken!");
    log.warn(colorsOutOfRange,
             "assimp |{}| Found {} colors with components outside 0 to 1, the nearest are taken!");
    log.warn(brokenTargets,
             "assimp |{}| Left out {} morph targets with a wrong number of vertices!");
    log.warn(
        stages,
        "assimp |{}| Found {} morph targets that are stages on the way to another, their weights "
        "stay at 0!");
}

vector<vec4f> readColors(const aiColor4D* elements, const VertexSelection& selection,
                         GeometryFaults& faults) {
    vector<vec4f> colors = selection.read<vec4f>(elements);
    faults.nonFiniteValues += repairValues(colors);
    for (vec4f& c : colors) {
        const vec4f given = c;
        for (float vec4f::*component : {&vec4f::x, &vec4f::y, &vec4f::z, &vec4f::w})
            c.*component = std::clamp(c.*component, 0.0f, 1.0f);
        faults.colorsOutOfRange += c != given;
    }
    return colors;
}

namespace {

vector<vec3f> readPositions(const aiMesh& mesh, GeometryFaults& faults) {
    vector<vec3f> positions;
    positions.resizeUninitialized(mesh.mVertices ? mesh.mNumVertices : 0);
    static_assert(sizeof(vec3f) == sizeof(aiVector3D));
    if (!positions.empty())
        std::memcpy(static_cast<void*>(positions.data()), mesh.mVertices, positions.byteLength());
    faults.nonFiniteValues += repairValues(positions);
    // Mirrored models have zeros of both signs; equal positions shall have equal bytes.
    for (vec3f& p : positions)
        p = {p.x + 0.0f, p.y + 0.0f, p.z + 0.0f};
    return positions;
}

base::ref<base::IPlugin> createObject(base::PluginFactory& factory, base::name_id kind,
                                      const aiMesh& mesh) {
    base::ref<base::IPlugin> object = factory.create(kind);
    if (mesh.mName.length != 0)
        write(*object, scene::geometry_schema::n_name) = viewOf(mesh.mName);
    return object;
}

/// Segments of which each starts where the one before it ends form one line.
base::ref<base::IPlugin> importLines(const aiMesh& mesh, const GeometrySettings& settings,
                                     const vector<u32>& segments, const vector<vec3f>& positions,
                                     base::PluginFactory& factory, GeometryFaults& faults) {
    using Schema = scene::lines_schema;
    vector<u32> vertices, starts;
    for (std::size_t i = 0; i < segments.size(); i += 2) {
        const u32 begin = segments[i];
        if (i == 0 || positions[begin] != positions[segments[i - 1]]) {
            starts.push_back(static_cast<u32>(vertices.size()));
            vertices.push_back(begin);
        }
        vertices.push_back(segments[i + 1]);
    }
    const VertexSelection selection(std::move(vertices), mesh.mNumVertices);
    base::ref<base::IPlugin> object = createObject(factory, Schema::n_kind, mesh);
    write(*object, Schema::n_points) = selection.read<vec3f>(positions.data());
    write(*object, Schema::n_linesStart) = std::move(starts);
    if (settings.colors && mesh.mColors[0])
        write(*object, Schema::n_colors) = readColors(mesh.mColors[0], selection, faults);
    return object;
}

base::ref<base::IPlugin> importPoints(const aiMesh& mesh, vector<u32> vertices,
                                      const vector<vec3f>& positions,
                                      base::PluginFactory& factory) {
    using Schema = scene::points_schema;
    const VertexSelection selection(std::move(vertices), mesh.mNumVertices);
    base::ref<base::IPlugin> object = createObject(factory, Schema::n_kind, mesh);
    write(*object, Schema::n_points) = selection.read<vec3f>(positions.data());
    return object;
}

/// Makes the mesh of the polygons; a morph over it if it has targets.
base::ref<base::IPlugin> importDeformed(const aiMesh& mesh, const GeometrySettings& settings,
                                        MeshFaces faces, vector<vec3f> positions,
                                        Deformation deformation, base::PluginFactory& factory,
                                        GeometryFaults& faults) {
    base::ref<base::IPlugin> object = createObject(factory, scene::mesh_schema::n_kind, mesh);
    vector<u32> motions;
    if (!deformation.isEmpty())
        motions = deformation.findMotions(mesh.mNumVertices);
    const vector<u32> vertexOfPosition = importPolygons(
        mesh, settings, std::move(faces), std::move(positions), motions, *object, faults);
    if (!deformation.joints.starts.empty())
        writeJoints(deformation.joints, vertexOfPosition, *object);
    const bool isMorphBase = !deformation.targets.empty();
    if (settings.multiIndex == Presence::never)
        scene::convertToSingleIndex(*object, isMorphBase);
    if (isMorphBase)
        return makeMorph(std::move(deformation.targets), vertexOfPosition, object, factory);
    return object;
}

} // namespace

GeometryObjects importGeometry(const aiMesh& mesh, const GeometrySettings& settings,
                               VertexJoints joints, bool inGroups, base::PluginFactory& factory,
                               GeometryFaults& faults) {
    vector<vec3f> positions = readPositions(mesh, faults);
    MeshFaces faces = collectFaces(mesh, positions, settings.flip);
    if (settings.meshes)
        cutFaces(faces, positions, base::string(viewOf(mesh.mName)), !settings.triangulate);
    faults.degenerateFaces += faces.degenerateCount;
    faults.brokenFaces += faces.brokenCount;

    // The polygons come first in the list, but last here: they take the positions over.
    base::ref<base::IPlugin> lines, points, polygons;
    if (settings.lines && !faces.lines.empty())
        lines = importLines(mesh, settings, faces.lines, positions, factory, faults);
    if (settings.points && !faces.points.empty())
        points = importPoints(mesh, std::move(faces.points), positions, factory);
    if (settings.meshes && !faces.corners.empty()) {
        Deformation deformation{std::move(joints), {}};
        if (deformation.isEmpty())
            deformation.targets = readVertexTargets(mesh, positions, settings, inGroups, faults);
        polygons = importDeformed(mesh, settings, std::move(faces), std::move(positions),
                                  std::move(deformation), factory, faults);
    }
    GeometryObjects objects;
    for (const base::ref<base::IPlugin>& object : {polygons, lines, points})
        if (object)
            objects.push_back(object);
    return objects;
}

} // namespace assimp
