#pragma once

#include "b_containers.h"
#include "b_types.h"

struct aiAnimation;

namespace assimp {

/// Turns the times of one animation's keys into ticks of the framework.
class AnimationClock {
public:
    /// `framesPerSecond` is above 0.
    AnimationClock(const aiAnimation& animation, base::u32 framesPerSecond);

    /// False for a time that is not finite or too far from zero to be any. A time very close to a
    /// whole frame is put on it: files hold rounded ones.
    bool read(double fileTime, base::TimeCode& time) const;

private:
    double ticksPerSecond_; ///< of the file
    double framesPerSecond_;
    base::i64 frameTicks_;
};

/// The rate in frames per second of animations: that of their ticks where it is a usual one, else
/// the first of the usual rates on whose frames all keys lie. 30 if there is none.
base::u32 findFrameRate(const base::vector<const aiAnimation*>& animations);

} // namespace assimp
