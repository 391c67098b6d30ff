#pragma once

#include "assimp/import_geometry.h"
#include "assimp/mesh_faces.h"

namespace assimp {

/// Fills `object`, an empty `mesh`, with the polygons of `mesh`, of which there is at least one.
/// `positions` are those of all its vertices, finite.
void importPolygons(const aiMesh& mesh, const GeometrySettings& settings, MeshFaces faces,
                    base::vector<base::vec3f> positions, base::AttribMap& object,
                    GeometryFaults& faults);

} // namespace assimp
