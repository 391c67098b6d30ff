#include "assimp/animation_clock.h"

#include <assimp/anim.h>

#include <algorithm>
#include <cmath>

namespace assimp {

using base::i64;
using base::TimeCode;
using base::u32;
using base::vector;

namespace {

/// For files that say nothing, as everywhere with this library.
constexpr double defaultTicksPerSecond = 25;
constexpr u32 defaultFrameRate = 30;
/// The rates in frames per second that are looked for, the likelier ones first.
constexpr u32 usualRates[] = {30, 24, 25, 60, 50, 48, 120, 100};
/// Share of a frame by which a key may miss one: COLLADA and X files round times to five digits.
constexpr double frameSlack = 0.01;
/// Longest time in seconds, about twelve days.
constexpr double longestTime = 1e6;

double ticksPerSecondOf(const aiAnimation& animation) {
    const double given = animation.mTicksPerSecond;
    return std::isfinite(given) && given > 0 ? given : defaultTicksPerSecond;
}

template <class Key>
void appendTimes(const Key* keys, u32 count, double ticksPerSecond, vector<double>& seconds) {
    for (u32 i = 0; keys && i < count; ++i)
        seconds.push_back(keys[i].mTime / ticksPerSecond);
}

/// The times of all keys in seconds.
vector<double> gatherTimes(const vector<const aiAnimation*>& animations) {
    vector<double> seconds;
    for (const aiAnimation* animation : animations) {
        const double rate = ticksPerSecondOf(*animation);
        for (u32 i = 0; i < animation->mNumChannels; ++i) {
            const aiNodeAnim& channel = *animation->mChannels[i];
            appendTimes(channel.mPositionKeys, channel.mNumPositionKeys, rate, seconds);
            appendTimes(channel.mRotationKeys, channel.mNumRotationKeys, rate, seconds);
            appendTimes(channel.mScalingKeys, channel.mNumScalingKeys, rate, seconds);
        }
        for (u32 i = 0; i < animation->mNumMorphMeshChannels; ++i) {
            const aiMeshMorphAnim& channel = *animation->mMorphMeshChannels[i];
            appendTimes(channel.mKeys, channel.mNumKeys, rate, seconds);
        }
    }
    return seconds;
}

bool isOnFrame(double frame) {
    return std::abs(frame - std::round(frame)) <= frameSlack;
}

} // namespace

u32 findFrameRate(const vector<const aiAnimation*>& animations) {
    // A rate of video, with decimals for those of television.
    for (const aiAnimation* animation : animations) {
        const double rate = std::round(ticksPerSecondOf(*animation));
        if (std::ranges::find(usualRates, rate) != std::end(usualRates))
            return base::saturate<u32>(rate);
    }
    const vector<double> seconds = gatherTimes(animations);
    for (const u32 rate : usualRates)
        if (std::ranges::all_of(seconds, [&](double time) {
                return !std::isfinite(time) || isOnFrame(time * rate);
            }))
            return rate;
    return defaultFrameRate;
}

AnimationClock::AnimationClock(const aiAnimation& animation, u32 framesPerSecond)
    : ticksPerSecond_(ticksPerSecondOf(animation)), framesPerSecond_(framesPerSecond),
      frameTicks_(TimeCode::ticksPerSecond / framesPerSecond) {}

bool AnimationClock::read(double fileTime, TimeCode& time) const {
    const double seconds = fileTime / ticksPerSecond_;
    if (!(std::abs(seconds) <= longestTime))
        return false;
    const double frame = seconds * framesPerSecond_;
    time.ticks = isOnFrame(frame)
                     ? base::saturate<i64>(std::round(frame)) * frameTicks_
                     : base::saturate<i64>(std::round(seconds * double(TimeCode::ticksPerSecond)));
    return true;
}

} // namespace assimp
