#pragma once

#include "b_containers.h"
#include "b_types.h"

struct aiMesh;

namespace assimp {

struct GeometryFaults;
struct GeometrySettings;

/// One morph target of an assimp mesh, as differences to the mesh for each of its vertices.
struct VertexTarget {
    base::string name;
    float weight = 0;
    base::vector<base::vec3f> positions;
    base::vector<base::vec3f> normals;  ///< empty if no target of the mesh turns any
    base::vector<base::vec3f> tangents; ///< the same
};

/// Reads the targets of `mesh`, whose own vertices are at `positions`. Differences that are not
/// finite are zero. Targets with another number of vertices are left out with a message.
///
/// FBX holds a weight for a group of targets, which are stages on the way to the last of them.
/// `inGroups` takes targets that follow each other under one name for such a group: its weight
/// belongs to the last one, all others have zero. For a group of one the library does not tell the
/// weight; it counts as zero.
base::vector<VertexTarget> readVertexTargets(const aiMesh& mesh,
                                             const base::vector<base::vec3f>& positions,
                                             const GeometrySettings& settings, bool inGroups,
                                             GeometryFaults& faults);

/// For each group of targets of `mesh` the index of its last target, see above; with `inGroups`
/// false every target is its own group.
base::vector<base::u32> findTargetGroups(const aiMesh& mesh, bool inGroups);

} // namespace assimp
