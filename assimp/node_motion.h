#pragma once

#include "assimp/frame_sampler.h"
#include "assimp/key_track.h"

namespace assimp {

/// The motion of one node in one clip. A track without keys means no motion.
struct NodeMotion {
    KeyTrack<base::vec3d> translation;
    KeyTrack<base::quatf> rotation;
    KeyTrack<base::vec3f> scale;

    bool isEmpty() const { return translation.isEmpty() && rotation.isEmpty() && scale.isEmpty(); }
};

/// One of the nodes of a file that make up a node's transform.
struct MotionFactor {
    base::mat43 transform;              ///< at rest
    const NodeMotion* motion = nullptr; ///< what takes its place, null for none
};

/// The motion of a node whose transform is the product of `factors`, the outermost first.
///
/// A single factor keeps its keys. Of several, each of translation, rotation and scale keeps the
/// times of its own keys if it is a straight line or arc between them still. Where it is not, as
/// with a pivot behind a rotation, all three get keys at all times and on every frame between.
/// Shear is lost, which adds 1 to `shearedNodes`. Where several keys at one time make a step, so do
/// two of the result.
NodeMotion composeMotion(const base::vector<MotionFactor>& factors, FrameSampler& frames,
                         base::u64& shearedNodes);

} // namespace assimp
