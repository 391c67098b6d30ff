#pragma once

#include "scenes.h"

namespace bench {

/// So many nodes below the root, moving, turning and growing: each with three channels of 100
/// linear keys over `frameCount` frames of 1/30 second, of one clip that plays from 0 on.
struct AnimatedScene {
    AnimatedScene(base::u32 nodeCount, base::u32 frameCount);

    ScenePtr scene;
    base::vector<scene::INode*> nodes;
    // One of each for each node.
    base::vector<scene::IKeyframeChannel*> translations, scales, rotations;
    base::u32 frameCount;
};

/// The time of a frame.
base::TimeCode frameTime(base::u32 frame);

/// Evaluates all channels at all frames and returns the sum of what they yield.
double evaluateAll(const AnimatedScene& animated);

} // namespace bench
