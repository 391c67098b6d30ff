#pragma once

#include "GLTF/document.h"
#include "b_factory.h"

namespace gltf {

/// Joints and weights of the vertices, four per vertex; both null for a mesh without them.
struct JointChannels {
    base::ref<GLTF::Accessor> joints, weights;
};

/// Makes the channels of the first joint set of `mesh`. Of more than four joints a vertex keeps
/// the first four, normalised. What does not fit together is logged and gives no channels.
JointChannels convertJoints(const base::IPlugin& mesh, std::size_t vertexCount);

} // namespace gltf
