#pragma once

#include "b_containers.h"
#include "b_types.h"

/// Normals and tangents of vertices.
///
/// The library's own steps for this are not used: they let the last face of a shared vertex win,
/// take the normal of a polygon from three corners (the wrong way round where the first is a
/// concave one), and take several times as long as reading the file.
namespace assimp {

/// The polygons of a mesh.
struct Surface {
    const base::vector<base::vec3f>& positions;
    const base::vector<base::u32>& positionIndices; ///< of the corners, polygon after polygon
    const base::vector<base::u16>& cornerCounts;    ///< of each polygon, at least 3
};

/// One normal for each corner: that of its face.
base::vector<base::normal> computeFlatNormals(const Surface& surface);

/// One normal for each corner: the mean of the normals of the faces around its position that form
/// an angle of at most `angleDegrees` with its own face, weighted by their angles there.
base::vector<base::normal> computeSmoothNormals(const Surface& surface, float angleDegrees);

/// One tangent for each corner, from `normals` and `uvs` of the corners: the direction in which u
/// grows, at right angles to the normal, the mean over the corners that share position, normal,
/// texture coordinates and orientation. w is -1 where the texture is mirrored.
base::vector<base::vec4f> computeTangents(const Surface& surface,
                                          const base::vector<base::normal>& normals,
                                          const base::vector<base::vec2f>& uvs);

/// Gives every normal unit length. `normals` has one element for each corner or, `perCorner`
/// false, for each position. One without a direction takes that of the faces at the vertex.
/// Returns how many there were.
base::u64 repairNormals(base::vector<base::normal>& normals, const Surface& surface,
                        bool perCorner);

/// Gives every tangent unit length and a w of 1 or -1. One without a direction gets any at right
/// angles to its normal. Returns how many there were.
base::u64 repairTangents(base::vector<base::vec4f>& tangents,
                         const base::vector<base::normal>& normals);

} // namespace assimp
