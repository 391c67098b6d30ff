#pragma once

#include "assimp/animation_clock.h"
#include "assimp/node_motion.h"

struct aiAnimation;
struct aiMeshMorphAnim;
struct aiNodeAnim;

namespace assimp {

/// What was wrong with the animations of a file and was put right, counted for one report.
struct AnimationFaults {
    base::u64 brokenKeys = 0;
    base::u64 unsortedTracks = 0;
    base::u64 unknownTargets = 0;
    base::u64 repeatedChannels = 0;
    base::u64 emptyAnimations = 0;
    base::u64 lateAnimations = 0;
    base::u64 longMotions = 0;
    base::u64 shearedNodes = 0;

    /// Logs one line for each kind that occurred.
    void report(const base::string& path) const;
};

/// The keys of a channel. Those with a time or value that is none are left out, rotations have unit
/// length.
NodeMotion readMotion(const aiNodeAnim& channel, const AnimationClock& clock,
                      AnimationFaults& faults);

/// The weights that a channel gives to what it numbers.
base::map<base::u32, KeyTrack<float>>
readWeights(const aiMeshMorphAnim& channel, const AnimationClock& clock, AnimationFaults& faults);

} // namespace assimp
