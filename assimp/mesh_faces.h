#pragma once

#include "b_containers.h"
#include "b_types.h"

struct aiMesh;

namespace assimp {

/// The faces of an assimp mesh by kind, as indices of its vertices.
struct MeshFaces {
    base::vector<base::u32> points;
    base::vector<base::u32> lines;        ///< two for each segment
    base::vector<base::u32> corners;      ///< of the polygons, one polygon after the other
    base::vector<base::u16> cornerCounts; ///< of each polygon
    /// Polygon after polygon the triangles that exporters cut it into, as numbers of corners, see
    /// `cutFaces`; empty if all polygons are triangles.
    base::vector<base::u32> triangles;
    bool sharesVertices = false;   ///< some vertex is a corner of several polygons
    base::u64 degenerateCount = 0; ///< polygons left out
    base::u64 brokenCount = 0;
};

/// Sorts the faces of `mesh`, whose vertices are at `positions`; a mesh without faces is points.
/// With `flip` polygons are wound the other way.
///
/// Triangles whose corners do not lie at three places would be dropped by mesh encoders, which
/// makes a file's counts wrong. So of neighbouring corners at one place only the first stays, and
/// polygons are left out that have less than three places or, with four corners, are folded on
/// themselves. Broken faces are left out as well: those with an index out of range or more corners
/// than a count can tell.
MeshFaces collectFaces(const aiMesh& mesh, const base::vector<base::vec3f>& positions, bool flip);

/// Cuts the polygons into triangles as exporters would. With `keepsPolygons` one stays in place,
/// with its triangles in `triangles`, if these cover it: others come to fewer triangles, as some
/// have no area, which may leave corners without any, or it takes a message to cut them, which one
/// wants to read once. `name` is the mesh's, for messages.
void cutFaces(MeshFaces& faces, const base::vector<base::vec3f>& positions,
              const base::string& name, bool keepsPolygons);

} // namespace assimp
