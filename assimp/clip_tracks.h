#pragma once

#include "assimp/import_animation.h"
#include "assimp/key_reading.h"

struct aiAnimation;

namespace assimp {

/// The keys of one animation of a file, by what they move.
struct ClipTracks {
    base::string name;
    base::TimeCode first{0}, last{0}; ///< the range of the keys on the clip's own clock
    base::TimeCode end{0};            ///< `last`, or later where it stands still at its end
    base::hash_map<const aiNode*, NodeMotion> motions;
    /// By number of the mesh and of the target.
    base::map<std::pair<base::u32, base::u32>, KeyTrack<float>> weights;

    bool isEmpty() const { return motions.empty() && weights.empty(); }
};

/// The keys of the channels whose nodes and morph targets are there. Of several channels for one
/// the first counts.
ClipTracks readClip(const aiAnimation& animation, const AnimationClock& clock, NodeTable& nodes,
                    const base::vector<MorphedMesh>& morphs, AnimationFaults& faults);

} // namespace assimp
