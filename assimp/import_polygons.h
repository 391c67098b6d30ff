#pragma once

#include "assimp/import_geometry.h"
#include "assimp/mesh_faces.h"

namespace assimp {

/// The name of the set of texture coordinates in `channel`, by which textures select it: that in
/// the file, but another one where it has none or an earlier set has it too. The first set keeps
/// its name or has none. Empty if there is no such set.
base::string textureSetName(const aiMesh& mesh, base::u32 channel);

/// Fills `object`, an empty `mesh`, with the polygons of `mesh`, of which there is at least one.
/// `positions` are those of all its vertices, finite. `motions` has a number for each vertex, or
/// is empty: vertices with different numbers are kept apart. Then the result has for each position
/// of the object the vertex of `mesh` that it comes from; else it is empty.
base::vector<base::u32> importPolygons(const aiMesh& mesh, const GeometrySettings& settings,
                                       MeshFaces faces, base::vector<base::vec3f> positions,
                                       const base::vector<base::u32>& motions,
                                       base::AttribMap& object, GeometryFaults& faults);

} // namespace assimp
