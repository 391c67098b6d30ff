#pragma once

#include "b_containers.h"
#include "b_types.h"

struct aiBone;

namespace assimp {

/// What was wrong with the skeletons of a file and was put right, counted for one report.
struct SkeletonFaults {
    base::u64 missingBones = 0;
    base::u64 brokenBindPoses = 0;
    base::u64 brokenWeights = 0;
    base::u64 freeVertices = 0;
    base::u64 targetsOfSkins = 0;

    /// Logs one line for each kind that occurred.
    void report(const base::string& path) const;
};

/// The joints that move each vertex of an assimp mesh, vertex after vertex: those of vertex v are
/// the entries from `starts[v]` up to `starts[v + 1]`, the heaviest first. Each joint occurs once
/// at a vertex, weights are above 0 and add up to 1.
struct VertexJoints {
    base::vector<base::u32> starts; ///< empty if no joint moves any vertex
    base::vector<base::u32> joints; ///< indices of the bones
    base::vector<float> weights;
    /// Some vertices have no joint in the file. They have the one behind all bones, with a weight
    /// of 1: it stands for the node that holds the mesh.
    bool hasFreeVertices = false;
};

/// Reads the weights of `bones` for a mesh of `vertexCount` vertices. Weights that are not
/// positive numbers or belong to vertices that are not there are left out.
VertexJoints readVertexJoints(const base::vector<const aiBone*>& bones, base::u32 vertexCount,
                              SkeletonFaults& faults);

} // namespace assimp
