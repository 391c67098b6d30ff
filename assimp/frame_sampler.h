#pragma once

#include "b_containers.h"
#include "b_types.h"

namespace assimp {

/// Makes the times of keys on frames, for one import as many as memory bears: 100,000 frames for a
/// motion and 10,000,000 keys in all.
class FrameSampler {
public:
    /// `everyFrame`: keys on frames take the place of the file's. `frameTicks` is above 0.
    FrameSampler(base::i64 frameTicks, bool everyFrame)
        : frameTicks_(frameTicks), everyFrame_(everyFrame) {}

    bool everyFrame() const { return everyFrame_; }
    /// The times from `first` to `last`, both included, with every whole frame between them, for
    /// `trackCount` tracks with a key at each. None if those are too many; it counts as a long
    /// motion then.
    base::vector<base::TimeCode> listFrames(base::TimeCode first, base::TimeCode last,
                                            base::i64 trackCount);
    base::u64 longMotions() const { return longMotions_; }

private:
    base::i64 frameTicks_;
    bool everyFrame_;
    base::i64 keysLeft_ = 10'000'000;
    base::u64 longMotions_ = 0;
};

} // namespace assimp
