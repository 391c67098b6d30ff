#pragma once

#include "assimp/vertex_joints.h"
#include "assimp/vertex_targets.h"

#include "b_factory.h"

namespace assimp {

/// What moves the vertices of an assimp mesh: joints or morph targets.
struct Deformation {
    VertexJoints joints;
    base::vector<VertexTarget> targets;

    bool isEmpty() const { return joints.starts.empty() && targets.empty(); }
    /// A number for each of the mesh's vertices: equal for those that move alike.
    base::vector<base::u32> findMotions(base::u32 vertexCount) const;
};

/// Writes the first joints set of `mesh`, whose positions are those of the assimp vertices
/// `vertexOfPosition`.
void writeJoints(const VertexJoints& joints, const base::vector<base::u32>& vertexOfPosition,
                 base::AttribMap& mesh);

/// Makes a `morph` object over `mesh`, with the targets' meshes.
base::ref<base::IPlugin> makeMorph(base::vector<VertexTarget> targets,
                                   const base::vector<base::u32>& vertexOfPosition,
                                   const base::ref<base::IPlugin>& mesh,
                                   base::PluginFactory& factory);

} // namespace assimp
