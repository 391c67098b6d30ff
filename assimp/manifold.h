#pragma once

#include "b_containers.h"
#include "b_types.h"

namespace assimp {

struct MeshFaces;

/// Makes the surface of the polygons a manifold: around each vertex lies one fan of faces, open or
/// closed, and no two sides of triangles lead from one vertex to the same other one. Mesh encoders
/// make such a surface of any other by copying vertices, which the counts in a file then miss.
///
/// `vertexOfCorner` has the vertex, below `vertexCount`, of each corner of `faces`, whose own
/// corners are not looked at. The corners of every fan at a vertex but the first get a number of
/// their own, from `vertexCount` on by first appearance; it stands for a copy of the vertex.
/// Returns the number of vertices and copies. Polygons stay whole.
///
/// Two sides in opposite directions connect their faces, unless these consist of the same three
/// vertices. Where an edge has more sides, the earlier faces are connected first.
base::u32 separateFans(base::vector<base::u32>& vertexOfCorner, base::u32 vertexCount,
                       const MeshFaces& faces);

} // namespace assimp
