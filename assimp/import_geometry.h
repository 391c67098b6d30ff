#pragma once

#include "assimp/vertex_joints.h"

#include "b_factory.h"
#include "scene_options.h"

#include <assimp/color4.h>

struct aiMesh;

namespace assimp {

struct VertexSelection;

/// The settings of an import that concern geometry.
struct GeometrySettings {
    explicit GeometrySettings(const base::AttribMap& importer);

    bool meshes, lines, points;
    bool triangulate, flip;
    bool colors, textureCoordinates;
    scene::Presence multiIndex, normals, tangents;
    scene::NormalsMethod normalsMethod;
    float normalsAngle; ///< in degrees
};

/// What was wrong with the geometry of a file and was put right, counted for one report.
struct GeometryFaults {
    base::u64 degenerateFaces = 0;
    base::u64 brokenFaces = 0;
    base::u64 nonFiniteValues = 0;
    base::u64 zeroNormals = 0;
    base::u64 zeroTangents = 0;
    base::u64 colorsOutOfRange = 0;
    base::u64 brokenTargets = 0;
    base::u64 stages = 0; ///< morph targets that are none but steps on the way to another

    /// Logs one line for each kind that occurred.
    void report(const base::string& path) const;
};

using GeometryObjects = base::vector<base::ref<base::IPlugin>>;

/// The colors of the selected vertices, brought into the range 0 to 1.
base::vector<base::vec4f> readColors(const aiColor4D* elements, const VertexSelection& selection,
                                     GeometryFaults& faults);

/// Makes the scene objects of one assimp mesh, which may hold faces of several kinds: at most one
/// `mesh` (its polygons), one `lines` and one `points`. All carry the mesh's name.
///
/// Polygons stay as they are in the file, but for those without area and those that can't be cut
/// into triangles plainly, see `cutFaces`. A mesh whose faces share vertices keeps its numbering
/// in `indices`, less what no face uses. One with vertices of its own for each corner, which is
/// what most readers deliver, gets equal elements of every array welded, each array with indices of
/// its own (`positionIndices` and so on), or `indices` if there are positions alone; the step to a
/// single index then finds the vertices that are equal in everything.
///
/// Either way these vertices make a manifold, see `separateFans`: copies of positions, or of
/// vertices where these are shared, keep faces apart that merely touch.
///
/// Vertices at one place that are deformed differently do not weld. A mesh with `joints` gets its
/// first joints set and no morph targets. In the place of any other with targets a `morph` object
/// over it stands in the list. `inGroups`: see `readVertexTargets`.
GeometryObjects importGeometry(const aiMesh& mesh, const GeometrySettings& settings,
                               VertexJoints joints, bool inGroups, base::PluginFactory& factory,
                               GeometryFaults& faults);

} // namespace assimp
