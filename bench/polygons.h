#pragma once

#include "b_attribute_map.h"

/// Meshes of polygons, with the plain data that their floors work on.
namespace bench {

/// Polygons of 5 to 12 corners, each in a plane of its own: of ten four are convex, four
/// star-shaped, and two an L, a U, a plus or a comb, all in various proportions.
struct Outlines {
    base::vector<base::u16> sizes;
    base::vector<base::vec3f> positions;
    base::vector<base::vec2d> points; ///< the positions within their planes
};
Outlines makeOutlines(base::u32 count);
void fillMesh(base::AttribMap& mesh, const Outlines& outlines);

/// Polygons of 5 to 12 corners, side by side in strips that share positions with the strips beside
/// them. Three polygons of four are smooth, the normals of every fourth are its own.
struct Corners {
    base::vector<base::u16> sizes;
    base::vector<base::u32> positions, normals; ///< an index of each per corner
    base::u32 positionCount = 0;
    base::u32 normalCount = 0;
};
Corners makeCorners(base::u32 polygonCount);
/// With separate indices of positions and normals.
void fillMesh(base::AttribMap& mesh, const Corners& corners);

} // namespace bench
